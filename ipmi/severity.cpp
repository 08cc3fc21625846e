#include "ipmi/severity.h"

#include <algorithm>
#include <array>
#include <cstddef>

#include "ipmi/event_types.h"
#include "ipmi/sensor_types.h"

namespace ipmi {

namespace {

constexpr std::uint8_t kAnySensorType = 0;

// A row is a type, and three letters for each of its offsets from 0 up: severity when asserted,
// when deasserted (I information, O ok, W warning, C critical, F fatal, - none), and how long it
// lasts (S state, L latched, M momentary, R return). "..." is an offset that the standard reserves.
struct Row {
    std::uint8_t eventType;
    std::uint8_t sensorType;
    std::string_view offsets;
};

constexpr std::array kRows = std::to_array<Row>({
    {kThresholdEvents, kAnySensorType, "WOS OIR COS WIR FOS CIR OIR WOS WIR COS CIR FOS"},
    {kUsageEvents, kAnySensorType, "IIS IIS IIS"},
    {kDigitalStateEvents, kAnySensorType, "--S --S"},
    {kPredictiveFailureEvents, kAnySensorType, "OWS WOS"},
    {kLimitEvents, kAnySensorType, "OWS WOS"},
    {kPerformanceEvents, kAnySensorType, "OWS WOS"},
    {kSeverityEvents, kAnySensorType, "O-S WOS COS FOS WOS COS FOS --S I-S"},
    {kPresenceEvents, kAnySensorType, "WOS IWS"},
    {kEnabledEvents, kAnySensorType, "IIS IIS"},
    {kAvailabilityEvents, kAnySensorType, "OIS IIS IIS IIS WOS IIS WOS IIS COS"},
    {kRedundancyEvents, kAnySensorType, "OWS WOS WOS WOS WOS COS WOS WOS"},
    {kAcpiDeviceEvents, kAnySensorType, "IIS IIS IIS IIS"},
    {kSensorSpecificEvents, sensor_type::kPhysicalSecurity, "WOS WOS WOS WOS WOS WOS WOS"},
    {kSensorSpecificEvents, sensor_type::kPlatformSecurity, "WOM WOM WOM WOM WOM WOM"},
    {kSensorSpecificEvents, sensor_type::kProcessor,
     "COL COL COL COL COL COS COL IWS WOS IIS WOS COL WOL"},
    {kSensorSpecificEvents, sensor_type::kPowerSupply, "IWS COS WOS WOS WOS WOS WOS IIS"},
    {kSensorSpecificEvents, sensor_type::kPowerUnit, "IIS IIM COS COS COS COL COS WOS"},
    {kSensorSpecificEvents, sensor_type::kMemory, "WOL COL COL COL WOS WOL IWS COS IIS WOS COS"},
    {kSensorSpecificEvents, sensor_type::kDriveSlot, "IWS COS WOS IIS IIS COS COS IIS WOS"},
    {kSensorSpecificEvents, sensor_type::kSystemFirmwareProgress, "WOM COM IIM"},
    {kSensorSpecificEvents, sensor_type::kEventLoggingDisabled, "WOS WOS IIM WOS WOS WOS WOS"},
    {kSensorSpecificEvents, sensor_type::kWatchdog1, "COM COM COM COM COM WOM WOM WOM"},
    {kSensorSpecificEvents, sensor_type::kSystemEvent, "IIM IIM COL IIM IIM IIM"},
    {kSensorSpecificEvents, sensor_type::kCriticalInterrupt,
     "COM COL COL WOM WOL COL COL WOL COL COL COL WOS"},
    {kSensorSpecificEvents, sensor_type::kButton, "IIM IIM IIM WOS IIM"},
    {kSensorSpecificEvents, sensor_type::kChipSet, "COL COL"},
    {kSensorSpecificEvents, sensor_type::kCable, "IWS WOS"},
    {kSensorSpecificEvents, sensor_type::kSystemBoot, "IIM IIM IIM IIM IIM IIM IIM IIM"},
    {kSensorSpecificEvents, sensor_type::kBootError, "COM WOM WOM COM WOM"},
    {kSensorSpecificEvents, sensor_type::kOsBoot, "IIM IIM IIM IIM IIM IIM IIM IIM IIM WOM WOM"},
    {kSensorSpecificEvents, sensor_type::kOsStop, "COM COM IIM IIM WOM WOM"},
    {kSensorSpecificEvents, sensor_type::kSlot, "COS IIS IWS IIS IIS IIS IIS IIS WOS IIS"},
    {kSensorSpecificEvents, sensor_type::kAcpiPowerState,
     "IIS IIS IIS IIS IIS IIS IIS IIS IIS IIS IIS IIS IIS ... --S"},
    {kSensorSpecificEvents, sensor_type::kWatchdog2, "WOM COM COM COM ... ... ... ... WOM"},
    {kSensorSpecificEvents, sensor_type::kPlatformAlert, "IIM IIM IIM IIM"},
    {kSensorSpecificEvents, sensor_type::kEntityPresence, "I-S --S IIS"},
    {kSensorSpecificEvents, sensor_type::kLan, "WOS OWS"},
    {kSensorSpecificEvents, sensor_type::kManagementSubsystemHealth, "WOS WOS WOS COS WOS COS"},
    {kSensorSpecificEvents, sensor_type::kBattery, "WOS COS IWS"},
    {kSensorSpecificEvents, sensor_type::kSessionAudit, "IIM IIM WOM WOM"},
    {kSensorSpecificEvents, sensor_type::kVersionChange, "IIM IIM WOS WOS WOS WOS IWM IWM"},
    {kSensorSpecificEvents, sensor_type::kFruState, "IIS IIS IIS IIS IIS IIS IIS COS"},
});

constexpr std::size_t kLetters = 4;  // three and a blank
constexpr bool WellFormed(const Row& row) {
    if (row.offsets.size() % kLetters != kLetters - 1) return false;
    for (std::size_t i = 0; i < row.offsets.size(); ++i) {
        constexpr std::array<std::string_view, kLetters> kAllowed{"IOWCF-.", "IOWCF-.", "SLMR.",
                                                                  " "};
        if (kAllowed[i % kLetters].find(row.offsets[i]) == std::string_view::npos) return false;
    }
    return true;
}
static_assert(std::ranges::all_of(kRows, WellFormed));

std::optional<Severity> SeverityOf(char letter) {
    const std::size_t index = std::string_view("IOWCF").find(letter);
    if (index == std::string_view::npos) return std::nullopt;
    return static_cast<Severity>(index);
}

// The earlier offsets, a bit each, that the assertion of an offset takes back.
struct Exclusion {
    std::uint8_t eventType;
    std::uint8_t sensorType;
    std::uint8_t offset;
    std::uint16_t earlier;
};

constexpr std::uint16_t Bits(auto... offsets) {
    return static_cast<std::uint16_t>(((1U << offsets) | ...));
}

constexpr std::array kExclusions = std::to_array<Exclusion>({
    // A reading that is above a lower threshold is above those below it too.
    {kThresholdEvents, kAnySensorType, 1, Bits(0, 2, 4)},
    {kThresholdEvents, kAnySensorType, 3, Bits(2, 4)},
    {kThresholdEvents, kAnySensorType, 5, Bits(4)},
    {kThresholdEvents, kAnySensorType, 6, Bits(7, 9, 11)},
    {kThresholdEvents, kAnySensorType, 8, Bits(9, 11)},
    {kThresholdEvents, kAnySensorType, 10, Bits(11)},
    // "Redundancy lost" is every state without redundancy, "degraded" every one with less than
    // full.
    {kRedundancyEvents, kAnySensorType, 0, Bits(1, 2, 3, 4, 5, 6, 7)},
    {kRedundancyEvents, kAnySensorType, 1, Bits(0, 2, 6, 7)},
    {kRedundancyEvents, kAnySensorType, 2, Bits(0, 1, 3, 4, 5)},
    {kRedundancyEvents, kAnySensorType, 3, Bits(0, 2, 4, 5, 6, 7)},
    {kRedundancyEvents, kAnySensorType, 4, Bits(0, 2, 3, 5, 6, 7)},
    {kRedundancyEvents, kAnySensorType, 5, Bits(0, 2, 3, 4, 6, 7)},
    {kRedundancyEvents, kAnySensorType, 6, Bits(0, 1, 3, 4, 5, 7)},
    {kRedundancyEvents, kAnySensorType, 7, Bits(0, 1, 3, 4, 5, 6)},
    {kSensorSpecificEvents, sensor_type::kPowerSupply, 3, Bits(5)},
    {kSensorSpecificEvents, sensor_type::kPowerSupply, 5, Bits(3)},
    {kSensorSpecificEvents, sensor_type::kEntityPresence, 0, Bits(1)},
    {kSensorSpecificEvents, sensor_type::kEntityPresence, 1, Bits(0, 2)},
    {kSensorSpecificEvents, sensor_type::kEntityPresence, 2, Bits(1)},
    {kSensorSpecificEvents, sensor_type::kLan, 0, Bits(1)},
    {kSensorSpecificEvents, sensor_type::kLan, 1, Bits(0)},
});

// Types of which one offset at most holds at a time, up to the last one that is such a state.
struct OneOfStates {
    std::uint8_t eventType;
    std::uint8_t sensorType;
    std::uint8_t last;
};
constexpr std::array kOneOfStates = std::to_array<OneOfStates>({
    {kUsageEvents, kAnySensorType, 2},
    {kDigitalStateEvents, kAnySensorType, 1},
    {kPredictiveFailureEvents, kAnySensorType, 1},
    {kLimitEvents, kAnySensorType, 1},
    {kPerformanceEvents, kAnySensorType, 1},
    {kSeverityEvents, kAnySensorType, 6},
    {kPresenceEvents, kAnySensorType, 1},
    {kEnabledEvents, kAnySensorType, 1},
    {kAvailabilityEvents, kAnySensorType, 8},
    {kAcpiDeviceEvents, kAnySensorType, 3},
    {kSensorSpecificEvents, sensor_type::kAcpiPowerState, 12},
    {kSensorSpecificEvents, sensor_type::kFruState, 7},
});

struct PresenceRow {
    std::uint8_t eventType;
    std::uint8_t sensorType;
    std::uint8_t offset;
    Presence presence;
};
constexpr std::array kPresenceRows = std::to_array<PresenceRow>({
    {kPresenceEvents, kAnySensorType, 0, Presence::kAbsent},
    {kPresenceEvents, kAnySensorType, 1, Presence::kPresent},
    {kSensorSpecificEvents, sensor_type::kProcessor, 7, Presence::kPresent},
    {kSensorSpecificEvents, sensor_type::kPowerSupply, 0, Presence::kPresent},
    {kSensorSpecificEvents, sensor_type::kMemory, 6, Presence::kPresent},
    {kSensorSpecificEvents, sensor_type::kDriveSlot, 0, Presence::kPresent},
    {kSensorSpecificEvents, sensor_type::kSlot, 2, Presence::kPresent},
    {kSensorSpecificEvents, sensor_type::kEntityPresence, 0, Presence::kPresent},
    {kSensorSpecificEvents, sensor_type::kEntityPresence, 1, Presence::kAbsent},
    {kSensorSpecificEvents, sensor_type::kBattery, 2, Presence::kPresent},
    {kSensorSpecificEvents, sensor_type::kFruState, 0, Presence::kAbsent},
    {kSensorSpecificEvents, sensor_type::kFruState, 4, Presence::kPresent},
});

bool IsOf(const auto& row, std::uint8_t eventType, std::uint8_t sensorType) {
    return row.eventType == eventType &&
           (row.sensorType == kAnySensorType || row.sensorType == sensorType);
}

}  // namespace

std::optional<Severity> ParseSeverity(std::string_view name) {
    const auto* const found = std::ranges::find(kSeverityNames, name);
    if (found == kSeverityNames.end()) return std::nullopt;
    return static_cast<Severity>(found - kSeverityNames.begin());
}

EventGrade GradeOf(std::uint8_t eventType, std::uint8_t sensorType, std::uint8_t offset) {
    const auto* const row = std::ranges::find_if(
        kRows, [&](const Row& candidate) { return IsOf(candidate, eventType, sensorType); });
    const std::size_t at = offset * kLetters;
    if (row == kRows.end() || at >= row->offsets.size()) return {};
    EventGrade grade{.asserted = SeverityOf(row->offsets[at]),
                     .deasserted = SeverityOf(row->offsets[at + 1])};
    switch (row->offsets[at + 2]) {
        case 'L':
            grade.duration = Duration::kLatched;
            break;
        case 'M':
            grade.duration = Duration::kMomentary;
            break;
        case 'R':
            grade.duration = Duration::kReturn;
            break;
        default:
            break;
    }
    return grade;
}

bool Excludes(std::uint8_t eventType, std::uint8_t sensorType, std::uint8_t asserted,
              std::uint8_t earlier) {
    for (const OneOfStates& states : kOneOfStates) {
        if (IsOf(states, eventType, sensorType)) {
            return asserted != earlier && asserted <= states.last && earlier <= states.last;
        }
    }
    return std::ranges::any_of(kExclusions, [&](const Exclusion& row) {
        return IsOf(row, eventType, sensorType) && row.offset == asserted &&
               (row.earlier >> earlier & 1) != 0;
    });
}

std::optional<Presence> PresenceOf(std::uint8_t eventType, std::uint8_t sensorType,
                                   std::uint8_t offset) {
    const auto* const found = std::ranges::find_if(kPresenceRows, [&](const PresenceRow& row) {
        return IsOf(row, eventType, sensorType) && row.offset == offset;
    });
    if (found == kPresenceRows.end()) return std::nullopt;
    return found->presence;
}

}  // namespace ipmi
