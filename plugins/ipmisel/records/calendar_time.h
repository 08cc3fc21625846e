#pragma once

#include <cstdint>

#include "tqr/datetime.h"

namespace ipmisel {

/// Seconds since 1970-01-01 UTC as a point in time of the calendar, with the given UTC offset in
/// minutes. A time beyond the calendar writes `failure` to the log and throws the host's exception
/// with kStatusBadTime.
NQORTQR20::TCIMDateTime CalendarTime(std::int64_t seconds, short utcOffset, const char* failure);

}  // namespace ipmisel
