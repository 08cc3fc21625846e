#include "ipmi/device_id.h"

#include <cstddef>

#include "base/bytes.h"
#include "base/hex.h"
#include "base/text.h"

namespace ipmi {

namespace {

// Additional device support, from bit 7 down.
constexpr std::array<std::string_view, 8> kCapabilities{
    "chassis device",       "bridge",     "IPMB event generator",  "IPMB event receiver",
    "FRU inventory device", "SEL device", "SDR repository device", "sensor device",
};

}  // namespace

std::optional<DeviceId> ParseDeviceId(std::span<const std::uint8_t> response) {
    ipmisel::ByteReader in(response);
    DeviceId id;
    id.deviceId = in.U8();
    const std::uint8_t revision = in.U8();
    id.deviceRevision = revision & 0x0F;
    id.providesSdrs = (revision & 0x80) != 0;
    const std::uint8_t firmware = in.U8();
    id.firmwareMajor = firmware & 0x7F;
    id.updateInProgress = (firmware & 0x80) != 0;
    id.firmwareMinor = in.U8();
    id.ipmiVersion = in.U8();
    id.capabilities = in.U8();
    id.manufacturerId = in.U24() & 0x0FFFFF;  // bits 23..20 are reserved
    id.productId = in.U16();
    if (!in.ok()) return std::nullopt;
    std::array<std::uint8_t, 4> auxiliary{};
    for (std::uint8_t& byte : auxiliary) byte = in.U8();
    if (in.ok()) id.auxiliaryRevision = auxiliary;
    return id;
}

std::string FirmwareVersionText(const DeviceId& id) {
    return ipmisel::Format("%d.%02x", id.firmwareMajor, id.firmwareMinor);
}

std::string IpmiVersionText(const DeviceId& id) {
    if (id.ipmiVersion == 0) return {};
    return ipmisel::Format("%x.%x", id.ipmiVersion & 0x0F, id.ipmiVersion >> 4);
}

std::string AuxiliaryRevisionText(const DeviceId& id) {
    return id.auxiliaryRevision ? ipmisel::HexText(*id.auxiliaryRevision) : std::string();
}

std::vector<std::string_view> CapabilityNames(const DeviceId& id) {
    std::vector<std::string_view> names;
    for (std::size_t i = 0; i < kCapabilities.size(); ++i) {
        if ((id.capabilities & 0x80 >> i) != 0) names.push_back(kCapabilities[i]);
    }
    return names;
}

}  // namespace ipmi
