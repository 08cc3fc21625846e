#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "ipmi/event_data.h"
#include "ipmi/sel_record.h"
#include "ipmi/severity.h"
#include "plugins/standard/facts.h"
#include "plugins/standard/part.h"

namespace standard {

enum class SeverityOrigin : std::uint8_t { kStandard, kPlatform, kUser };
/// "standard", "platform", "user".
std::string_view SeverityOriginName(SeverityOrigin origin);

enum class EventState : std::uint8_t { kOpen, kResolved, kMomentary };
/// "open", "resolved", "momentary".
std::string_view EventStateName(EventState state);

/// What the data of an event name: two events of a sensor that name different ones are not about
/// the same.
struct EventTarget {
    std::optional<std::uint8_t> memoryModule, slotType, slotNumber, processorInstance, sensorNumber,
        fruDevice;
    explicit EventTarget(const ipmi::EventData& data)
        : memoryModule(data.memoryModule),
          slotType(data.slotType),
          slotNumber(data.slotNumber),
          processorInstance(data.processorInstance),
          sensorNumber(data.sensorNumber),
          fruDevice(data.fruDevice) {}
    EventTarget() = default;
    /// What only one of them names may be the same.
    bool MayBe(const EventTarget& other) const;
};

/// A record of the event log with what takes the rest of the log to tell: of the longest log all
/// are held at once. Times are seconds since 1970-01-01 UTC; other events are named by their place
/// in the log, from 0. What is not known is empty.
struct LoggedEvent {
    ipmi::SelRecord record;

    std::optional<std::int64_t> time;  ///< by the controller's clock; of TimeKind::kClock
    std::optional<std::int64_t> correctedTime;
    /// The step of the controller's clock that shows at this record.
    std::optional<std::int64_t> clockStep;
    /// Whether the clock was or may have been set or lost between the record before and this one.
    bool clockChanged = false;

    std::optional<ipmi::Severity> severity;
    SeverityOrigin severityFrom = SeverityOrigin::kStandard;
    ipmi::Duration duration = ipmi::Duration::kState;

    std::optional<EventState> state;
    std::optional<std::size_t> resolvedBy;
    std::optional<bool> stillPresent;

    /// By owner, LUN and number; borrowed of the node's facts.
    const SensorFacts* sensor = nullptr;
    EventTarget target;
    std::optional<std::size_t> continuationOf;

    ipmi::TimeKind timeKind() const { return ipmi::KindOfTime(record.time); }
    bool isSensorEvent() const { return record.kind == ipmi::RecordKind::kSensorEvent; }
    /// Whether it tells of something wrong.
    bool isFault() const { return ipmi::IsFault(severity) && duration != ipmi::Duration::kReturn; }
    ipmi::SensorKey sensorKey() const;
    /// The sensor, where its record and the event agree on what it senses. A repository that is not
    /// the machine's gives an event the name of its sensor at most.
    const SensorFacts* agreeingSensor() const;
    /// Whether it is an assertion of this offset of a sensor-specific type.
    bool IsAsserted(std::uint8_t sensorType, std::uint8_t offset) const;
};

/// The event with all that is known of it.
struct Event : LoggedEvent {
    Event() = default;
    explicit Event(const LoggedEvent& logged) : LoggedEvent(logged) {}

    std::string key;
    ipmi::EventData data;
    std::optional<double> reading;
    std::optional<double> threshold;
    std::string unit;  ///< of reading and threshold

    std::string text;
    std::string sentence;
    std::string vendorData;  ///< bytes that the standard leaves to the vendor, hexadecimal
    PartEvidence part;
};

/// Whether the record says that the event log was cleared.
bool IsLogCleared(const LoggedEvent& event);

}  // namespace standard
