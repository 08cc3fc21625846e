#include "program/reports/terminal_text.h"

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <iterator>

#include "program/reports/progress.h"

namespace ipmisel {
namespace {

constexpr std::string_view kReplacement = "\xEF\xBF\xBD";

/// Position of the byte after `columns` columns.
std::size_t ByteAt(std::string_view text, std::size_t columns) {
    std::size_t at = 0;
    for (; columns > 0 && at < text.size(); --columns) {
        at += FirstCharacter(text.substr(at)).length;
    }
    return std::min(at, text.size());
}

std::string gSaidFor;

}  // namespace

Character FirstCharacter(std::string_view text) {
    const auto byte = [text](std::size_t i) { return static_cast<std::uint8_t>(text[i]); };
    const std::uint8_t first = byte(0);
    if (first < 0x80) return {first, 1, true};
    const Character invalid{first, 1, false};
    // RFC 3629: lead bytes C2 to F4; longer forms than needed, surrogates and values past U+10FFFF
    // are not well-formed.
    if (first < 0xC2 || first > 0xF4) return invalid;
    const std::size_t length = first < 0xE0 ? 2 : first < 0xF0 ? 3 : 4;
    if (text.size() < length) return invalid;
    char32_t value = first & (0x7F >> length);
    for (std::size_t i = 1; i < length; ++i) {
        if ((byte(i) & 0xC0) != 0x80) return invalid;
        value = value << 6 | (byte(i) & 0x3F);
    }
    const char32_t least = length == 2 ? 0x80 : length == 3 ? 0x800 : 0x10000;
    const bool surrogate = value >= 0xD800 && value <= 0xDFFF;
    if (value < least || value > 0x10FFFF || surrogate) return invalid;
    return {value, length, true};
}

bool IsControl(char32_t c) {
    struct Range {
        char32_t first;
        char32_t last;
    };
    constexpr Range kRanges[] = {
        {0x00, 0x1F},       {0x7F, 0x9F}, {0x061C, 0x061C},  // Arabic letter mark
        {0x200B, 0x200F},                                    // without width; marks of direction
        {0x2028, 0x202E},    // line and paragraph separator; embeddings
        {0x2060, 0x206F},    // isolates and invisible operators
        {0xFEFF, 0xFEFF},    // byte order mark
        {0xFFF9, 0xFFFB},    // interlinear annotation
        {0xE0000, 0xE007F},  // tags
    };
    return std::any_of(std::begin(kRanges), std::end(kRanges),
                       [c](const Range& r) { return c >= r.first && c <= r.last; });
}

std::string TerminalText(std::string_view text) {
    std::string out;
    out.reserve(text.size());
    bool blank = false;
    while (!text.empty()) {
        const Character character = FirstCharacter(text);
        const std::string_view sequence = text.substr(0, character.length);
        text.remove_prefix(sequence.size());
        if (sequence == " " || sequence == "\n" || sequence == "\t") {
            blank = true;
            continue;
        }
        if (blank && !out.empty()) out += ' ';
        blank = false;
        out += !character.valid || IsControl(character.value) ? kReplacement : sequence;
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
        if (at == std::string_view::npos || at == 0) {
            const std::size_t mark = text.find_last_of("/-", limit - 1);
            const std::size_t next = mark == std::string_view::npos ? 0 : mark + 1;
            const std::string_view rest = text.substr(next);
            const bool fits = Columns(rest.substr(0, rest.find_first_of(" /-"))) <= width;
            at = next > 1 && fits ? next : limit;
        }
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

void SayFor(const std::string& name) { gSaidFor = TerminalText(name) + ": "; }

void SayOf(const std::string& name, std::string_view text) {
    const std::string before = TerminalText(name) + ": ";
    Say((before == gSaidFor ? "" : before) + std::string(text));
}

void Say(std::string_view text) {
    const std::string line = "ipmisel: " + gSaidFor + TerminalText(text) + "\n";
    HideProgress();
    // In one piece; there is nobody to tell when it fails.
    std::fwrite(line.data(), 1, line.size(), stderr);
}

}  // namespace ipmisel
