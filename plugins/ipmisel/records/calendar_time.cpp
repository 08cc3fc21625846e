#include "plugins/ipmisel/records/calendar_time.h"

#include <ctime>

#include "plugins/ipmisel/log.h"
#include "tqr/status.h"

namespace ipmisel {

NQORTQR20::TCIMDateTime CalendarTime(std::int64_t seconds, short utcOffset, const char* failure) {
    std::tm fields{};
    const auto time = static_cast<std::time_t>(seconds);
    if (time != seconds || gmtime_r(&time, &fields) == nullptr) {
        WriteLog(kInfo, failure);
        throw NQORTQR20::TTQRException({NQORTQR20::kStatusBadTime});
    }
    NQORTQR20::TCIMDateTime calendar;
    calendar.Set(
        static_cast<unsigned short>(fields.tm_year + 1900),
        static_cast<unsigned short>(fields.tm_mon + 1), static_cast<unsigned int>(fields.tm_mday),
        static_cast<unsigned short>(fields.tm_hour), static_cast<unsigned short>(fields.tm_min),
        static_cast<unsigned short>(fields.tm_sec), 0, utcOffset);
    return calendar;
}

}  // namespace ipmisel
