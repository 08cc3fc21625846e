#include "base/hex.h"

namespace ipmisel {

void AppendHex(std::string* text, std::uint8_t byte, HexCase letters) {
    const char* const digits = letters == HexCase::kUpper ? "0123456789ABCDEF" : "0123456789abcdef";
    *text += digits[byte >> 4];
    *text += digits[byte & 0x0F];
}

std::string HexText(std::span<const std::uint8_t> bytes, HexCase letters) {
    std::string text;
    text.reserve(bytes.size() * 2);
    for (const std::uint8_t byte : bytes) AppendHex(&text, byte, letters);
    return text;
}

std::string HexByte(std::uint8_t byte) { return HexText({&byte, 1}, HexCase::kUpper) + 'h'; }

std::optional<std::uint8_t> HexDigit(char c) {
    if (c >= '0' && c <= '9') return static_cast<std::uint8_t>(c - '0');
    if (c >= 'a' && c <= 'f') return static_cast<std::uint8_t>(c - 'a' + 10);
    if (c >= 'A' && c <= 'F') return static_cast<std::uint8_t>(c - 'A' + 10);
    return {};
}

std::optional<std::vector<std::uint8_t>> ParseHex(std::string_view digits) {
    if (digits.size() % 2 != 0) return {};
    std::vector<std::uint8_t> bytes;
    bytes.reserve(digits.size() / 2);
    for (std::size_t i = 0; i < digits.size(); i += 2) {
        const auto high = HexDigit(digits[i]);
        const auto low = HexDigit(digits[i + 1]);
        if (!high || !low) return {};
        bytes.push_back(static_cast<std::uint8_t>(*high << 4 | *low));
    }
    return bytes;
}

}  // namespace ipmisel
