#include <algorithm>
#include <iterator>

#include "ipmi/event_types.h"
#include "ipmi/sensor_types.h"
#include "program/reports/json_text.h"
#include "program/reports/report.h"
#include "program/reports/systems.h"

// OTLP/JSON (opentelemetry-proto, logs/v1): a LogsData per line, which is an event with the system
// that it is of. 64-bit integers are texts there. Attributes: the semantic conventions for
// hardware.

namespace ipmisel {
namespace {

Json Attribute(std::string_view key, Json value) {
    return {{"key", key}, {"value", std::move(value)}};
}

void AddText(Json* attributes, std::string_view key, const std::string& text) {
    if (!text.empty()) attributes->push_back(Attribute(key, {{"stringValue", text}}));
}

void AddInteger(Json* attributes, std::string_view key, Integer number) {
    if (!number) return;
    attributes->push_back(Attribute(key, {{"intValue", std::to_string(*number)}}));
}

void AddReal(Json* attributes, std::string_view key, Real number) {
    if (number) attributes->push_back(Attribute(key, {{"doubleValue", *number}}));
}

std::string Nanoseconds(MaybeTime time) {
    if (!time || time->seconds <= 0) return "0";  // unsigned; 0 is not known
    return std::to_string(time->seconds) + "000000000";
}

/// hw.type by sensor type (IPMI 2.0 table 42-3); empty where there is none for it.
std::string HardwareType(Integer sensorType) {
    namespace type = ipmi::sensor_type;
    constexpr struct {
        std::int64_t sensorType;
        const char* hardware;
    } kTypes[] = {{type::kTemperature, "temperature"},
                  {type::kVoltage, "voltage"},
                  {type::kFan, "fan"},
                  {type::kPhysicalSecurity, "enclosure"},
                  {type::kProcessor, "cpu"},
                  {type::kPowerSupply, "power_supply"},
                  {type::kMemory, "memory"},
                  {type::kDriveSlot, "physical_disk"},
                  {type::kChassis, "enclosure"},
                  {type::kLan, "network"},
                  {type::kBattery, "battery"}};
    const auto* const row = std::find_if(std::begin(kTypes), std::end(kTypes),
                                         [&](const auto& t) { return t.sensorType == sensorType; });
    return row == std::end(kTypes) ? "" : row->hardware;
}

std::string HardwareState(const Event& event) {
    // "Predictive failure" as an event type, or as an offset of a power supply or a drive.
    const bool predicted =
        (event.eventTypeCode == ipmi::kPredictiveFailureEvents && event.offset == 1) ||
        (event.eventTypeCode == ipmi::kSensorSpecificEvents && event.offset == 2 &&
         (event.sensorTypeCode == ipmi::sensor_type::kPowerSupply ||
          event.sensorTypeCode == ipmi::sensor_type::kDriveSlot));
    if (!event.severity || *event.severity == Severity::kInformation) return {};
    if (*event.severity == Severity::kOk) return "ok";
    if (predicted) return "predicted_failure";
    return *event.severity == Severity::kWarning ? "degraded" : "failed";
}

/// hw.limit_type by offset of a threshold event, two for each limit.
std::string LimitType(const Event& event) {
    constexpr const char* kLimits[] = {"low.degraded",  "low.critical",  "low.critical",
                                       "high.degraded", "high.critical", "high.critical"};
    if (event.eventTypeCode != ipmi::kThresholdEvents || !event.offset) return {};
    const auto limit = static_cast<std::size_t>(*event.offset / 2);
    return limit < std::size(kLimits) ? kLimits[limit] : "";
}

Json AttributesOf(const Event& event) {
    Json list = Json::array();
    AddText(&list, "log.record.uid", event.key);
    AddText(&list, "hw.id", event.part.empty() ? event.sensor : event.part);
    AddText(&list, "hw.name", event.sensor);
    AddText(&list, "hw.type", HardwareType(event.sensorTypeCode));
    AddText(&list, "hw.model", event.partNumber);
    AddText(&list, "hw.serial_number", event.serialNumber);
    AddText(&list, "hw.state", HardwareState(event));
    AddText(&list, "hw.limit_type", LimitType(event));
    AddInteger(&list, "ipmi.record_id", event.recordId);
    AddText(&list, "ipmi.sensor_type", event.sensorType);
    AddText(&list, "ipmi.direction", event.direction);
    AddText(&list, "ipmi.state", event.state);
    AddReal(&list, "ipmi.reading", event.reading);
    AddReal(&list, "ipmi.threshold", event.threshold);
    AddText(&list, "ipmi.unit", event.unit);
    AddText(&list, "ipmi.raw", event.raw);
    return list;
}

class OtlpReport : public ReportWriter {
public:
    OtlpReport(OutputFile& out, const ReportHead& head) : out_(out), head_(head), systems_(head) {}

    void Add(const NQORTQR20::Instance& instance) override {
        if (instance.className == kControllerClass) systems_.Add(ControllerOf(instance));
        if (instance.className != kEventClass) return;
        const Event event = EventOf(instance);
        Json record = {{"timeUnixNano", Nanoseconds(event.time)},
                       {"observedTimeUnixNano", Nanoseconds(head_.collected)},
                       {"severityNumber", event.severity ? InfoOf(*event.severity).otelNumber : 0}};
        if (event.severity) record["severityText"] = InfoOf(*event.severity).otelText;
        record["body"] = {{"stringValue", event.sentence.empty() ? event.text : event.sentence}};
        record["attributes"] = AttributesOf(event);
        record["eventName"] = "ipmi.sel.record";
        const SystemInfo& system = systems_.Of(event.node);
        Json resource = Json::array();
        AddText(&resource, "host.name", system.name);
        AddText(&resource, "host.id", system.guid);
        AddText(&resource, "hw.vendor", system.manufacturer);
        AddText(&resource, "hw.model", system.product);
        AddText(&resource, "hw.serial_number", system.serial);
        const Json scope = {{"name", "ipmisel"}, {"version", head_.plugin.version}};
        Json scopeLogs = {{"scope", scope}, {"logRecords", Json::array({std::move(record)})}};
        Json resourceLogs = {{"resource", {{"attributes", std::move(resource)}}},
                             {"scopeLogs", Json::array({std::move(scopeLogs)})}};
        Json line;
        line["resourceLogs"] = Json::array({std::move(resourceLogs)});
        out_.Write(JsonLine(line) + "\n");
        any_ = true;
    }
    /// No summary: a receiver takes every line for a LogsData. Without an event there is an empty
    /// one.
    void Finish(const ReportEnd&) override {
        if (!any_) out_.Write("{\"resourceLogs\":[]}\n");
    }

private:
    OutputFile& out_;
    ReportHead head_;
    Systems systems_;
    bool any_ = false;
};

}  // namespace

std::unique_ptr<ReportWriter> MakeOtlpReport(OutputFile& out, const ReportHead& head,
                                             const ReportLook&) {
    return std::make_unique<OtlpReport>(out, head);
}

}  // namespace ipmisel
