#include <array>
#include <map>
#include <memory>
#include <span>

#include "base/text.h"
#include "ipmi/event_types.h"
#include "ipmi/sel_record.h"
#include "program/reports/digest.h"
#include "program/reports/json_text.h"
#include "program/reports/report.h"
#include "program/reports/spool.h"
#include "program/reports/systems.h"

// A LogEntryCollection of DMTF's Redfish schema (DSP8010), its entries of LogEntry 1.21.0 in it.
// Several systems have a collection each, one after the other.

namespace ipmisel {
namespace {

constexpr std::string_view kOem = "OEM";

// SensorType by code from 01h, IPMI 2.0 table 42-3. 11h (the older watchdog) has none.
constexpr std::array<std::string_view, 45> kSensorTypes{"",
                                                        "Temperature",
                                                        "Voltage",
                                                        "Current",
                                                        "Fan",
                                                        "Physical Chassis Security",
                                                        "Platform Security Violation Attempt",
                                                        "Processor",
                                                        "Power Supply / Converter",
                                                        "PowerUnit",
                                                        "CoolingDevice",
                                                        "Other Units-based Sensor",
                                                        "Memory",
                                                        "Drive Slot/Bay",
                                                        "POST Memory Resize",
                                                        "System Firmware Progress",
                                                        "Event Logging Disabled",
                                                        "",
                                                        "System Event",
                                                        "Critical Interrupt",
                                                        "Button/Switch",
                                                        "Module/Board",
                                                        "Microcontroller/Coprocessor",
                                                        "Add-in Card",
                                                        "Chassis",
                                                        "ChipSet",
                                                        "Other FRU",
                                                        "Cable/Interconnect",
                                                        "Terminator",
                                                        "SystemBoot/Restart",
                                                        "Boot Error",
                                                        "BaseOSBoot/InstallationStatus",
                                                        "OS Stop/Shutdown",
                                                        "Slot/Connector",
                                                        "System ACPI PowerState",
                                                        "Watchdog",
                                                        "Platform Alert",
                                                        "Entity Presence",
                                                        "Monitor ASIC/IC",
                                                        "LAN",
                                                        "Management Subsystem Health",
                                                        "Battery",
                                                        "Session Audit",
                                                        "Version Change",
                                                        "FRUState"};
static_assert(kSensorTypes[0x08] == "Power Supply / Converter" && kSensorTypes[0x20][0] == 'O' &&
              kSensorTypes[0x2C] == "FRUState");

// EntryCode by offset, IPMI 2.0 table 42-2.
constexpr std::string_view kThreshold[] = {
    "Lower Non-critical - going low",    "Lower Non-critical - going high",
    "Lower Critical - going low",        "Lower Critical - going high",
    "Lower Non-recoverable - going low", "Lower Non-recoverable - going high",
    "Upper Non-critical - going low",    "Upper Non-critical - going high",
    "Upper Critical - going low",        "Upper Critical - going high",
    "Upper Non-recoverable - going low", "Upper Non-recoverable - going high"};
constexpr std::string_view kUsage[] = {"Transition to Idle", "Transition to Active",
                                       "Transition to Busy"};
constexpr std::string_view kDiscreteState[] = {"State Deasserted", "State Asserted"};
constexpr std::string_view kPredictive[] = {"Predictive Failure deasserted",
                                            "Predictive Failure asserted"};
constexpr std::string_view kLimit[] = {"Limit Not Exceeded", "Limit Exceeded"};
constexpr std::string_view kPerformance[] = {"Performance Met", "Performance Lags"};
constexpr std::string_view kSeverity[] = {"Transition to OK",
                                          "Transition to Non-Critical from OK",
                                          "Transition to Critical from less severe",
                                          "Transition to Non-recoverable from less severe",
                                          "Transition to Non-Critical from more severe",
                                          "Transition to Critical from Non-recoverable",
                                          "Transition to Non-recoverable",
                                          "Monitor",
                                          "Informational"};
constexpr std::string_view kPresence[] = {"Device Removed / Device Absent",
                                          "Device Inserted / Device Present"};
constexpr std::string_view kEnabled[] = {"Device Disabled", "Device Enabled"};
constexpr std::string_view kAvailability[] = {
    "Transition to Running",  "Transition to In Test",    "Transition to Power Off",
    "Transition to On Line",  "Transition to Off Line",   "Transition to Off Duty",
    "Transition to Degraded", "Transition to Power Save", "Install Error"};
constexpr std::string_view kRedundancy[] = {
    "Fully Redundant",
    "Redundancy Lost",
    "Redundancy Degraded",
    "Non-redundant:Sufficient Resources from Redundant",
    "Non-redundant:Sufficient Resources from Insufficient Resources",
    "Non-redundant:Insufficient Resources",
    "Redundancy Degraded from Fully Redundant",
    "Redundancy Degraded from Non-redundant"};
constexpr std::string_view kPower[] = {"D0 Power State", "D1 Power State", "D2 Power State",
                                       "D3 Power State"};

/// By event type, 01h to 0Ch.
constexpr std::array<std::span<const std::string_view>, 13> kEntryCodes{
    std::span<const std::string_view>{},
    kThreshold,
    kUsage,
    kDiscreteState,
    kPredictive,
    kLimit,
    kPerformance,
    kSeverity,
    kPresence,
    kEnabled,
    kAvailability,
    kRedundancy,
    kPower};

std::string_view SensorTypeName(std::int64_t code) {
    const auto index = static_cast<std::size_t>(code);
    const std::string_view name = index < kSensorTypes.size() ? kSensorTypes[index] : "";
    return name.empty() ? kOem : name;
}

std::string_view EntryCodeName(const Event& event) {
    if (event.eventTypeCode == ipmi::kSensorSpecificEvents) {
        return event.IsDeasserted() ? "Deassert" : "Assert";
    }
    const auto type = static_cast<std::size_t>(event.eventTypeCode.value_or(0));
    const auto offset = static_cast<std::size_t>(event.offset.value_or(0xFF));
    if (type >= kEntryCodes.size() || offset >= kEntryCodes[type].size()) return kOem;
    return kEntryCodes[type][offset];
}

/// A segment of a URI (RFC 3986): all but unreserved characters stand as %XX.
std::string UriSegment(std::string_view text) {
    constexpr std::string_view kUnreserved =
        "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789-._~";
    std::string out;
    for (const char c : text) {
        out += kUnreserved.find(c) != std::string_view::npos
                   ? std::string(1, c)
                   : Format("%%%02X", static_cast<unsigned>(static_cast<unsigned char>(c)));
    }
    return out.empty() ? "1" : out;
}

void AddSystemEvent(const Event& event, const std::array<std::uint8_t, 16>& record, Json* entry) {
    Json& json = *entry;
    json["EntryType"] = "SEL";
    if (event.sensorTypeCode) {
        json["SensorType"] = SensorTypeName(*event.sensorTypeCode);
        if (json["SensorType"] == kOem) {
            json["OemSensorType"] = Format("0x%02X", static_cast<unsigned>(*event.sensorTypeCode));
        }
    }
    if (event.sensorNumber) json["SensorNumber"] = *event.sensorNumber;
    json["EntryCode"] = EntryCodeName(event);
    if (json["EntryCode"] == kOem) {
        json["OemLogEntryCode"] =
            Format("0x%02X%02X", record[12] & 0x7FU, record[13] & 0x0FU);  // event type, offset
    }
    json["GeneratorId"] = Format("0x%02X%02X", record[8], record[7]);
    json["MessageId"] =
        Format("0x%02X%02X%02X%02X", record[12], record[13], record[14], record[15]);
}

Json EntryOf(const Event& event, const std::string& folder) {
    const std::string id = std::to_string(event.recordId.value_or(0));
    Json json = {{"@odata.id", folder + "/" + id},
                 {"@odata.type", "#LogEntry.v1_21_0.LogEntry"},
                 {"Id", id},
                 {"Name", "Event log record " + id}};
    const auto record = event.Record();
    const std::int64_t type = event.recordType.value_or(record ? (*record)[2] : 0);
    if (record && (type == ipmi::kSystemEventType || type == ipmi::kNonStandardEventType)) {
        AddSystemEvent(event, *record, &json);
    } else {
        json["EntryType"] = "Oem";
        json["OemRecordFormat"] = Format("IPMI record type 0x%02X", static_cast<unsigned>(type));
    }
    json["Severity"] = event.severity ? Json(InfoOf(*event.severity).redfish) : Json(nullptr);
    if (event.time) json["Created"] = TimeText(*event.time);
    json["Message"] = event.sentence.empty() ? event.text : event.sentence;
    if (event.state == "open" || event.state == "resolved") {
        json["Resolved"] = event.state == "resolved";
    }
    if (!event.partNumber.empty()) json["PartNumber"] = event.partNumber;
    if (!event.serialNumber.empty()) json["SerialNumber"] = event.serialNumber;
    if (record) {
        json["DiagnosticDataType"] = "OEM";
        json["OEMDiagnosticDataType"] = "IPMI SEL record";
        json["DiagnosticData"] = Base64(*record);
    }
    return json;
}

class RedfishReport : public ReportWriter {
public:
    RedfishReport(OutputFile& out, const ReportHead& head)
        : out_(out), head_(head), systems_(head), logs_(systems_.All().size()) {}

    void Add(const NQORTQR20::Instance& instance) override {
        if (instance.className != kEventClass) return;
        const Event event = EventOf(instance);
        const auto index = static_cast<std::size_t>(event.node.value_or(1) - 1);
        if (index >= logs_.size()) return;
        Log& log = logs_[index];
        log.entries.Write((log.count++ == 0 ? "\n  " : ",\n  ") +
                          JsonLine(EntryOf(event, Folder(index))));
    }
    void Finish(const ReportEnd&) override {
        for (std::size_t i = 0; i < logs_.size(); ++i) {
            const std::string name = NameOf(i);
            out_.Write("{\"@odata.id\": " + JsonText(Folder(i)) +
                       ", \"@odata.type\": \"#LogEntryCollection.LogEntryCollection\", \"Name\": " +
                       JsonText(name.empty() ? "Event log" : "Event log of " + name) +
                       ", \"Members@odata.count\": " + std::to_string(logs_[i].count) +
                       ", \"Members\": [");
            logs_[i].entries.CopyTo(out_);
            out_.Write("]}\n");
        }
    }

private:
    struct Log {
        Spool entries;
        unsigned count = 0;
    };
    std::string Folder(std::size_t index) const {
        return "/redfish/v1/Systems/" + UriSegment(NameOf(index)) + "/LogServices/SEL/Entries";
    }
    std::string NameOf(std::size_t index) const {
        return systems_.UniqueNameOf(static_cast<std::int64_t>(index + 1));
    }

    OutputFile& out_;
    ReportHead head_;
    Systems systems_;
    std::vector<Log> logs_;
};

}  // namespace

std::unique_ptr<ReportWriter> MakeRedfishReport(OutputFile& out, const ReportHead& head,
                                                const ReportLook&) {
    return std::make_unique<RedfishReport>(out, head);
}

}  // namespace ipmisel
