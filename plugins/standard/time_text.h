#pragma once

#include <cstdint>
#include <string>

namespace standard {

/// RFC 3339, UTC: "2026-03-09T02:31:44Z", from seconds since 1970-01-01 UTC.
std::string TimeText(std::int64_t seconds);

}  // namespace standard
