#pragma once

#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

namespace ipmisel {

enum class HexCase { kLower, kUpper };

/// Appends the two hexadecimal digits of a byte.
void AppendHex(std::string* text, std::uint8_t byte, HexCase letters = HexCase::kLower);
/// Two hexadecimal digits for each byte, nothing between them.
std::string HexText(std::span<const std::uint8_t> bytes, HexCase letters = HexCase::kLower);
/// One byte as the field writes it, "0Fh".
std::string HexByte(std::uint8_t byte);

/// The value of a hexadecimal digit, of either case; empty for another character.
std::optional<std::uint8_t> HexDigit(char c);
/// The bytes of pairs of hexadecimal digits with nothing between them; empty for an odd number of
/// digits and for any other character.
std::optional<std::vector<std::uint8_t>> ParseHex(std::string_view digits);

}  // namespace ipmisel
