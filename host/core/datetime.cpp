#include "tqr/datetime.h"

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <optional>
#include <string_view>

namespace NQORTQR20 {
namespace {

constexpr std::size_t kTextLength = 25;
constexpr std::int64_t kSecond = 1'000'000;  // in microseconds
constexpr std::int64_t kMinute = 60 * kSecond;
constexpr std::int64_t kHour = 60 * kMinute;
constexpr std::int64_t kDay = 24 * kHour;
// What eight digits hold; so many days in microseconds still fit into 63 bits.
constexpr std::int64_t kMaxDays = 99'999'999;

/// The number that a run of decimal digits stands for; empty when it is none or above `most`.
std::optional<unsigned> Number(std::string_view digits, unsigned most) {
    unsigned value = 0;
    for (const char c : digits) {
        if (c < '0' || c > '9') return std::nullopt;
        value = value * 10 + static_cast<unsigned>(c - '0');
    }
    if (value > most) return std::nullopt;
    return value;
}

/// Days from 1970-01-01 to the first of a month of the Gregorian calendar. A month outside 1 to 12
/// counts on into the neighbouring years.
std::int64_t DaysToMonth(std::int64_t year, std::int64_t month) {
    // Years are counted from March on: the day that comes and goes is then the last of its year.
    const std::int64_t months = year * 12 + month - 3;
    const std::int64_t marchYear = (months - (months < 0 ? 11 : 0)) / 12;
    const std::int64_t monthOfYear = months - marchYear * 12;
    const auto floorDivide = [](std::int64_t a, std::int64_t b) {
        return (a - (a < 0 ? b - 1 : 0)) / b;
    };
    const std::int64_t leapDays =
        floorDivide(marchYear, 4) - floorDivide(marchYear, 100) + floorDivide(marchYear, 400);
    const std::int64_t dayOfYear = (153 * monthOfYear + 2) / 5;
    constexpr std::int64_t kEpoch = 719468;  // 1970-01-01, counted from 0000-03-01
    return marchYear * 365 + leapDays + dayOfYear - kEpoch;
}

}  // namespace

TCIMDateTime::TCIMDateTime(const char* text) {
    const std::string_view all = text == nullptr ? "" : text;
    if (all.size() != kTextLength || all[14] != '.') return;
    const char sign = all[21];
    if (sign != '+' && sign != '-' && sign != ':') return;
    const auto hour = Number(all.substr(8, 2), 23);
    const auto minute = Number(all.substr(10, 2), 59);
    const auto second = Number(all.substr(12, 2), 60);  // 60 is a leap second
    const auto microseconds = Number(all.substr(15, 6), 999'999);
    const auto offset = Number(all.substr(22, 3), sign == ':' ? 0 : 999);
    if (!hour || !minute || !second || !microseconds || !offset) return;

    const auto asShort = [](unsigned value) { return static_cast<unsigned short>(value); };
    if (sign == ':') {
        const auto days = Number(all.substr(0, 8), kMaxDays);
        if (!days) return;
        Set(*days, asShort(*hour), asShort(*minute), asShort(*second), *microseconds);
        return;
    }
    const auto year = Number(all.substr(0, 4), 9999);
    const auto month = Number(all.substr(4, 2), 12);
    const auto day = Number(all.substr(6, 2), 31);
    if (!year || !month || *month == 0 || !day || *day == 0) return;
    const int minutesEast = sign == '-' ? -static_cast<int>(*offset) : static_cast<int>(*offset);
    Set(asShort(*year), asShort(*month), *day, asShort(*hour), asShort(*minute), asShort(*second),
        *microseconds, static_cast<short>(minutesEast));
}

void TCIMDateTime::Set(unsigned short year, unsigned short month, unsigned int day,
                       unsigned short hour, unsigned short minute, unsigned short second,
                       unsigned int microseconds, short utcOffset) {
    Set(day, hour, minute, second, microseconds);
    interval_ = false;
    year_ = year;
    month_ = month;
    utcOffset_ = utcOffset;
}

void TCIMDateTime::Set(unsigned int days, unsigned short hours, unsigned short minutes,
                       unsigned short seconds, unsigned int microseconds) {
    interval_ = true;
    day_ = days;
    hour_ = hours;
    minute_ = minutes;
    second_ = seconds;
    microseconds_ = microseconds;
    utcOffset_ = 0;
}

std::string TCIMDateTime::ToString() const {
    // A field that needs more digits than the form has shows the most that fits: the text has 25
    // characters whatever the fields hold.
    const auto shown = [](std::uint32_t value, std::uint32_t most) {
        return static_cast<unsigned>(std::min(value, most));
    };
    char date[24];
    char text[64];
    if (interval_) {
        std::snprintf(date, sizeof date, "%08u", shown(day_, kMaxDays));
    } else {
        std::snprintf(date, sizeof date, "%04u%02u%02u", shown(year_, 9999), shown(month_, 99),
                      shown(day_, 99));
    }
    const char sign = interval_ ? ':' : utcOffset_ < 0 ? '-' : '+';
    std::snprintf(text, sizeof text, "%s%02u%02u%02u.%06u%c%03u", date, shown(hour_, 99),
                  shown(minute_, 99), shown(second_, 99), shown(microseconds_, 999'999), sign,
                  shown(static_cast<std::uint32_t>(std::abs(utcOffset_)), 999));
    return text;
}

bool TCIMDateTime::operator<(const TCIMDateTime& other) const {
    return TotalMicroseconds() < other.TotalMicroseconds();
}

TCIMDateTime TCIMDateTime::operator-(const TCIMDateTime& other) const {
    const std::int64_t total = std::abs(TotalMicroseconds() - other.TotalMicroseconds());
    TCIMDateTime difference;
    difference.Set(static_cast<unsigned>(total / kDay),
                   static_cast<unsigned short>(total % kDay / kHour),
                   static_cast<unsigned short>(total % kHour / kMinute),
                   static_cast<unsigned short>(total % kMinute / kSecond),
                   static_cast<unsigned>(total % kSecond));
    return difference;
}

std::int64_t TCIMDateTime::TotalMicroseconds() const {
    const std::int64_t days =
        interval_ ? day_ : DaysToMonth(year_, month_) + static_cast<std::int64_t>(day_) - 1;
    return std::min(days, kMaxDays) * kDay + hour_ * kHour + minute_ * kMinute + second_ * kSecond +
           microseconds_ - utcOffset_ * kMinute;
}

}  // namespace NQORTQR20
