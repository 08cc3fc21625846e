#pragma once

#include <array>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

namespace ipmi {

constexpr std::uint8_t kUnspecifiedDeviceId = 0;

/// The answer of Get Device ID, IPMI 2.0 table 20-2: device ID, device revision, two bytes of
/// firmware revision, IPMI version, additional device support, manufacturer ID (three bytes),
/// product ID (two bytes) and, where the controller has it, four bytes of auxiliary firmware
/// revision.
struct DeviceId {
    std::uint8_t deviceId = kUnspecifiedDeviceId;
    std::uint8_t deviceRevision = 0;   ///< 0 to 15
    bool providesSdrs = false;         ///< has device SDRs of its own
    bool updateInProgress = false;     ///< firmware or SDR update, or self-initialization
    std::uint8_t firmwareMajor = 0;    ///< 0 to 127
    std::uint8_t firmwareMinor = 0;    ///< two BCD digits
    std::uint8_t ipmiVersion = 0;      ///< two BCD digits, the major one in bits 3..0
    std::uint8_t capabilities = 0;     ///< additional device support, a bit each
    std::uint32_t manufacturerId = 0;  ///< IANA enterprise number, 20 bits; 0 unspecified
    std::uint16_t productId = 0;       ///< 0 unspecified
    std::optional<std::array<std::uint8_t, 4>> auxiliaryRevision;  ///< as on the wire

    /// Neither unspecified nor the reserved value of all ones.
    bool HasManufacturer() const { return manufacturerId != 0 && manufacturerId != 0xFFFFF; }
    bool HasProduct() const { return productId != 0 && productId != 0xFFFF; }
};

/// From the response data after the completion code. An answer without the auxiliary revision is
/// whole (11 bytes); a shorter one is none.
std::optional<DeviceId> ParseDeviceId(std::span<const std::uint8_t> response);

/// "1.05": the minor part has two digits, in hexadecimal where the controller does not keep to BCD.
std::string FirmwareVersionText(const DeviceId& id);
/// "2.0"; "1.5"; empty for 00h, which is reserved.
std::string IpmiVersionText(const DeviceId& id);
/// The auxiliary revision's bytes in the order of the wire, "00000102"; its layout is the vendor's.
std::string AuxiliaryRevisionText(const DeviceId& id);
/// Additional device support in words, from bit 7 down.
std::vector<std::string_view> CapabilityNames(const DeviceId& id);

}  // namespace ipmi
