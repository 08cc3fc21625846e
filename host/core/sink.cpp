#include "host/core/sink.h"

#include <algorithm>
#include <array>
#include <chrono>
#include <cstdio>
#include <utility>

namespace NQORTQR20 {

std::string TimeText(Time time) {
    // Not gmtime: a time_t may have 32 bits.
    using namespace std::chrono;
    const sys_time<std::chrono::seconds> point{
        std::chrono::seconds(std::clamp(time.seconds, kFirstTime, kLastTime))};
    const auto day = floor<days>(point);
    const year_month_day date(day);
    const hh_mm_ss clock(point - day);
    std::array<char, 40> text{};
    std::snprintf(text.data(), text.size(), "%04d-%02u-%02uT%02d:%02d:%02dZ",
                  static_cast<int>(date.year()), static_cast<unsigned>(date.month()),
                  static_cast<unsigned>(date.day()), static_cast<int>(clock.hours().count()),
                  static_cast<int>(clock.minutes().count()),
                  static_cast<int>(clock.seconds().count()));
    return text.data();
}

bool InstanceSink::OpenInstance(std::string_view className) {
    open_.className = className;
    open_.properties.clear();
    return true;
}

bool InstanceSink::AddProperty(std::string_view name, PropertyValue value) {
    open_.properties.emplace_back(name, std::move(value));
    return true;
}

}  // namespace NQORTQR20
