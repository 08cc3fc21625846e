#pragma once

#include <cstdint>
#include <span>
#include <string>

namespace ipmisel {

/// Two lower-case hexadecimal digits for each byte, nothing between them.
std::string HexText(std::span<const std::uint8_t> bytes);
/// One byte as the field writes it, "0Fh".
std::string HexByte(std::uint8_t byte);

}  // namespace ipmisel
