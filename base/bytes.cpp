#include "base/bytes.h"

#include <algorithm>
#include <cctype>
#include <charconv>
#include <limits>

#include "base/hex.h"

namespace ipmisel {
namespace {

void AppendByte(std::string* text, std::uint8_t byte, Digits digits) {
    if (digits == Digits::kDecimal) {
        *text += std::to_string(byte);
    } else {
        AppendHex(text, byte, digits == Digits::kUpperHex ? HexCase::kUpper : HexCase::kLower);
    }
    *text += ' ';
}

bool IsSpace(char c) { return std::isspace(static_cast<unsigned char>(c)) != 0; }

}  // namespace

std::string DumpBytes(std::span<const std::uint8_t> bytes, Digits digits) {
    std::string text;
    text.reserve(bytes.size() * 4);
    for (const std::uint8_t byte : bytes) AppendByte(&text, byte, digits);
    return text;
}

std::string DumpFrame(std::span<const std::uint8_t> frame, Digits digits) {
    std::string text;
    text.reserve(frame.size() * 5);
    for (std::size_t i = 0; i < frame.size(); ++i) {
        if (i % 5 == 0) text += "\n\t";
        AppendByte(&text, frame[i], digits);
    }
    return text;
}

std::optional<std::vector<unsigned>> ScanHexRow(std::string_view text, std::size_t most) {
    std::vector<unsigned> numbers;
    numbers.reserve(most);
    const char* at = text.data();
    const char* const end = at + text.size();
    while (numbers.size() < most) {
        at = std::find_if_not(at, end, IsSpace);
        if (at == end) break;
        unsigned value = 0;
        const auto [stop, error] = std::from_chars(at, end, value, 16);
        if (error == std::errc::invalid_argument) {
            // A character that is no digit ends the scan; before the first number it is still not
            // the end of the input, as sscanf tells 0 from -1.
            return numbers;
        }
        if (error == std::errc::result_out_of_range) value = std::numeric_limits<unsigned>::max();
        numbers.push_back(value);
        at = stop;
    }
    if (numbers.empty()) return std::nullopt;
    return numbers;
}

}  // namespace ipmisel
