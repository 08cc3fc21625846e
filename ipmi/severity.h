#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <string_view>

namespace ipmi {

/// How bad an event is, from nothing to worst.
enum class Severity : std::uint8_t { kInformation, kOk, kWarning, kCritical, kFatal };

inline constexpr std::array<std::string_view, 5> kSeverityNames{"information", "ok", "warning",
                                                                "critical", "fatal"};
constexpr std::string_view SeverityName(Severity severity) {
    return kSeverityNames[static_cast<std::size_t>(severity)];
}
std::optional<Severity> ParseSeverity(std::string_view name);
constexpr bool IsFault(std::optional<Severity> severity) {
    return severity && *severity >= Severity::kWarning;
}

/// How long what an event tells of lasts.
enum class Duration : std::uint8_t {
    kState,      ///< as long as the sensor says so: its reading shows it
    kLatched,    ///< until it is taken back; the sensor's reading need not show it any more
    kMomentary,  ///< over by itself
    kReturn,     ///< the way back over a threshold: no fault of its own
};

/// What an event is by its type, sensor type and offset. docs/severities.md has every row with its
/// reason.
struct EventGrade {
    std::optional<Severity> asserted;
    std::optional<Severity> deasserted;
    Duration duration = Duration::kState;

    std::optional<Severity> Of(bool deassertion) const {
        return deassertion ? deasserted : asserted;
    }
};
/// Without severities where nothing tells: OEM types, what the standard reserves, and states that
/// are neither good nor bad by themselves.
EventGrade GradeOf(std::uint8_t eventType, std::uint8_t sensorType, std::uint8_t offset);

/// Whether the assertion of one offset says that another of the same sensor no longer holds: "fully
/// redundant" after "redundancy lost", a rise above a threshold after the fall below it.
bool Excludes(std::uint8_t eventType, std::uint8_t sensorType, std::uint8_t asserted,
              std::uint8_t earlier);

/// Whether the offset says that a part is there, and the one that says that it is not: of sensors
/// that tell of presence. None for every other offset.
enum class Presence : std::uint8_t { kPresent, kAbsent };
std::optional<Presence> PresenceOf(std::uint8_t eventType, std::uint8_t sensorType,
                                   std::uint8_t offset);

}  // namespace ipmi
