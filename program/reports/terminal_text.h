#pragma once

#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

namespace ipmisel {

/// The character at the beginning of a text that is not empty.
struct Character {
    char32_t value;
    std::size_t length;  ///< in bytes; 1 for a byte that is not UTF-8
    bool valid;          ///< else the byte is no part of a well-formed UTF-8 sequence
};
Character FirstCharacter(std::string_view text);

/// Whether a terminal does something with a character instead of showing it: control characters
/// (C0, C1, DEL), and those that break lines, hide or turn the direction of writing.
bool IsControl(char32_t character);

/// A text of a BMC as it may stand on a terminal: controls, and bytes that are not UTF-8, become
/// U+FFFD; line feeds, tabs and runs of blanks become one blank.
std::string TerminalText(std::string_view text);

/// Columns that a text of TerminalText takes: one per code point.
std::size_t Columns(std::string_view text);
/// The text in lines of at most `width` columns, broken at blanks where there are some, else after
/// a slash or hyphen where that keeps the next word whole.
std::vector<std::string> Wrap(std::string_view text, std::size_t width);
/// The text cut or filled with blanks to `width` columns.
std::string Fit(std::string_view text, std::size_t width);

/// One line on standard error: "ipmisel: " and the text as TerminalText has it.
void Say(std::string_view text);
/// From now on Say puts a name before each text.
void SayFor(const std::string& name);
/// With a name before the text, which is not said twice.
void SayOf(const std::string& name, std::string_view text);

}  // namespace ipmisel
