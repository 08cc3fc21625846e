#pragma once

#include <nlohmann/json.hpp>
#include <string>
#include <string_view>

#include "host/core/sink.h"

namespace ipmisel {

using Json = nlohmann::ordered_json;

/// A text as a JSON string, quotes included. Bytes that are not UTF-8 become U+FFFD; control
/// characters are escaped, also those that JSON would allow, so that none reaches a terminal.
std::string JsonText(std::string_view text);

/// A value on one line; all but ASCII is escaped, bytes that are not UTF-8 become U+FFFD.
std::string JsonLine(const Json& value);

/// The members of an object that an instance's properties are, without the braces, in the order in
/// which they were written: `"Name": "a", "RawData": [1, 2]`.
std::string JsonProperties(const NQORTQR20::Instance& instance);

/// An instance as one JSON object on one line.
std::string JsonInstance(const NQORTQR20::Instance& instance);

}  // namespace ipmisel
