#include "plugins/standard/node_pass.h"

#include <set>
#include <utility>

#include "plugins/standard/event_state.h"

namespace standard {

NodePass::NodePass(unsigned number, std::string systemName, NQORTQR20::SPLibrary& library,
                   const SeverityRules& rules)
    : node_(number, library),
      systemName_(std::move(systemName)),
      rules_(rules),
      parts_(std::make_unique<EntityParts>()) {}

const std::vector<Event>& NodePass::Events() {
    if (events_) return *events_;
    facts_.number = node_.number();
    facts_.systemName = systemName_;
    facts_.log = node_.Log();
    facts_.guid = node_.Guid();
    const Clock& clock = node_.GetClock();
    facts_.utcOffsetMinutes = clock.utcOffsetMinutes;
    if (clock.offsetSeconds && clock.uncertaintySeconds) {
        facts_.clock = {.offset = *clock.offsetSeconds, .uncertainty = *clock.uncertaintySeconds};
    }
    for (const ipmi::Sensor& sensor : node_.Sensors()) {
        facts_.sensors.push_back({.sensor = sensor, .reading = {}, .thresholds = {}});
    }
    if (!facts_.log.empty()) facts_.filters = node_.Filters();

    events_ = DeriveEvents(facts_, Tools());
    std::set<ipmi::SensorKey> open;
    for (const Event& event : *events_) {
        if (event.state == EventState::kOpen && event.sensor != nullptr) {
            open.insert(event.sensor->sensor.key);
        }
    }
    for (SensorFacts& facts : facts_.sensors) {
        if (open.contains(facts.sensor.key)) ReadSensorOf(&facts);
    }
    SetPresentStates(*events_);
    return *events_;
}

const std::vector<Finding>& NodePass::Findings() {
    if (findings_) return *findings_;
    const std::vector<Event>& events = Events();
    for (SensorFacts& facts : facts_.sensors) ReadSensorOf(&facts);
    findings_ = DeriveFindings(facts_, events, Tools());
    return *findings_;
}

DerivationTools NodePass::Tools() {
    return {.rules = rules_,
            .parts = *parts_,
            .convert = [this](const ipmi::Sensor& sensor, std::uint8_t raw) {
                return node_.ValueOf(sensor, raw);
            }};
}

void NodePass::ReadSensorOf(SensorFacts* facts) {
    const SensorState& state = node_.StateOf(facts->sensor);
    facts->reading = state.reading;
    facts->thresholds = state.thresholds;
}

}  // namespace standard
