#include "ipmi/event_types.h"

#include <array>

namespace ipmi {

namespace {

constexpr std::array<std::string_view, 13> kNames{"",
                                                  "Threshold",
                                                  "Usage State",
                                                  "Digital State",
                                                  "Predictive Failure",
                                                  "Limit",
                                                  "Performance",
                                                  "Severity",
                                                  "Device Presence",
                                                  "Device Enabled",
                                                  "Availability",
                                                  "Redundancy",
                                                  "ACPI Device Power State"};
static_assert(kNames[kThresholdEvents] == "Threshold" && kNames[kRedundancyEvents] == "Redundancy");

}  // namespace

EventClass ClassOfEventType(std::uint8_t eventType) {
    if (eventType == 0) return EventClass::kUnspecified;
    if (eventType == kThresholdEvents) return EventClass::kThreshold;
    if (eventType <= kAcpiDeviceEvents) return EventClass::kGeneric;
    if (eventType == kSensorSpecificEvents) return EventClass::kSensorSpecific;
    if (eventType >= 0x70 && eventType <= 0x7F) return EventClass::kOem;
    return EventClass::kReserved;
}

std::string_view EventTypeName(std::uint8_t eventType) {
    switch (ClassOfEventType(eventType)) {
        case EventClass::kSensorSpecific:
            return "Sensor-specific";
        case EventClass::kOem:
            return "OEM";
        case EventClass::kReserved:
            return {};
        default:
            return kNames[eventType];
    }
}

}  // namespace ipmi
