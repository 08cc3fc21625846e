#include <cerrno>
#include <chrono>
#include <cstring>
#include <filesystem>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "host/smbios/smbios_tables.h"
#include "host/spdriver/inband_pipeline.h"
#include "host/spdriver/kinds.h"
#include "ipmi/smbios.h"

namespace tqrhost {
namespace {

/// The way to a BMC that is there but has no driver.
class SilentTransport : public Transport {
public:
    std::optional<Response> Exchange(const RequestFrame&) override { return std::nullopt; }
};

/// A device file without a driver behind it, or none at all.
bool NoDriver(int error) { return error == ENOENT || error == ENODEV || error == ENXIO; }

std::string Advice(const std::filesystem::path& file, int error) {
    const std::string place = file.string() + ": ";
    switch (error) {
        case EACCES:
        case EPERM:
            return place + "access is not allowed; run as root or ask for access to the device";
        case EBUSY:
            return place + "the IPMI driver is busy; try again";
        case ENOTTY:
            return place + "is no IPMI device; name another source with --from";
        default:
            return place + "cannot be opened: " + std::strerror(error) +
                   "; check the kernel modules ipmi_si and ipmi_devintf";
    }
}

constexpr const char* kLoadDriver =
    "load the kernel modules ipmi_si and ipmi_devintf if it has a BMC, or name another source with "
    "--from";

}  // namespace

Source OpenInbandDevice(const std::vector<std::filesystem::path>& devices, SystemSmbios smbios,
                        std::chrono::milliseconds timeout) {
    Source source;
    source.facts.machineType = SystemProductName(smbios.structures);
    source.facts.smbios = std::move(smbios.structures);
    std::optional<std::filesystem::path> withoutDriver;
    for (const std::filesystem::path& path : devices) {
        auto device = std::make_unique<KernelDevice>();
        const int error = device->Open(path);
        if (NoDriver(error)) {
            if (error != ENOENT) withoutDriver = path;
            continue;
        }
        if (error != 0) throw SourceError(Advice(path, error));
        if (smbios.error != 0) {
            throw SourceError(
                "the SMBIOS of this machine, which says what BMC it has, cannot be read: " +
                std::string(std::strerror(smbios.error)) + "; run as root");
        }
        source.nodes.push_back(
            {"inband", nullptr, std::make_unique<InbandPipeline>(std::move(device), timeout)});
        return source;
    }
    if (ipmi::HasIpmiDevice(source.facts.smbios)) {
        source.facts.ipmiDriver = false;
        source.nodes.push_back({"inband", std::make_unique<SilentTransport>(), nullptr});
        return source;
    }
    if (withoutDriver) {
        throw SourceError(withoutDriver->string() + ": there is no driver behind this device; " +
                          kLoadDriver);
    }
    if (smbios.error != 0) {
        throw SourceError(
            "no BMC: this machine has no IPMI device (/dev/ipmi0), and its SMBIOS cannot "
            "be read: " +
            std::string(std::strerror(smbios.error)) + "; run as root, or " + kLoadDriver);
    }
    throw SourceError(
        "no BMC: this machine has neither an IPMI device (/dev/ipmi0) nor an IPMI record "
        "in its SMBIOS; " +
        std::string(kLoadDriver));
}

Source OpenInband(const std::vector<std::string>& /*places*/, const Access& access) {
    return OpenInbandDevice({"/dev/ipmi0", "/dev/ipmi/0", "/dev/ipmidev/0"},
                            {ReadSystemSmbios(), SystemSmbiosError()}, access.timeout);
}

}  // namespace tqrhost
