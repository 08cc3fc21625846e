#include <algorithm>
#include <array>
#include <map>

#include "base/text.h"
#include "program/reports/report.h"
#include "program/reports/terminal_text.h"

namespace ipmisel {
namespace {

constexpr std::string_view kLogRecord = "QORSG_IPMILogRecord";
constexpr std::string_view kNoAuxiliary = "No Extended Data";
constexpr std::size_t kWidth = 100;
constexpr std::size_t kNameWidth = 24;

struct Column {
    std::string_view title;
    std::size_t width;
};
// 100 columns with one blank between two.
constexpr std::array<Column, 6> kColumns{{{"Record", 6},
                                          {"Time", 19},
                                          {"Source", 12},
                                          {"Sensor type", 14},
                                          {"Direction", 11},
                                          {"Message", 33}}};
static_assert(6 + 19 + 12 + 14 + 11 + 33 + 5 == kWidth);

using Row = std::array<std::string, kColumns.size()>;

std::string TextOf(const tqrhost::Instance& instance, std::string_view name) {
    for (const auto& [property, value] : instance.properties) {
        const auto* text = std::get_if<std::string>(&value);
        if (property == name && text != nullptr) return *text;
    }
    return {};
}

/// "20240305120000.000000+060" as "2024-03-05 12:00:00"; "-" for no time.
std::string TimeText(const std::string& cim) {
    if (cim.size() < 14 || cim == "19700101000000.000000+000") return "-";
    return cim.substr(0, 4) + "-" + cim.substr(4, 2) + "-" + cim.substr(6, 2) + " " +
           cim.substr(8, 2) + ":" + cim.substr(10, 2) + ":" + cim.substr(12, 2);
}

/// Assertion or deassertion, as the event type says first.
std::string DirectionOf(const std::string& eventType) {
    const auto comma = eventType.find(',');
    return comma == std::string::npos ? eventType : eventType.substr(0, comma);
}

void Replace(std::string_view part, std::string_view by, std::string* text) {
    const auto at = text->find(part);
    if (at != std::string::npos) text->replace(at, part.size(), by);
}

/// The source without a LUN and a channel of 0, which nearly all have.
std::string SourceOf(std::string source) {
    Replace(" LUN 0.", "", &source);
    Replace(" Channel 0.", "", &source);
    source.erase(source.find_last_not_of(". ") + 1);
    return source.empty() ? "-" : source;
}

/// The message without what the columns beside it say: "Processor 1 (Temperature - CPU Temp):
/// Assertion: ..." as "Processor 1 (CPU Temp): ...".
std::string MessageOf(std::string message, const std::string& sensorType,
                      const std::string& direction) {
    if (!direction.empty()) Replace("): " + direction + ": ", "): ", &message);
    if (!sensorType.empty()) Replace("(" + sensorType + " - ", "(", &message);
    if (message.starts_with(" (): ")) message.erase(0, 5);
    return message;
}

std::string ShownValue(const std::string& text) { return text; }

std::string ShownValue(const std::vector<std::uint8_t>& bytes) {
    std::string text;
    for (const std::uint8_t byte : bytes) text += Format(text.empty() ? "%02x" : " %02x", byte);
    return text;
}

std::string ShownValue(const tqrhost::ObjectPath& path) {
    std::string text = path.className;
    for (const auto& [key, name] : path.keys) {
        text += Format(" %s=%s", key.c_str(), name.c_str());
    }
    return text;
}

std::string ShownValue(std::int64_t number) { return std::to_string(number); }
std::string ShownValue(double number) { return Format("%g", number); }
std::string ShownValue(bool truth) { return truth ? "yes" : "no"; }
std::string ShownValue(tqrhost::Time time) { return tqrhost::TimeText(time); }

std::string ShownValue(const std::vector<std::string>& texts) {
    std::string text;
    for (const std::string& each : texts) text += (text.empty() ? "" : "; ") + each;
    return text;
}

std::string ValueText(const tqrhost::PropertyValue& value) {
    return std::visit([](const auto& each) { return ShownValue(each); }, value);
}

class TableReport : public ReportWriter {
public:
    TableReport(OutputFile& out, const ReportHead& head) : out_(out), nodes_(head.nodes) {
        PrintLine((head.machineType.empty() ? "Machine of unknown type"
                                            : "Machine " + TerminalText(head.machineType)) +
                  ", " + std::to_string(nodes_) + (nodes_ == 1 ? " BMC" : " BMCs") + ", from " +
                  TerminalText(head.source));
    }
    void Add(const tqrhost::Instance& instance) override {
        ++counts_[instance.className];
        const bool isLog = instance.className == kLogRecord;
        const std::string node = isLog ? TextOf(instance, "SourceNode") : "";
        if (instance.className != lastClass_ || node != lastNode_) {
            Heading(instance.className, node);
        } else if (!isLog) {
            PrintLine("");
        }
        lastClass_ = instance.className;
        lastNode_ = node;
        if (isLog) {
            PrintRow(LogRow(instance));
        } else {
            PrintProperties(instance);
        }
    }
    void Finish(const ReportEnd& end) override {
        std::string last;
        for (const auto& [name, count] : counts_) {
            last += (last.empty() ? "" : ", ") + std::to_string(count) + " " + name;
        }
        if (last.empty()) last = "nothing";
        const Outcome outcome = OutcomeOf(end);
        PrintLine("");
        last += (outcome.problem.empty() ? ". Complete" : "; " + outcome.problem) + ".";
        for (const std::string& line : Wrap(TerminalText("Collected: " + last), kWidth)) {
            PrintLine(line);
        }
    }

private:
    void PrintLine(const std::string& text) {
        const auto end = text.find_last_not_of(' ');
        out_.Write(text.substr(0, end == std::string::npos ? 0 : end + 1) + "\n");
    }

    void Heading(const std::string& className, const std::string& node) {
        PrintLine("");
        PrintLine(TerminalText(className) +
                  (nodes_ > 1 && !node.empty() ? ", node " + TerminalText(node) : ""));
        if (className != kLogRecord) return;
        Row titles;
        for (std::size_t i = 0; i < titles.size(); ++i) titles[i] = kColumns[i].title;
        PrintRow(titles);
        PrintLine(std::string(kWidth, '-'));
    }

    static Row LogRow(const tqrhost::Instance& instance) {
        const std::string direction = DirectionOf(TextOf(instance, "EventType"));
        const std::string sensorType = TextOf(instance, "SensorType");
        std::string message = MessageOf(TextOf(instance, "Message"), sensorType, direction);
        const std::string auxiliary = TextOf(instance, "AuxLog");
        if (auxiliary != kNoAuxiliary) message += " " + auxiliary;
        return {
            TextOf(instance, "RecordID"),         TimeText(TextOf(instance, "MessageTimestamp")),
            SourceOf(TextOf(instance, "Source")), sensorType,
            direction.empty() ? "-" : direction,  message};
    }

    void PrintRow(const Row& row) {
        std::array<std::vector<std::string>, kColumns.size()> cells;
        std::size_t lines = 1;
        for (std::size_t i = 0; i < row.size(); ++i) {
            cells[i] = Wrap(TerminalText(row[i]), kColumns[i].width);
            lines = std::max(lines, cells[i].size());
        }
        for (std::size_t line = 0; line < lines; ++line) {
            std::string text;
            for (std::size_t i = 0; i < row.size(); ++i) {
                const std::string cell = line < cells[i].size() ? cells[i][line] : "";
                text += (i == 0 ? "" : " ") + Fit(cell, kColumns[i].width);
            }
            PrintLine(text);
        }
    }

    void PrintProperties(const tqrhost::Instance& instance) {
        for (const auto& [name, value] : instance.properties) {
            const std::string shown = ValueText(value);
            // The heading says the class; what has no value says nothing.
            if (name == "CreationClassName" || shown.find_first_not_of(' ') == std::string::npos) {
                continue;
            }
            const std::string label = TerminalText(name) + ":";
            const std::size_t width = std::clamp(Columns(label), kNameWidth, kWidth / 2);
            std::string lead = "  " + Fit(label, width) + " ";
            const std::size_t indent = Columns(lead);
            for (const std::string& line : Wrap(TerminalText(shown), kWidth - indent)) {
                PrintLine(lead + line);
                lead.assign(indent, ' ');
            }
        }
    }

    OutputFile& out_;
    std::size_t nodes_;
    std::map<std::string, unsigned> counts_;
    std::string lastClass_;
    std::string lastNode_;
};

}  // namespace

std::unique_ptr<ReportWriter> MakeTableReport(OutputFile& out, const ReportHead& head) {
    return std::make_unique<TableReport>(out, head);
}

}  // namespace ipmisel
