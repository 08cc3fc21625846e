#include <algorithm>
#include <cstdint>
#include <filesystem>
#include <memory>
#include <optional>
#include <string>
#include <system_error>
#include <utility>
#include <vector>

#include "host/smbios/smbios_tables.h"
#include "host/spdriver/freeipmi_context.h"
#include "host/spdriver/kinds.h"
#include "host/spdriver/stop_gate.h"

namespace tqrhost {
namespace {

constexpr std::uint8_t kIpmiDeviceRecord = 38;  // SMBIOS structure type, DSP0134

/// The way to a BMC that is there but has no driver.
class SilentTransport : public Transport {
public:
    std::optional<Response> Exchange(const RequestFrame&) override { return std::nullopt; }
};

bool HasIpmiDevice(const std::vector<std::vector<std::uint8_t>>& smbios) {
    return std::any_of(smbios.begin(), smbios.end(), [](const auto& structure) {
        return !structure.empty() && structure[0] == kIpmiDeviceRecord;
    });
}

std::unique_ptr<Transport> OpenDevice(const std::filesystem::path& device) {
    auto context = MakeContext();
    // The kernel's driver only: its ports are not to be touched behind its back.
    constexpr int kNoProbing = 1;
    if (ipmi_ctx_open_inband(context.get(), IPMI_DEVICE_OPENIPMI, kNoProbing, 0, 0, device.c_str(),
                             IPMI_WORKAROUND_FLAGS_DEFAULT, IPMI_FLAGS_DEFAULT) < 0) {
        throw SourceError(ErrorAdvice(device.string(), ipmi_ctx_errnum(context.get())));
    }
    return std::make_unique<FreeIpmiTransport>(std::move(context));
}

}  // namespace

Source OpenInbandDevice(const std::vector<std::filesystem::path>& devices,
                        std::vector<std::vector<std::uint8_t>> smbios) {
    Source source;
    source.facts.machineType = SystemProductName(smbios);
    source.facts.smbios = std::move(smbios);
    const auto device = std::find_if(devices.begin(), devices.end(), [](const auto& path) {
        std::error_code error;
        return std::filesystem::exists(path, error);
    });
    if (device != devices.end()) {
        source.nodes.push_back(
            {"inband", nullptr, std::make_unique<SerialPipeline>(OpenDevice(*device))});
    } else if (HasIpmiDevice(source.facts.smbios)) {
        source.facts.ipmiDriver = false;
        source.nodes.push_back({"inband", std::make_unique<SilentTransport>(), nullptr});
    } else {
        throw SourceError(
            "no BMC: this machine has neither an IPMI device (/dev/ipmi0) nor an IPMI record in "
            "its SMBIOS; load the kernel modules ipmi_si and ipmi_devintf if it has a BMC, or "
            "name another source with --from");
    }
    return source;
}

Source OpenInband(const std::vector<std::string>& /*places*/, const SourceOptions& /*options*/) {
    return OpenInbandDevice({"/dev/ipmi0", "/dev/ipmi/0", "/dev/ipmidev/0"}, ReadSystemSmbios());
}

}  // namespace tqrhost
