#include "plugins/standard/sensor_class.h"

#include <algorithm>
#include <iterator>

#include "base/text.h"
#include "ipmi/entities.h"
#include "ipmi/event_offsets.h"
#include "ipmi/event_types.h"
#include "ipmi/sensor_types.h"
#include "ipmi/severity.h"
#include "ipmi/units.h"
#include "plugins/standard/classes.h"

namespace standard {
namespace {

using enum NQORTQR20::fdrPropertyType;

constexpr const char* kName = "IPMI_Sensor";

constexpr NQORTQR20::fdrPropertyInfo kProperties[] = {
    {"Node", kInteger, "number of the node, from 1"},
    {"RecordID", kInteger, "of the sensor's record in the repository"},
    {"OwnerAddress", kInteger, "slave address of the sensor's controller; odd: a software ID"},
    {"LUN", kInteger, "of the sensor at its owner"},
    {"Number", kInteger, "of the sensor at its owner and LUN"},
    {"Name", kText, "ID string of the record"},
    {"Type", kText, "what it senses"},
    {"TypeCode", kInteger, "the same as a code, IPMI 2.0 table 42-3"},
    {"EventType", kText, "what kind of states it has"},
    {"EventTypeCode", kInteger, "the same as a code, IPMI 2.0 table 42-1"},
    {"Entity", kText, "kind of part that it belongs to"},
    {"EntityID", kInteger, "the same as a code, IPMI 2.0 table 43-13"},
    {"EntityInstance", kInteger, "which of its kind; from 96 on counted within the device"},
    {"EntityIsDeviceRelative", kBoolean, "whether the instance is counted within the device"},
    {"Unit", kText, "of reading and limits"},
    {"Reading", kReal, "present reading"},
    {"Tolerance", kReal, "plus or minus, in the unit"},
    {"Accuracy", kReal, "in percent"},
    {"Nominal", kReal, "nominal reading"},
    {"NormalMinimum", kReal, "lowest normal reading"},
    {"NormalMaximum", kReal, "highest normal reading"},
    {"PositiveHysteresis", kReal, "below a limit going high, in the unit"},
    {"NegativeHysteresis", kReal, "above a limit going low, in the unit"},
    {"LowerNonCritical", kReal, "limit"},
    {"LowerCritical", kReal, "limit"},
    {"LowerNonRecoverable", kReal, "limit"},
    {"UpperNonCritical", kReal, "limit"},
    {"UpperCritical", kReal, "limit"},
    {"UpperNonRecoverable", kReal, "limit"},
    {"States", kTextList, "states that are asserted"},
    {"Status", kText, "\"ok\", \"warning\", \"critical\" or \"unavailable\""},
    {"Part", kText, "the part that it watches"},
    {"Problems", kTextList, "why a value is missing, where the sensor itself or its record says"},
};

struct ThresholdName {
    const char* property;
    const char* state;
    bool critical;
};
// In the order of ipmi::Threshold.
constexpr ThresholdName kThresholds[ipmi::kThresholdCount] = {
    {"LowerNonCritical", "at or below lower non-critical threshold", false},
    {"LowerCritical", "at or below lower critical threshold", true},
    {"LowerNonRecoverable", "at or below lower non-recoverable threshold", true},
    {"UpperNonCritical", "at or above upper non-critical threshold", false},
    {"UpperCritical", "at or above upper critical threshold", true},
    {"UpperNonRecoverable", "at or above upper non-recoverable threshold", true},
};
constexpr unsigned kStateCount = 15;

std::string_view ThresholdStatus(const ipmi::SensorReading& reading) {
    auto worst = ipmi::Severity::kOk;
    for (unsigned i = 0; i < ipmi::kThresholdCount; ++i) {
        if (!reading.Asserted(i)) continue;
        worst = std::max(
            worst, kThresholds[i].critical ? ipmi::Severity::kCritical : ipmi::Severity::kWarning);
    }
    return ipmi::SeverityName(worst);
}

/// Nothing is said of a sensor that has a state which is neither good nor bad, or no others.
std::string_view DiscreteStatus(const ipmi::Sensor& sensor, const ipmi::SensorReading& reading) {
    bool hasGraded = false;  // a state of the sensor's types
    bool isUngraded = false;
    std::optional<ipmi::Severity> worst;
    for (unsigned offset = 0; offset < kStateCount; ++offset) {
        const auto severity =
            ipmi::GradeOf(sensor.eventType, sensor.sensorType, static_cast<std::uint8_t>(offset))
                .asserted;
        hasGraded = hasGraded || severity;
        if (!reading.Asserted(offset)) continue;
        isUngraded = isUngraded || !severity;
        worst = std::max(worst, severity);
    }
    if (ipmi::IsFault(worst)) {
        return ipmi::SeverityName(std::min(*worst, ipmi::Severity::kCritical));
    }
    return hasGraded && !isUngraded ? ipmi::SeverityName(ipmi::Severity::kOk) : "";
}

void WriteRecord(Output& output, const ipmi::Sensor& sensor) {
    output.Integer("RecordID", sensor.recordId);
    output.Integer("OwnerAddress", sensor.key.owner);
    output.Integer("LUN", sensor.key.lun);
    output.Integer("Number", sensor.key.number);
    output.Text("Name", sensor.name);
    output.Text("Type", ipmi::SensorTypeName(sensor.sensorType));
    output.Integer("TypeCode", sensor.sensorType);
    output.Text("EventType", ipmi::EventTypeName(sensor.eventType));
    output.Integer("EventTypeCode", sensor.eventType);
    if (sensor.entity.IsSpecified()) {
        output.Text("Entity", ipmi::EntityName(sensor.entity.id));
        output.Integer("EntityID", sensor.entity.id);
        output.Integer("EntityInstance", sensor.entity.instance);
        output.Boolean("EntityIsDeviceRelative", sensor.entity.IsDeviceRelative());
    }
    if (sensor.IsAnalog()) output.Text("Unit", ipmi::UnitText(sensor.units));
}

/// What the record tells of the readings. Tolerance and accuracy of 0 are not given.
void WriteAnalog(Output& output, const ipmi::Sensor& sensor) {
    const ipmi::AnalogSensor& analog = *sensor.analog;
    const ipmi::Conversion& conversion = analog.conversion;
    const auto value = [&](std::optional<std::uint8_t> raw) {
        return raw ? conversion.Value(*raw) : std::nullopt;
    };
    const auto difference = [&](std::optional<std::uint8_t> counts) -> std::optional<double> {
        if (!counts || sensor.hysteresisAccess == ipmi::LimitAccess::kNone) return std::nullopt;
        return conversion.Difference(*counts);
    };
    if (conversion.factors.toleranceHalfCounts != 0) {
        output.Real("Tolerance", conversion.Tolerance());
    }
    if (conversion.factors.accuracy != 0) {
        output.Real("Accuracy", conversion.AccuracyPercent());
    }
    output.Real("Nominal", value(analog.nominal));
    output.Real("NormalMinimum", value(analog.normalMinimum));
    output.Real("NormalMaximum", value(analog.normalMaximum));
    output.Real("PositiveHysteresis", difference(analog.positiveHysteresis));
    output.Real("NegativeHysteresis", difference(analog.negativeHysteresis));
}

/// Why raw counts of the sensor cannot be converted; empty when they can.
std::string ConversionProblem(const ipmi::Sensor& sensor, const SensorState& state) {
    if (!sensor.IsAnalog()) return {};
    const ipmi::Conversion& conversion = sensor.analog->conversion;
    if (!conversion.IsNonLinear() && conversion.linearization > ipmi::kCubeRoot) {
        return ipmisel::Format("not converted: linearization %02xh is reserved",
                               conversion.linearization);
    }
    if (!conversion.IsNonLinear() && conversion.factors.m == 0) {
        return "not converted: the record's factor M is 0";
    }
    if (!state.reading || state.value) return {};
    return ipmisel::Format(conversion.IsNonLinear()
                               ? "not converted: no reading factors for raw reading %02xh"
                               : "not converted: raw reading %02xh has no value",
                           state.reading->raw);
}

std::vector<std::string> ProblemsOf(const ipmi::SdrRecord& record, const ipmi::Sensor& sensor,
                                    const SensorState& state) {
    std::vector<std::string> problems;
    if (!record.whole) problems.emplace_back("the sensor's record is cut short");
    // A software ID is no controller that could be asked.
    if (!Node::IsReadable(sensor) && sensor.type != ipmi::SdrType::kEventOnly &&
        (sensor.key.owner & 0x01) == 0) {
        std::string owner = ipmisel::Format("behind the controller at %02xh", sensor.key.owner);
        if (sensor.channel != 0) owner += ipmisel::Format(", channel %u", sensor.channel);
        problems.push_back(owner + ": not read");
    }
    std::string conversion = ConversionProblem(sensor, state);
    if (!conversion.empty()) problems.push_back(std::move(conversion));
    return problems;
}

void WriteSensor(NodePass& pass, Output& output, const ipmi::SdrRecord& record,
                 const ipmi::Sensor& sensor) {
    Node& node = pass.node();
    if (!output.Begin(kName)) return;
    output.Integer("Node", node.number());
    WriteRecord(output, sensor);
    const SensorState& state = node.StateOf(sensor);
    output.Real("Reading", state.value);
    if (sensor.IsAnalog()) WriteAnalog(output, sensor);
    for (std::size_t i = 0; i < ipmi::kThresholdCount; ++i) {
        output.Real(kThresholds[i].property, state.limits[i]);
    }
    if (state.reading && state.reading->states) {
        output.Texts("States", StateTexts(sensor, *state.reading));
    }
    output.Text("Status", StatusOf(sensor, state));
    const PartEvidence part = pass.PartOf(sensor);
    if (part.parts.size() == 1) output.Text("Part", part.parts.front().name);
    output.Texts("Problems", ProblemsOf(record, sensor, state));
    output.End();
}

/// A sensor's record that ends before it says what the sensor is.
void WriteCutRecord(Output& output, unsigned node, const ipmi::SdrRecord& record) {
    const std::string problem = "the sensor's record ends before the sensor's type";
    if (!output.Begin(kName)) return;
    output.Integer("Node", node);
    output.Integer("RecordID", record.header.recordId);
    output.Texts("Problems", std::span(&problem, 1));
    output.End();
}

void Write(NodePass& pass, Output& output) {
    for (const ipmi::SdrRecord& record : pass.node().Repository()) {
        if (!record.IsOfSensor()) continue;
        const std::vector<ipmi::Sensor> sensors = record.Sensors();
        if (sensors.empty()) WriteCutRecord(output, pass.node().number(), record);
        for (const ipmi::Sensor& sensor : sensors) WriteSensor(pass, output, record, sensor);
    }
}

}  // namespace

const ClassEntry kSensorClass{
    {kName, "sensors of the repository, their readings, limits and states",
     NQORTQR20::kByDefault | NQORTQR20::kReadsSensors, "Node", nullptr, kProperties,
     std::size(kProperties)},
    Write,
    [](NodePass& pass) { pass.AnnounceInventory(); }};

std::vector<std::string> StateTexts(const ipmi::Sensor& sensor,
                                    const ipmi::SensorReading& reading) {
    std::vector<std::string> texts;
    const unsigned count = sensor.IsThreshold() ? ipmi::kThresholdCount : kStateCount;
    for (unsigned state = 0; state < count; ++state) {
        if (!reading.Asserted(state)) continue;
        if (sensor.IsThreshold()) {
            texts.emplace_back(kThresholds[state].state);
            continue;
        }
        const auto text = ipmi::EventOffsetText(sensor.eventType, sensor.sensorType,
                                                static_cast<std::uint8_t>(state));
        texts.push_back(text.empty() ? "state " + std::to_string(state) : std::string(text));
    }
    return texts;
}

std::string_view StatusOf(const ipmi::Sensor& sensor, const SensorState& state) {
    if (state.unavailable) return "unavailable";
    if (!state.reading || !state.reading->states) return "";
    return sensor.IsThreshold() ? ThresholdStatus(*state.reading)
                                : DiscreteStatus(sensor, *state.reading);
}

}  // namespace standard
