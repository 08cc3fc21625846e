#pragma once

#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

namespace ipmisel {

/// A text of a BMC as it may stand on a terminal: control characters (C1 ones included), and bytes
/// that are not UTF-8, become U+FFFD; line feeds, tabs and runs of blanks become one blank.
std::string TerminalText(std::string_view text);

/// Columns that a text of TerminalText takes: one a code point.
std::size_t Columns(std::string_view text);
/// The text in lines of at most `width` columns, broken at blanks where there are some.
std::vector<std::string> Wrap(std::string_view text, std::size_t width);
/// The text cut or filled with blanks to `width` columns.
std::string Fit(std::string_view text, std::size_t width);

}  // namespace ipmisel
