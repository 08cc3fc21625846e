#pragma once

#include <string>
#include <string_view>

namespace ipmisel {

/// A text as the content of an element or the value of a quoted attribute: well-formed UTF-8
/// without control characters, markup escaped.
std::string HtmlText(std::string_view text);

}  // namespace ipmisel
