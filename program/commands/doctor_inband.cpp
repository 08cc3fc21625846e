#include "program/commands/doctor_inband.h"

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <charconv>
#include <compare>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <optional>
#include <string>
#include <string_view>
#include <system_error>

#include "base/text.h"
#include "ipmi/smbios.h"

namespace ipmisel {
namespace {

/// A system interface as the driver writes it: "kcs,i/o,0xca2".
struct SystemInterface {
    std::string type;
    std::string space;
    std::uint64_t address = 0;

    std::string Text() const {
        return type + ", " + space + Format(" 0x%llx", static_cast<unsigned long long>(address));
    }
    auto operator<=>(const SystemInterface&) const = default;
};

/// What the driver tells of the interface behind its first device; empty where it does not, as for
/// those behind an I2C bus.
std::optional<SystemInterface> FoundByDriver() {
    std::ifstream file("/sys/class/ipmi/ipmi0/device/params");
    SystemInterface found;
    std::string address;
    if (!std::getline(file, found.type, ',') || !std::getline(file, found.space, ',') ||
        !std::getline(file, address, ',') || !address.starts_with("0x")) {
        return std::nullopt;
    }
    const auto [end, error] =
        std::from_chars(address.data() + 2, address.data() + address.size(), found.address, 16);
    if (error != std::errc()) return std::nullopt;
    return found;
}

/// The same in SMBIOS; empty for one that has no address.
std::optional<SystemInterface> Announced(const ipmi::SmbiosIpmiDevice& device) {
    using enum ipmi::SmbiosIpmiDevice::Interface;
    const char* const type = device.interface == kKcs             ? "kcs"
                             : device.interface == kSmic          ? "smic"
                             : device.interface == kBlockTransfer ? "bt"
                                                                  : nullptr;
    if (type == nullptr) return std::nullopt;
    return SystemInterface{type, device.isIo ? "i/o" : "mem", device.address};
}

}  // namespace

void CompareSmbios(std::span<const std::vector<std::uint8_t>> structures, Steps* steps) {
    constexpr std::string_view kWhat = "SMBIOS";
    if (!ipmi::HasIpmiDevice(structures)) {
        steps->Bad(kWhat,
                   "announces no BMC (type 38) although the driver has one; inventory and "
                   "firmware will be missing: look for newer firmware of the machine");
        return;
    }
    const std::optional<SystemInterface> found = FoundByDriver();
    std::string announced;
    for (const auto& structure : structures) {
        const auto device = ipmi::ReadSmbiosIpmiDevice(structure);
        const auto interface = device ? Announced(*device) : std::nullopt;
        if (!interface) continue;
        if (found && *interface == *found) {
            steps->Good(kWhat,
                        "announces the BMC (type 38) where the driver has it: " + found->Text());
            return;
        }
        announced += (announced.empty() ? "" : " and ") + interface->Text();
    }
    if (!found || announced.empty()) {
        steps->Good(kWhat, "announces a BMC (type 38)");
    } else {
        steps->Bad(kWhat, "announces a BMC (type 38) at " + announced + ", the driver has one at " +
                              found->Text() +
                              "; look for newer firmware of the machine, and check the options of "
                              "ipmi_si");
    }
}

void ExamineDriver(Steps* steps) {
    namespace fs = std::filesystem;
    std::error_code ignored;
    const auto isLoaded = [&](const char* module) {
        return fs::exists(std::string("/sys/module/") + module, ignored);
    };
    if (isLoaded("ipmi_devintf")) {
        steps->Good("module ipmi_devintf", "loaded");
    } else {
        steps->Bad("module ipmi_devintf", "not loaded; modprobe ipmi_devintf");
    }
    const bool hasInterface =
        isLoaded("ipmi_si") || isLoaded("ipmi_ssif") || isLoaded("ipmi_powernv");
    if (hasInterface) {
        steps->Good("module of the interface", "loaded");
    } else {
        steps->Bad("module of the interface",
                   "not loaded; modprobe ipmi_si, or ipmi_ssif where the "
                   "BMC is behind an I2C bus");
    }
    const fs::path devices[] = {"/dev/ipmi0", "/dev/ipmi/0", "/dev/ipmidev/0"};
    const auto* const device =
        std::find_if(std::begin(devices), std::end(devices),
                     [&](const auto& one) { return fs::exists(one, ignored); });
    if (device == std::end(devices)) {
        steps->Bad("device", hasInterface
                                 ? "no /dev/ipmi0: the driver found no BMC; see dmesg for ipmi_si"
                                 : "no /dev/ipmi0: it comes with the modules");
        return;
    }
    const int file = open(device->c_str(), O_RDWR | O_CLOEXEC);
    const int error = file < 0 ? errno : 0;
    if (file >= 0) close(file);
    if (error == 0) {
        steps->Good("device", device->string());
    } else {
        steps->Bad("device", device->string() + ": " + std::strerror(error) +
                                 (error == EACCES || error == EPERM
                                      ? "; run as root, or ask for access to the device"
                                      : "; see dmesg for ipmi_si"));
    }
}

}  // namespace ipmisel
