#pragma once

#include <cstdint>

namespace ipmi {

/// What a time stamp of the event log tells, IPMI 2.0 clause 37.
enum class TimeKind : std::uint8_t {
    kClock,       ///< seconds since 1970-01-01, by the controller's clock
    kSinceStart,  ///< seconds since the controller was started, its clock not being set yet
    kNone,        ///< unspecified
};

constexpr std::uint32_t kUnspecifiedTime = 0xFFFFFFFF;
/// Up to here, and including it, a time stamp counts from the start of the controller.
constexpr std::uint32_t kMaxSinceStart = 0x20000000;

constexpr TimeKind KindOfTime(std::uint32_t seconds) {
    if (seconds == kUnspecifiedTime) return TimeKind::kNone;
    return seconds <= kMaxSinceStart ? TimeKind::kSinceStart : TimeKind::kClock;
}

}  // namespace ipmi
