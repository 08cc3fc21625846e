#include "plugins/standard/events.h"

#include <algorithm>
#include <array>
#include <utility>

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

Events::Events(const NodeFacts& node, DerivationTools tools)
    : tools_(std::move(tools)), identity_(SystemIdentity(node)) {
    for (const SensorFacts& facts : node.sensors) sensors_.emplace(facts.sensor.key, &facts);
    logged_.reserve(node.log.size());
    for (const ipmi::SelRecord& record : node.log) {
        LoggedEvent& event = logged_.emplace_back();
        event.record = record;
        event.target = EventTarget(ipmi::DecodeEventData(record));
        if (event.isSensorEvent()) {
            const auto sensor = sensors_.find(event.sensorKey());
            if (sensor != sensors_.end()) event.sensor = sensor->second;
        }
        SetSeverity(node.filters, tools_.rules, &event);
    }
    SetTimes(node, logged_);
    panicTexts_ = JoinPanics(logged_);
    SetStates(logged_);
}

Event Events::WithData(const LoggedEvent& logged) const {
    Event event(logged);
    event.data = ipmi::DecodeEventData(event.record);
    if (event.isSensorEvent() && event.data.sensorNumber) {
        ipmi::SensorKey failed = event.sensorKey();
        failed.number = *event.data.sensorNumber;
        const auto named = sensors_.find(failed);
        if (named != sensors_.end() && !named->second->sensor.name.empty()) {
            event.data.words.push_back(named->second->sensor.name);
        }
    }
    return event;
}

Event Events::WithText(std::size_t place) const {
    Event event = WithData(logged_[place]);
    const auto panic = panicTexts_.find(place);
    if (panic != panicTexts_.end()) event.text = panic->second;
    SetText(&event);
    return event;
}

PartEvidence Events::PartOf(const Event& event) const {
    return IsAboutAPart(event.record.sensorType) ? tools_.parts.OfEvent(event) : PartEvidence();
}

Event Events::operator[](std::size_t place) const {
    Event event = WithText(place);
    event.key = KeyOf(place);
    event.part = PartOf(event);
    SetReading(tools_.convert, &event);
    SetSentence(&event);
    return event;
}

std::string Events::KeyOf(std::size_t place) const {
    return EventKey(identity_, logged_[place].record);
}

std::string Events::TextOf(std::size_t place) const { return WithText(place).text; }

PartEvidence Events::PartOf(std::size_t place) const { return PartOf(WithData(logged_[place])); }

}  // namespace standard
