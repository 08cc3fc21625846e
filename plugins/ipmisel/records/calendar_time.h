#pragma once

#include <cstdint>

#include "tqr/datetime.h"

namespace ipmisel {

/// Stands for no time in every time stamp that is written.
inline constexpr const char* kNoTime = "19700101000000.000000+000";

/// Seconds since 1970-01-01 UTC as a point in time of the calendar, with the given UTC offset in
/// minutes. A time beyond the calendar writes `failure` to the log and throws the host's exception
/// with kStatusBadTime.
NQORTQR20::TCIMDateTime CalendarTime(std::int64_t seconds, short utcOffset, const char* failure);

}  // namespace ipmisel
