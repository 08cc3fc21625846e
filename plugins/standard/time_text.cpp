#include "plugins/standard/time_text.h"

#include <chrono>

#include "base/text.h"

namespace standard {

std::string TimeText(std::int64_t seconds) {
    using std::chrono::days;
    const std::chrono::sys_seconds time{std::chrono::seconds(seconds)};
    const auto day = std::chrono::floor<days>(time);
    const std::chrono::year_month_day date(day);
    const std::chrono::hh_mm_ss clock(time - day);
    return ipmisel::Format("%04d-%02u-%02uT%02d:%02d:%02dZ", static_cast<int>(date.year()),
                           static_cast<unsigned>(date.month()), static_cast<unsigned>(date.day()),
                           static_cast<int>(clock.hours().count()),
                           static_cast<int>(clock.minutes().count()),
                           static_cast<int>(clock.seconds().count()));
}

}  // namespace standard
