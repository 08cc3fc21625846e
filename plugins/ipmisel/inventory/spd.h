#pragma once

#include <cstdint>
#include <optional>
#include <span>
#include <string>

// Serial presence detect data of a memory module, as JEDEC lays it down for each kind of memory:
// byte 0 the bytes that are used and the size of the device, byte 2 the memory type; further on
// the module's maker (JEP106), serial number and part number, and a checksum.

namespace ipmisel {

/// What is shown in place of a text that cannot be.
inline constexpr const char* kNotAvailable = "Not Available";

enum class SpdKind { kDdr2, kDdr3, kDdr4 };

/// The kind of memory whose image the bytes begin with, told by type and sizes alone: an image
/// that is damaged is no data of another kind. Empty for everything else.
std::optional<SpdKind> RecogniseSpd(std::span<const std::uint8_t> bytes);

struct MemoryModule {
    std::string vendor;
    std::string serialNumber;  ///< eight hexadecimal digits
    std::string partNumber;
};

/// What an image of that kind says of its module, kNotAvailable in place of what it does not say; a
/// checksum that does not match is logged.
/// Empty for DDR4, which keeps all of it beyond the first 256 bytes, and for bytes that end too
/// early.
std::optional<MemoryModule> DecodeSpd(SpdKind kind, std::span<const std::uint8_t> bytes);

}  // namespace ipmisel
