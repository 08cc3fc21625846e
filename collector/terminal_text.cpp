#include "collector/terminal_text.h"

#include <algorithm>
#include <cstdint>

namespace ipmisel {
namespace {

constexpr std::string_view kReplacement = "\xEF\xBF\xBD";

/// Length of the UTF-8 sequence at the start of the text, 0 when there is none (RFC 3629).
std::size_t SequenceLength(std::string_view text) {
    const auto byte = [text](std::size_t i) { return static_cast<std::uint8_t>(text[i]); };
    const std::uint8_t first = byte(0);
    if (first < 0x80) return 1;
    const std::size_t length = first >= 0xF0 ? 4 : first >= 0xE0 ? 3 : 2;
    if (first < 0xC2 || first > 0xF4 || text.size() < length) return 0;
    for (std::size_t i = 1; i < length; ++i) {
        if ((byte(i) & 0xC0) != 0x80) return 0;
    }
    const bool overlong = (first == 0xE0 && byte(1) < 0xA0) || (first == 0xF0 && byte(1) < 0x90);
    const bool surrogate = first == 0xED && byte(1) > 0x9F;
    const bool tooHigh = first == 0xF4 && byte(1) > 0x8F;
    return overlong || surrogate || tooHigh ? 0 : length;
}

/// Characters that move, hide or turn what stands around them.
bool IsControl(std::string_view sequence) {
    const auto first = static_cast<std::uint8_t>(sequence[0]);
    if (sequence.size() == 1) return first < 0x20 || first == 0x7F;
    const auto second = static_cast<std::uint8_t>(sequence[1]);
    if (sequence.size() == 2) return first == 0xC2 && second < 0xA0;  // C1
    if (sequence.size() != 3 || first != 0xE2) return false;
    const auto third = static_cast<std::uint8_t>(sequence[2]);
    // U+200B to U+200F, U+2028 to U+202E, U+2066 to U+2069
    return (second == 0x80 &&
            ((third >= 0x8B && third <= 0x8F) || (third >= 0xA8 && third <= 0xAE))) ||
           (second == 0x81 && third >= 0xA6 && third <= 0xA9);
}

/// Position of the byte after `columns` columns.
std::size_t ByteAt(std::string_view text, std::size_t columns) {
    std::size_t at = 0;
    for (; columns > 0 && at < text.size(); --columns) {
        at += std::max<std::size_t>(1, SequenceLength(text.substr(at)));
    }
    return std::min(at, text.size());
}

}  // namespace

std::string TerminalText(std::string_view text) {
    std::string out;
    bool blank = false;
    while (!text.empty()) {
        const std::size_t length = SequenceLength(text);
        const std::string_view sequence = text.substr(0, std::max<std::size_t>(1, length));
        text.remove_prefix(sequence.size());
        if (sequence == " " || sequence == "\n" || sequence == "\t") {
            blank = true;
            continue;
        }
        if (blank && !out.empty()) out += ' ';
        blank = false;
        out += length == 0 || IsControl(sequence) ? kReplacement : sequence;
    }
    return out;
}

std::size_t Columns(std::string_view text) {
    return static_cast<std::size_t>(std::count_if(text.begin(), text.end(), [](char c) {
        return (static_cast<std::uint8_t>(c) & 0xC0) != 0x80;
    }));
}

std::vector<std::string> Wrap(std::string_view text, std::size_t width) {
    std::vector<std::string> lines;
    while (Columns(text) > width) {
        const std::size_t limit = ByteAt(text, width);
        std::size_t at = text.rfind(' ', limit);
        if (at == std::string_view::npos || at == 0) at = limit;
        lines.emplace_back(text.substr(0, at));
        text.remove_prefix(at < text.size() && text[at] == ' ' ? at + 1 : at);
    }
    lines.emplace_back(text);
    return lines;
}

std::string Fit(std::string_view text, std::size_t width) {
    std::string out(text.substr(0, ByteAt(text, width)));
    return out + std::string(width - Columns(out), ' ');
}

}  // namespace ipmisel
