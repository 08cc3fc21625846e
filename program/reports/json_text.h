#pragma once

#include <string>
#include <string_view>

#include "host/core/sink.h"

namespace ipmisel {

/// A text as a JSON string, quotes included. Bytes that are not UTF-8 become U+FFFD; control
/// characters are escaped, also those that JSON would allow, so that none reaches a terminal.
std::string JsonText(std::string_view text);

/// An instance as one JSON object on one line, its properties in the order in which they were
/// written.
std::string JsonInstance(const tqrhost::Instance& instance);

}  // namespace ipmisel
