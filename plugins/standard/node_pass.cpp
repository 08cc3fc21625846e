#include "plugins/standard/node_pass.h"

#include <array>
#include <set>
#include <utility>
#include <variant>

#include "plugins/standard/event_state.h"

namespace standard {

NodePass::NodePass(unsigned number, std::string systemName, NQORTQR20::SPLibrary& library,
                   const SeverityRules& rules, SmbiosFacts smbios)
    : node_(number, library),
      systemName_(std::move(systemName)),
      rules_(rules),
      smbios_(std::move(smbios)) {}

void NodePass::AnnounceEvents() {
    AnnounceInventory();
    node_.controller().Announce(
        std::to_array({ipmi::GetPefConfigurationParameters(ipmi::kPefEventFilterCount)}));
}

void NodePass::AnnounceInventory() {
    // Also where it makes no difference: a replay is asked in the order of the recording.
    node_.controller().Announce(FruAreaCommands(node_.Repository()));
}

const std::vector<FruDevice>& NodePass::FruDevices() {
    if (!fruDevices_) {
        fruDevices_ = ReadFruDevices(node_.controller(), node_.Repository(), OwnFruDevice());
    }
    return *fruDevices_;
}

const std::optional<FruDevice>& NodePass::OwnFruDevice() {
    if (!ownFruDevice_) ownFruDevice_ = ReadOwnFruDevice(node_.controller());
    return *ownFruDevice_;
}

PartEvidence NodePass::PartOf(const ipmi::Sensor& sensor) {
    if (!sensorParts_) sensorParts_ = MakeParts();
    return sensorParts_->OfSensor(sensor);
}

void NodePass::ReadSensors() {
    if (sensorsRead_) return;
    for (const ipmi::Sensor& sensor : node_.Sensors()) {
        facts_.sensors.push_back({.sensor = sensor, .reading = {}, .thresholds = {}});
    }
    sensorsRead_ = true;
}

Parts NodePass::MakeParts() {
    ReadSensors();
    PartFacts facts{.devices = FruDevices(), .associations = {}, .smbios = smbios_};
    for (const ipmi::SdrRecord& record : node_.Repository()) {
        const auto* const association = std::get_if<ipmi::EntityAssociation>(&record.body);
        if (association != nullptr) facts.associations.push_back(*association);
    }
    return {std::move(facts), facts_};
}

const Events& NodePass::GetEvents() {
    if (events_) return *events_;
    facts_.number = node_.number();
    facts_.systemName = systemName_;
    facts_.log = node_.ReadLog();
    facts_.guid = node_.Guid();
    const Clock& clock = node_.GetClock();
    facts_.utcOffsetMinutes = clock.utcOffsetMinutes;
    if (clock.offsetSeconds && clock.uncertaintySeconds) {
        facts_.clock = {.offset = *clock.offsetSeconds, .uncertainty = *clock.uncertaintySeconds};
    }
    ReadSensors();
    if (!facts_.log.empty()) facts_.filters = node_.Filters();
    parts_ = MakeParts();
    // What events are known by where there is no GUID.
    if (!facts_.guid) facts_.serialNumber = Identity().serialNumber;

    events_.emplace(facts_, Tools());
    std::set<ipmi::SensorKey> open;
    for (const LoggedEvent& event : events_->Logged()) {
        if (event.state == EventState::kOpen && event.sensor != nullptr) {
            open.insert(event.sensor->sensor.key);
        }
    }
    for (const SensorFacts& facts : facts_.sensors) {
        if (open.contains(facts.sensor.key)) node_.AnnounceState(facts.sensor);
    }
    for (SensorFacts& facts : facts_.sensors) {
        if (open.contains(facts.sensor.key)) ReadSensorOf(&facts);
    }
    SetPresentStates(events_->Logged());
    return *events_;
}

const std::vector<Finding>& NodePass::Findings() {
    if (findings_) return *findings_;
    const Events& events = GetEvents();
    for (SensorFacts& facts : facts_.sensors) ReadSensorOf(&facts);
    // They grade what sensors say now, too, also where the log has no event.
    if (!facts_.sensors.empty()) facts_.filters = node_.Filters();
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
