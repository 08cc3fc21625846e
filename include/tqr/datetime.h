#pragma once

#include <cstdint>
#include <string>

namespace NQORTQR20 {

/// A CIM date-time (DSP0004, datetime type): a point in time with its UTC offset, or an interval.
///
/// Text form of a point in time: "yyyymmddhhmmss.mmmmmmsutc", 25 characters, s the sign and utc the
/// offset in minutes with three digits. Of an interval: "ddddddddhhmmss.mmmmmm:000".
/// A default-constructed value is the point in time "19700101000000.000000+000", which stands for
/// no time.
class TCIMDateTime {
public:
    TCIMDateTime() = default;
    /// From the text form. A text that is none of the two forms gives the default value.
    explicit TCIMDateTime(const char* text);

    /// A point in time: year, month 1-12, day 1-31, hour, minute, second, microseconds, UTC offset
    /// in minutes. Fields are kept as given.
    void Set(unsigned short year, unsigned short month, unsigned int day, unsigned short hour,
             unsigned short minute, unsigned short second, unsigned int microseconds,
             short utcOffset);
    /// An interval: days, hours, minutes, seconds, microseconds.
    void Set(unsigned int days, unsigned short hours, unsigned short minutes,
             unsigned short seconds, unsigned int microseconds);

    /// Minutes east of UTC; 0 for an interval.
    short GetUTCOffset() const { return utcOffset_; }
    std::string ToString() const;
    bool IsInterval() const { return interval_; }

    /// Earlier than; two points in time are compared as instants, with their UTC offsets applied.
    bool operator<(const TCIMDateTime& other) const;
    /// The interval between two values. CIM intervals carry no sign: the result is the absolute
    /// difference.
    TCIMDateTime operator-(const TCIMDateTime& other) const;
    /// Microseconds since 1970-01-01 UTC, or of the interval.
    std::int64_t TotalMicroseconds() const;

private:
    bool interval_ = false;
    std::uint32_t year_ = 1970;  // points in time only
    std::uint32_t month_ = 1;    // points in time only
    std::uint32_t day_ = 1;      // of the month, or days of the interval
    std::uint32_t hour_ = 0;
    std::uint32_t minute_ = 0;
    std::uint32_t second_ = 0;
    std::uint32_t microseconds_ = 0;
    short utcOffset_ = 0;
};

/// What the host knows of the operating system and the platform.
class TOSSpecific {
public:
    /// Now, in local time with its UTC offset.
    static TCIMDateTime GetLocalTime();
    /// The server's machine type: the product name of the SMBIOS system information structure, or
    /// what the source of the collection says; empty when unknown.
    static std::string GetMachineTypeFromID();
};

}  // namespace NQORTQR20
