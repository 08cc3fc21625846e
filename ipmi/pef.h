#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>

// The controller's own event filters: platform event filtering, IPMI 2.0, chapter 17.

namespace ipmi {

/// How an event filter grades what it matches (table 17-2, byte 4).
enum class PefSeverity : std::uint8_t {
    kUnspecified = 0x00,
    kMonitor = 0x01,
    kInformation = 0x02,
    kOk = 0x04,
    kNonCritical = 0x08,
    kCritical = 0x10,
    kNonRecoverable = 0x20,
};

/// The fields of an event that a filter looks at, as bytes 8 to 16 of its record have them.
struct FilteredEvent {
    std::array<std::uint8_t, 2> generator{};
    std::uint8_t sensorType = 0;
    std::uint8_t sensorNumber = 0;
    std::uint8_t directionAndType = 0;  ///< bit 7 set is a deassertion
    std::array<std::uint8_t, 3> data{};
};

/// How an event data byte is compared (17.8). Bits outside `andMask` are not looked at; of the
/// others those in `compare1` must equal `compare2`, and of the rest at least one must.
struct EventDataComparison {
    std::uint8_t andMask = 0;
    std::uint8_t compare1 = 0;
    std::uint8_t compare2 = 0;

    bool Matches(std::uint8_t byte) const;
};

/// An entry of the event filter table (table 17-2).
struct EventFilter {
    std::uint8_t number = 0;  ///< from 1
    bool enabled = false;
    std::uint8_t actions = 0;
    std::uint8_t alertPolicy = 0;
    PefSeverity severity{};
    // FFh matches any.
    std::array<std::uint8_t, 2> generator{};
    std::uint8_t sensorType = 0;
    std::uint8_t sensorNumber = 0;
    std::uint8_t directionAndType = 0;
    std::uint16_t offsets = 0;  ///< bit n: offset n of event data 1
    std::array<EventDataComparison, 3> data{};

    /// Whether an enabled filter matches; one that is not enabled matches nothing.
    bool Matches(const FilteredEvent& event) const;
    /// From an answer of Get PEF Configuration Parameters, parameter 6, after the completion code
    /// and the parameter's revision: the entry's number and its twenty bytes. Empty when a byte is
    /// missing.
    static std::optional<EventFilter> Parse(std::span<const std::uint8_t> data);
};
/// Number and bytes of an entry, as EventFilter::Parse takes them.
constexpr std::size_t kEventFilterLength = 21;

/// The severity that the first filter that matches gives the event. Empty when none matches, or
/// when it leaves the severity open (unspecified, monitor, or a code that is not defined).
std::optional<PefSeverity> PlatformSeverity(std::span<const EventFilter> filters,
                                            const FilteredEvent& event);

}  // namespace ipmi
