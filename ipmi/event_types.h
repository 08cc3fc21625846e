#pragma once

#include <cstdint>
#include <string_view>

namespace ipmi {

/// What kind of offsets an event/reading type has, IPMI 2.0 table 42-1.
enum class EventClass : std::uint8_t {
    kUnspecified,
    kThreshold,
    kGeneric,         ///< 02h to 0Ch: offsets that mean the same for every sensor type
    kSensorSpecific,  ///< 6Fh: offsets of the sensor type
    kOem,             ///< 70h to 7Fh
    kReserved,
};

constexpr std::uint8_t kThresholdEvents = 0x01;
constexpr std::uint8_t kUsageEvents = 0x02;
constexpr std::uint8_t kDigitalStateEvents = 0x03;
constexpr std::uint8_t kPredictiveFailureEvents = 0x04;
constexpr std::uint8_t kLimitEvents = 0x05;
constexpr std::uint8_t kPerformanceEvents = 0x06;
constexpr std::uint8_t kSeverityEvents = 0x07;
constexpr std::uint8_t kPresenceEvents = 0x08;
constexpr std::uint8_t kEnabledEvents = 0x09;
constexpr std::uint8_t kAvailabilityEvents = 0x0A;
constexpr std::uint8_t kRedundancyEvents = 0x0B;
constexpr std::uint8_t kAcpiDeviceEvents = 0x0C;
constexpr std::uint8_t kSensorSpecificEvents = 0x6F;

EventClass ClassOfEventType(std::uint8_t eventType);

/// "Threshold", "Redundancy", "Sensor-specific", "OEM"; empty for 00h and the reserved types.
std::string_view EventTypeName(std::uint8_t eventType);

}  // namespace ipmi
