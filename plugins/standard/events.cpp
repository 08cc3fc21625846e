#include "plugins/standard/events.h"

#include <algorithm>
#include <array>
#include <map>

#include "ipmi/sensor_types.h"
#include "plugins/standard/event_key.h"
#include "plugins/standard/event_severity.h"
#include "plugins/standard/event_state.h"
#include "plugins/standard/event_time.h"

namespace standard {

namespace {

// Whether an event of the sensor type is about its sensor's part. A watchdog, a session or the
// operating system may have a sensor that sits on a board; the board is not what the event tells
// of.
bool IsAboutAPart(std::uint8_t sensorType) {
    namespace type = ipmi::sensor_type;
    constexpr auto kOthers = std::to_array<std::uint8_t>(
        {type::kPlatformSecurity, type::kSystemFirmwareProgress, type::kEventLoggingDisabled,
         type::kWatchdog1, type::kSystemEvent, type::kSystemBoot, type::kBootError, type::kOsBoot,
         type::kOsStop, type::kAcpiPowerState, type::kWatchdog2, type::kPlatformAlert,
         type::kSessionAudit});
    return std::ranges::find(kOthers, sensorType) == kOthers.end();
}

}  // namespace

std::vector<Event> DeriveEvents(const NodeFacts& node, const DerivationTools& tools) {
    std::map<ipmi::SensorKey, const SensorFacts*> sensors;
    for (const SensorFacts& facts : node.sensors) sensors.emplace(facts.sensor.key, &facts);

    const std::vector<std::uint8_t> identity = SystemIdentity(node);
    std::vector<Event> events;
    events.reserve(node.log.size());
    for (const ipmi::SelRecord& record : node.log) {
        Event& event = events.emplace_back();
        event.record = record;
        event.key = EventKey(identity, record);
        event.data = ipmi::DecodeEventData(record);
        if (event.isSensorEvent()) {
            const auto sensor = sensors.find(event.sensorKey());
            if (sensor != sensors.end()) event.sensor = sensor->second;
            if (event.data.sensorNumber) {
                ipmi::SensorKey failed = event.sensorKey();
                failed.number = *event.data.sensorNumber;
                const auto named = sensors.find(failed);
                if (named != sensors.end() && !named->second->sensor.name.empty()) {
                    event.data.words.push_back(named->second->sensor.name);
                }
            }
        }
        SetReading(tools.convert, &event);
        SetSeverity(node.filters, tools.rules, &event);
        if (IsAboutAPart(record.sensorType)) event.part = tools.parts.OfEvent(event);
    }
    SetTimes(node, events);
    JoinPanics(events);
    for (Event& event : events) {
        SetText(&event);
        SetSentence(&event);
    }
    SetStates(events);
    return events;
}

}  // namespace standard
