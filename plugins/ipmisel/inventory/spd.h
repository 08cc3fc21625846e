#pragma once

#include <cstdint>
#include <optional>
#include <span>
#include <string>

#include "ipmi/spd.h"

// What is shown of the serial presence detect data of a memory module.

namespace ipmisel {

/// What is shown in place of a text that cannot be.
inline constexpr const char* kNotAvailable = "Not Available";

using ipmi::SpdKind;

/// The kind of memory of an image that is read whole, 256 bytes of it; empty for everything else.
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
