#include <iterator>
#include <map>
#include <string>

#include "base/hex.h"
#include "ipmi/entities.h"
#include "ipmi/event_types.h"
#include "ipmi/sensor_types.h"
#include "plugins/standard/classes.h"
#include "plugins/standard/enterprise_names.h"

namespace standard {

namespace {

using enum NQORTQR20::fdrPropertyType;
using NQORTQR20::fdrPropertyInfo;

constexpr fdrPropertyInfo kProperties[] = {
    {"Key", kText, "identity of the event for ever, 32 hexadecimal digits"},
    {"Node", kInteger, "node, from 1"},
    {"RecordID", kInteger, "record ID"},
    {"RecordType", kInteger, "record type"},
    {"NonStandardRecord", kBoolean, "a sensor event in a record type that IPMI does not define"},
    {"Time", kTime, "time by the controller's clock"},
    {"TimeKind", kText, "clock, since start or none"},
    {"TimeZoneKnown", kBoolean, "the controller's UTC offset is known and taken off"},
    {"SecondsSinceStart", kInteger, "seconds since the controller was started"},
    {"CorrectedTime", kTime, "time less what the controller's clock is off"},
    {"ClockStepSeconds", kInteger, "how far the controller's clock was set at this record"},
    {"Severity", kText, "information, ok, warning, critical or fatal"},
    {"SeverityFrom", kText, "standard, platform or user"},
    {"State", kText, "open, resolved or momentary"},
    {"ResolvedBy", kText, "key of the event that resolved it"},
    {"ResolvedTime", kTime, "time of that event"},
    {"StillPresent", kBoolean, "by the present reading of the sensor"},
    {"Direction", kText, "asserted or deasserted"},
    {"Generator", kText, "what generated the event"},
    {"Sensor", kText, "name of the sensor"},
    {"SensorNumber", kInteger, "number of the sensor"},
    {"SensorType", kText, "sensor type"},
    {"SensorTypeCode", kInteger, "sensor type"},
    {"EventType", kText, "event/reading type"},
    {"EventTypeCode", kInteger, "event/reading type"},
    {"Offset", kInteger, "offset of the event within its type"},
    {"Entity", kText, "name of the entity that the sensor watches"},
    {"EntityID", kInteger, "entity ID"},
    {"EntityInstance", kInteger, "entity instance"},
    {"Text", kText, "what happened"},
    {"Reading", kReal, "reading that triggered the event, in Unit"},
    {"Threshold", kReal, "threshold that triggered the event, in Unit"},
    {"Unit", kText, "unit of reading and threshold"},
    {"MakerData", kText, "bytes that IPMI leaves to the vendor, hexadecimal"},
    {"ManufacturerID", kInteger, "IANA enterprise number of an OEM record"},
    {"Manufacturer", kText, "its name"},
    {"Part", kText, "part that the event is about"},
    {"PartNumber", kText, "its part number"},
    {"SerialNumber", kText, "its serial number"},
    {"PartCertain", kBoolean, "the evidence names the part itself"},
    {"PartCandidates", kTextList, "parts, one of which the event is about"},
    {"ContinuationOf", kText, "key of the event whose text goes on here"},
    {"Sentence", kText, "all of it in one line"},
    {"Raw", kText, "the 16 bytes of the record, hexadecimal"},
};

std::string_view TimeKindName(ipmi::TimeKind kind) {
    switch (kind) {
        case ipmi::TimeKind::kClock:
            return "clock";
        case ipmi::TimeKind::kSinceStart:
            return "since start";
        default:
            return "none";
    }
}

void WriteTime(const Event& event, bool zoneKnown, Output& output) {
    output.Time("Time", event.time);
    output.Text("TimeKind", TimeKindName(event.timeKind()));
    if (event.time) output.Boolean("TimeZoneKnown", zoneKnown);
    if (event.timeKind() == ipmi::TimeKind::kSinceStart) {
        output.Integer("SecondsSinceStart", event.record.time);
    }
    output.Time("CorrectedTime", event.correctedTime);
    output.Integer("ClockStepSeconds", event.clockStep);
}

void WriteState(const Event& event, const Events& all, Output& output) {
    if (event.severity) {
        output.Text("Severity", ipmi::SeverityName(*event.severity));
        output.Text("SeverityFrom", SeverityOriginName(event.severityFrom));
    }
    if (event.state) output.Text("State", EventStateName(*event.state));
    if (event.resolvedBy) {
        output.Text("ResolvedBy", all.KeyOf(*event.resolvedBy));
        output.Time("ResolvedTime", all.Logged()[*event.resolvedBy].time);
    }
    output.Boolean("StillPresent", event.stillPresent);
}

void WriteSensor(const Event& event, Output& output) {
    if (!event.isSensorEvent()) return;
    const ipmi::SelRecord& record = event.record;
    output.Text("Direction", record.deassertion ? "deasserted" : "asserted");
    output.Text("Generator", ipmi::GeneratorText(record.generator));
    if (event.sensor != nullptr) output.Text("Sensor", event.sensor->sensor.name);
    output.Integer("SensorNumber", record.sensorNumber);
    output.Text("SensorType", ipmi::SensorTypeName(record.sensorType));
    output.Integer("SensorTypeCode", record.sensorType);
    output.Text("EventType", ipmi::EventTypeName(record.eventType));
    output.Integer("EventTypeCode", record.eventType);
    output.Integer("Offset", record.offset());
    const SensorFacts* const facts = event.agreeingSensor();
    if (facts != nullptr && facts->sensor.entity.IsSpecified()) {
        const ipmi::Entity& entity = facts->sensor.entity;
        output.Text("Entity", ipmi::EntityName(entity.id));
        output.Integer("EntityID", entity.id);
        output.Integer("EntityInstance", entity.instance);
    }
}

// The names of manufacturers, each looked up once.
class Manufacturers {
public:
    const std::string& NameOf(std::uint32_t number) {
        const auto [name, isNew] = names_.try_emplace(number);
        if (isNew) name->second = EnterpriseName(number);
        return name->second;
    }

private:
    std::map<std::uint32_t, std::string> names_;
};

void WriteEvents(NodePass& pass, Output& output) {
    Manufacturers manufacturers;
    const Events& events = pass.GetEvents();
    const bool zoneKnown = pass.node().GetClock().utcOffsetMinutes.has_value();
    for (std::size_t i = 0; i < events.size(); ++i) {
        const Event event = events[i];
        if (!output.Begin(kEventClass.info.name)) return;
        output.Text("Key", event.key);
        output.Integer("Node", pass.node().number());
        output.Integer("RecordID", event.record.id);
        output.Integer("RecordType", event.record.type);
        if (event.record.type == ipmi::kNonStandardEventType) {
            output.Boolean("NonStandardRecord", true);
        }
        WriteTime(event, zoneKnown, output);
        WriteState(event, events, output);
        WriteSensor(event, output);
        output.Text("Text", event.text);
        output.Real("Reading", event.reading);
        output.Real("Threshold", event.threshold);
        output.Text("Unit", event.unit);
        output.Text("MakerData", event.vendorData);
        if (event.record.kind == ipmi::RecordKind::kOemTimestamped) {
            output.Integer("ManufacturerID", event.record.manufacturerId);
            output.Text("Manufacturer", manufacturers.NameOf(event.record.manufacturerId));
        }
        WritePart(event.part, output);
        if (event.continuationOf) {
            output.Text("ContinuationOf", events.KeyOf(*event.continuationOf));
        }
        output.Text("Sentence", event.sentence);
        output.Text("Raw", ipmisel::HexText(event.record.bytes));
        output.End();
    }
}

}  // namespace

void WritePart(const PartEvidence& evidence, Output& output) {
    if (evidence.parts.size() == 1) {
        const Part& part = evidence.parts.front();
        output.Text("Part", part.name);
        output.Text("PartNumber", part.partNumber);
        output.Text("SerialNumber", part.serialNumber);
        output.Boolean("PartCertain", evidence.certain);
    } else if (evidence.parts.size() > 1) {
        std::vector<std::string> candidates;
        for (const Part& part : evidence.parts) candidates.push_back(CandidateText(part));
        output.Texts("PartCandidates", candidates);
    }
}

const ClassEntry kEventClass{
    .info = {.name = "IPMI_Event",
             .description = "the records of the event log in words, with severity, state and part",
             .marks = NQORTQR20::kByDefault | NQORTQR20::kPerLogRecord | NQORTQR20::kReadsLog |
                      NQORTQR20::kReadsSensors,
             .nodeProperty = "Node",
             .exporter = nullptr,
             .properties = kProperties,
             .propertyCount = std::size(kProperties)},
    .write = WriteEvents,
    .announce = [](NodePass& pass) { pass.AnnounceEvents(); }};

}  // namespace standard
