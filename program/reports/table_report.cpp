#include <algorithm>
#include <map>
#include <memory>

#include "base/bytes.h"
#include "base/text.h"
#include "program/reports/report.h"
#include "program/reports/systems.h"
#include "program/reports/terminal_text.h"
#include "program/reports/text_table.h"
#include "program/reports/wording.h"

namespace ipmisel {
namespace {

constexpr std::size_t kNameWidth = 12;      // of what the report itself names
constexpr std::size_t kPropertyWidth = 24;  // of a property that a plug-in names
constexpr std::size_t kNoColumn = 99;
/// From here on an event has its reading, its sensor and its number in columns of their own. With
/// less, most events would take two lines for it.
constexpr std::size_t kWide = 160;
/// Below it the day stands on a line of its own, before its events.
constexpr std::size_t kNarrow = 100;

std::string ShownValue(const std::string& text) { return text; }
std::string ShownValue(const std::vector<std::uint8_t>& bytes) {
    std::string text = DumpBytes(bytes, Digits::kLowerHex);
    if (!text.empty()) text.pop_back();
    return text;
}
std::string ShownValue(const NQORTQR20::ObjectPath& path) {
    std::string text = path.className;
    for (const auto& [key, name] : path.keys) text.append(" ").append(key).append("=").append(name);
    return text;
}
std::string ShownValue(std::int64_t number) { return std::to_string(number); }
std::string ShownValue(double number) { return NumberText(number); }
std::string ShownValue(bool truth) { return truth ? "yes" : "no"; }
std::string ShownValue(NQORTQR20::Time time) { return DateAndTime(time); }
std::string ShownValue(const Texts& texts) { return Listed(texts, "; "); }

/// Findings stand before the events and are known after them: the rows of events wait.
class TableReport : public ReportWriter {
public:
    TableReport(OutputFile& out, const ReportHead& head, const ReportLook& look)
        : out_(out), head_(head), look_(look), systems_(head), events_(systems_.All().size()) {}

    void Add(const NQORTQR20::Instance& instance) override {
        ++counts_[instance.className];
        if (instance.className == kEventClass) {
            AddEvent(EventOf(instance));
        } else if (machine_.Add(instance)) {
            if (instance.className == kControllerClass) systems_.Add(machine_.controllers.back());
        } else if (Shows(instance.className)) {
            AddOther(instance);
        }
    }

    void Finish(const ReportEnd& end) override {
        PrintHead();
        if (Shows(kFindingClass)) PrintFindings(end);
        for (std::size_t i = 0; i < systems_.All().size(); ++i) PrintSystem(i, end);
        if (!otherClass_.empty()) other_.CopyTo(out_);
        PrintEnd(end);
    }

private:
    bool IsNamed(std::string_view className) const {
        return head_.named &&
               std::find(head_.wanted.begin(), head_.wanted.end(), className) != head_.wanted.end();
    }
    /// Whether a class was asked for, so that none of it is worth a word.
    bool Shows(std::string_view className) const {
        return std::find(head_.wanted.begin(), head_.wanted.end(), className) != head_.wanted.end();
    }
    std::size_t IndexOf(Integer node) const {
        const auto index = static_cast<std::size_t>(node.value_or(1) - 1);
        return std::min(index, systems_.All().size() - 1);
    }

    void AddEvent(const Event& event) {
        auto& table = events_[IndexOf(event.node)];
        if (!table)
            table = std::make_unique<TextTable>(EventColumns(), look_.width >= kWide ? 2 : 1);
        TextTable::Row row{{}, event.severity, {}};
        std::string when = WhenText(event);
        if (event.time && look_.width < kNarrow) {
            row.group = when.substr(0, when.find(' '));
            when.erase(0, row.group.size() + 1);
        }
        const std::string severity =
            event.severity ? std::string(InfoOf(*event.severity).shortName) : "-";
        const std::string part = PartText(event.part, event.partCandidates);
        if (look_.width >= kWide) {
            row.cells = {event.recordId ? std::to_string(*event.recordId) : "",
                         when,
                         severity,
                         event.state == "open" ? "open" : "",
                         part.empty() && event.sensor.empty() ? event.sensorType : part,
                         event.sensor,
                         event.text,
                         ReadingText(event)};
        } else {
            // Without a reading the part says enough; a limit is one of a sensor.
            const bool ofSensor =
                event.reading.has_value() && !part.empty() && part != event.sensor;
            row.cells = {when, severity, SubjectText(event),
                         Listed({Listed({ofSensor ? event.sensor : "", event.text}, ": "),
                                 ReadingText(event)},
                                "; ")};
        }
        for (std::string& cell : row.cells) cell = TerminalText(cell);
        table->Add(row);
        zoneUnknown_ = zoneUnknown_ || event.timeZoneKnown == false;
        zoneKnown_ = zoneKnown_ || event.timeZoneKnown == true;
    }
    std::vector<TextTable::Column> EventColumns() const {
        if (look_.width < kWide) {
            return {{"Time", false}, {"Severity", false}, {"Part"}, {"What happened"}};
        }
        return {{"Record", false}, {"Time", false}, {"Severity", false}, {"State", false},
                {"Part"},          {"Sensor"},      {"What happened"},   {"Reading"}};
    }

    /// A class without a place of its own: its properties, a line each.
    void AddOther(const NQORTQR20::Instance& instance) {
        if (instance.className != otherClass_) {
            other_.Write("\n" + Bold(TerminalText(instance.className), look_) + "\n");
        } else {
            other_.Write("\n");
        }
        otherClass_ = instance.className;
        for (const auto& [name, value] : instance.properties) {
            const std::string shown =
                TerminalText(std::visit([](const auto& v) { return ShownValue(v); }, value));
            if (shown.empty()) continue;
            for (const std::string& line : Property(TerminalText(name), shown, kPropertyWidth)) {
                other_.Write(line + "\n");
            }
        }
    }
    /// "  Name:      value", the value in as many lines as it takes.
    std::vector<std::string> Property(const std::string& name, const std::string& value,
                                      std::size_t nameWidth) const {
        const std::string label = name + ":";
        const std::size_t width = std::clamp(Columns(label), nameWidth, look_.width / 2);
        std::string lead = "  " + Fit(label, width) + " ";
        const std::size_t indent = Columns(lead);
        std::vector<std::string> lines;
        for (const std::string& line : Wrap(value, look_.width - indent)) {
            lines.push_back(lead + line);
            lead.assign(indent, ' ');
        }
        return lines;
    }
    void PrintProperty(const std::string& name, const std::string& value) {
        if (value.empty()) return;
        for (const std::string& line : Property(name, TerminalText(value), kNameWidth))
            out_.Write(line + "\n");
    }

    void PrintLine(const std::string& text) { out_.Write(text + "\n"); }
    void PrintWrapped(const std::string& text, const std::string& lead = "") {
        const std::size_t indent = std::min(Columns(lead), look_.width / 2);
        for (const std::string& line : Wrap(TerminalText(text), look_.width - indent)) {
            PrintLine(lead + line);
        }
    }
    void PrintHeading(const std::string& text) {
        PrintLine("\n" + Bold(TerminalText(text), look_));
    }

    std::string SystemText(const SystemInfo& system) const {
        const std::string model = Listed({system.manufacturer, system.product}, " ");
        std::string text =
            Listed({model, system.serial.empty() ? "" : "serial number " + system.serial});
        if (text.empty()) text = head_.machineType;
        return Listed({system.name, text}, ": ");
    }

    void PrintHead() {
        for (const SystemInfo& system : systems_.All()) {
            const std::string text = SystemText(system);
            if (!text.empty()) PrintLine(Bold(TerminalText(text), look_));
        }
        const std::string bmcs =
            std::to_string(head_.nodes) + (head_.nodes == 1 ? " BMC" : " BMCs");
        PrintWrapped(bmcs + " from " + head_.source + ", collected " +
                     DateAndTime(head_.collected) + " UTC");
    }

    void PrintFindings(const ReportEnd& end) {
        const std::vector<Finding>& findings = machine_.findings;
        const std::string verdict = VerdictText(findings, OutcomeOf(end).exitStatus != 0);
        const std::optional<Severity> worst =
            findings.empty() ? std::nullopt : findings.front().severity;
        PrintLine("\n" + Painted(verdict + ".", worst, look_));
        for (const Finding& f : findings) {
            const std::string label =
                Fit(f.severity ? InfoOf(*f.severity).shortName : "-", sizeof "critical" + 1);
            const std::string indent(label.size(), ' ');
            std::string lead = Painted(label, f.severity, look_);
            for (const std::string& line :
                 Wrap(TerminalText(Listed({systems_.LabelOf(f.node), f.title}, ": ")),
                      look_.width - indent.size())) {
                PrintLine(lead + line);
                lead = indent;
            }
            const std::string part = PartText("", f.partCandidates);
            PrintDetail(part, indent);
            PrintDetail(OrderText(f.partNumber, f.serialNumber), indent);
            PrintDetail(CourseText(f), indent);
        }
    }
    void PrintDetail(const std::string& text, const std::string& indent) {
        if (!text.empty()) PrintWrapped(text, indent);
    }

    void PrintSystem(std::size_t index, const ReportEnd& end) {
        if (systems_.All().size() > 1) {
            PrintHeading("Node " + std::to_string(index + 1) +
                         (systems_.All()[index].name.empty() ? "" : ": ") +
                         systems_.All()[index].name);
        }
        PrintParts(index);
        PrintController(index);
        PrintSensors(index);
        PrintEvents(index, end);
    }

    static std::string LabelOf(const Fru& f) {
        return f.name.empty() && f.deviceId ? "FRU " + std::to_string(*f.deviceId) : f.name;
    }
    /// Whether nothing tells the part apart, though it has an inventory.
    static bool IsBare(const Fru& f) {
        return f.manufacturer.empty() && f.product.empty() && f.partNumber.empty() &&
               f.serialNumber.empty();
    }

    void PrintParts(std::size_t index) {
        TextTable table({{"Part"},
                         {"Manufacturer"},
                         {"Product"},
                         {"Part number", false},
                         {"Serial number", false}},
                        kNoColumn);
        for (const Fru& f : machine_.frus) {
            if (IndexOf(f.node) != index) continue;
            TextTable::Row row;
            row.cells = {LabelOf(f), f.manufacturer.empty() ? f.moduleManufacturer : f.manufacturer,
                         f.product, f.partNumber.empty() ? f.modulePartNumber : f.partNumber,
                         f.serialNumber.empty() ? f.moduleSerialNumber : f.serialNumber};
            for (std::string& cell : row.cells) cell = TerminalText(cell);
            table.Add(row);
        }
        if (table.Empty()) return;
        PrintLine("");
        table.Print(out_, look_);
    }

    void PrintController(std::size_t index) {
        for (const Controller& c : machine_.controllers) {
            if (IndexOf(c.node) != index) continue;
            PrintHeading("Controller");
            PrintProperty("Firmware",
                          Listed({c.firmware, c.ipmiVersion.empty() ? "" : "IPMI " + c.ipmiVersion,
                                  c.controllerManufacturer}));
            PrintProperty("Self test", c.selfTest);
            PrintProperty("Clock", ClockText(c));
            PrintProperty("Power", Listed({c.powerOn ? (*c.powerOn ? "on" : "off") : "",
                                           Listed(c.powerFaults)}));
            if (c.chassisIntrusion == true) PrintProperty("Chassis", "opened");
        }
        for (const EventLog& log : machine_.eventLogs) {
            if (IndexOf(log.node) == index) PrintProperty("Event log", EventLogText(log));
        }
    }

    /// Those that are not well; all of them when sensors were asked for by name.
    void PrintSensors(std::size_t index) {
        TextTable table(
            {{"Sensor"}, {"Status", false}, {"Reading", false}, {"Unit"}, {"Limits"}, {"States"}},
            1);
        std::map<std::string, unsigned> byStatus;
        for (const Sensor& s : machine_.sensors) {
            if (IndexOf(s.node) != index) continue;
            ++byStatus[s.status];
            const std::optional<Severity> severity = ParseSeverity(s.status);
            if (!IsNamed(kSensorClass) && severity.value_or(Severity::kOk) <= Severity::kOk)
                continue;
            TextTable::Row row{{}, severity, {}};
            row.cells = {s.name, s.status,    s.reading ? NumberText(*s.reading) : "",
                         s.unit, LimitsOf(s), Listed(s.states)};
            for (std::string& cell : row.cells) cell = TerminalText(cell);
            table.Add(row);
        }
        std::string text;
        for (const auto& [status, count] : byStatus) {
            if (!status.empty())
                text = Listed({text, Listed({std::to_string(count), status}, " ")});
        }
        PrintProperty("Sensors", text);
        if (table.Empty()) return;
        PrintLine("");
        table.Print(out_, look_);
    }
    /// Critical and warning limits, those below and those above: "500/900 .. 80/90".
    static std::string LimitsOf(const Sensor& s) {
        const auto pair = [](const Real& a, const Real& b) {
            return Listed({a ? NumberText(*a) : "", b ? NumberText(*b) : ""}, "/");
        };
        const std::string low = pair(s.lowerCritical, s.lowerNonCritical);
        const std::string high = pair(s.upperNonCritical, s.upperCritical);
        return low.empty() && high.empty() ? "" : low + " .. " + high;
    }

    void PrintEvents(std::size_t index, const ReportEnd& end) {
        if (!events_[index]) {
            if (Shows(kEventClass)) PrintLine("\n" + NoEventsText(end, index));
            return;
        }
        PrintLine("");
        events_[index]->Print(out_, look_);
    }

    bool HasFault(const ReportEnd& end, const Fru& f) const {
        const std::size_t index = IndexOf(f.node);
        if (!f.deviceId || index >= end.completeness.size()) return false;
        const std::string device = Format("%04x", static_cast<unsigned>(*f.deviceId));
        return std::ranges::any_of(end.completeness[index].faults,
                                   [&](const NQORTQR20::ReadFault& fault) {
                                       return !fault.ofLogOrSensors && fault.record == device;
                                   });
    }

    void PrintEnd(const ReportEnd& end) {
        bool headed = false;
        const auto line = [&](const std::string& text) {
            if (!headed) PrintHeading("Not read");
            headed = true;
            PrintWrapped(text, "  ");
        };
        for (std::size_t i = 0; i < end.completeness.size(); ++i) {
            for (const NQORTQR20::ReadFault& fault : end.completeness[i].faults) {
                const std::string node = systems_.All().size() > 1 ? Format("node %zu", i + 1) : "";
                line(Listed({node, Listed({fault.what, fault.record}, " "), fault.problem}, ": "));
            }
        }
        for (const Fru& f : machine_.frus) {
            if (IsBare(f) && !f.problems.empty() && !HasFault(end, f)) {
                line(
                    Listed({systems_.LabelOf(f.node), LabelOf(f), Listed(f.problems, "; ")}, ": "));
            }
        }
        PrintLine("");
        if (zoneUnknown_) {
            PrintWrapped("Times are those of the controller's clock; its time zone is not known.");
        } else if (zoneKnown_) {
            PrintWrapped("Times are UTC.");
        }
        if (end.hiddenEvents > 0) {
            std::size_t& count = counts_[std::string(kEventClass)];
            PrintWrapped(ShownText(count, end.hiddenEvents));
            count += end.hiddenEvents;
        }
        std::string last;
        for (const auto& [name, count] : counts_) {
            last = Listed({last, Listed({std::to_string(count), name}, " ")});
        }
        if (last.empty()) last = "nothing";
        const Outcome outcome = OutcomeOf(end);
        if (!outcome.problem.empty()) {
            last += "; " + outcome.problem + ".";
        } else {
            last += headed ? ". Event log and sensors are complete." : ". Complete.";
        }
        PrintWrapped("Collected: " + last);
    }

    OutputFile& out_;
    ReportHead head_;
    ReportLook look_;
    Systems systems_;
    MachineState machine_;
    std::vector<std::unique_ptr<TextTable>> events_;  ///< by system
    Spool other_;
    std::string otherClass_;
    std::map<std::string, std::size_t, std::less<>> counts_;
    bool zoneUnknown_ = false;
    bool zoneKnown_ = false;
};

}  // namespace

std::unique_ptr<ReportWriter> MakeTableReport(OutputFile& out, const ReportHead& head,
                                              const ReportLook& look) {
    return std::make_unique<TableReport>(out, head, look);
}

}  // namespace ipmisel
