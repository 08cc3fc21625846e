#include <algorithm>
#include <array>
#include <cstdio>
#include <map>

#include "base/text.h"
#include "collector/report.h"
#include "collector/terminal_text.h"
#include "tqr/splibrary.h"

namespace ipmisel {
namespace {

constexpr std::string_view kLogRecord = "QORSG_IPMILogRecord";
constexpr std::size_t kWidth = 100;
constexpr std::size_t kNameWidth = 24;

struct Column {
    std::string_view title;
    std::size_t width;
};
// 100 columns with one blank between two.
constexpr std::array<Column, 6> kColumns{{{"Record", 6},
                                          {"Time", 19},
                                          {"Source", 14},
                                          {"Sensor type", 13},
                                          {"Direction", 11},
                                          {"Message", 32}}};
static_assert(6 + 19 + 14 + 13 + 11 + 32 + 5 == kWidth);

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

void Remove(std::string_view part, std::string* text) {
    const auto at = text->find(part);
    if (!part.empty() && at != std::string::npos) text->erase(at, part.size());
}

/// The source without a LUN and a channel of 0, which nearly all have.
std::string SourceOf(std::string source) {
    Remove(" LUN 0.", &source);
    Remove(" Channel 0.", &source);
    return source;
}

/// The message without what the columns beside it say.
std::string MessageOf(std::string message, const std::string& sensorType,
                      const std::string& direction) {
    if (!direction.empty()) Remove(" " + direction + ":", &message);
    if (!sensorType.empty()) Remove(sensorType + " - ", &message);
    Remove("(): ", &message);
    return message;
}

std::string ValueText(const tqrhost::PropertyValue& value) {
    if (const auto* text = std::get_if<std::string>(&value)) return *text;
    if (const auto* bytes = std::get_if<std::vector<std::uint8_t>>(&value)) {
        std::string text;
        for (const std::uint8_t byte : *bytes)
            text += Format(text.empty() ? "%02x" : " %02x", byte);
        return text;
    }
    const auto& path = std::get<tqrhost::ObjectPath>(value);
    std::string text = path.className;
    for (const auto& [key, name] : path.keys) text += " " + key + "=" + name;
    return text;
}

class TableReport : public ReportWriter {
public:
    explicit TableReport(std::FILE* out) : out_(out) {}
    void Finish(const ReportEnd& end) override {
        std::string last;
        for (const auto& [name, count] : counts_) {
            last += (last.empty() ? "" : ", ") + std::to_string(count) + " " + name;
        }
        if (counts_.empty()) last = "nothing";
        const std::string missing = MissingText(end);
        PrintLine((counts_.empty() ? "" : "\n") + std::string("Collected: ") + last + ". " +
                  (missing.empty() ? "Complete." : "Missing: " + TerminalText(missing) + "."));
    }

protected:
    bool Take(const tqrhost::Instance& instance) override {
        ++counts_[instance.className];
        const bool isLog = instance.className == kLogRecord;
        const std::string node = isLog ? TextOf(instance, "SourceNode") : "";
        if (instance.className != lastClass_ || node != lastNode_) {
            Heading(instance.className, node);
        }
        lastClass_ = instance.className;
        lastNode_ = node;
        if (isLog) {
            PrintRow(LogRow(instance));
        } else {
            PrintProperties(instance);
        }
        return std::ferror(out_) == 0;
    }

private:
    void PrintLine(const std::string& text) {
        const auto end = text.find_last_not_of(' ');
        std::fwrite(text.data(), 1, end == std::string::npos ? 0 : end + 1, out_);
        std::fputc('\n', out_);
    }

    void Heading(const std::string& className, const std::string& node) {
        const bool several = NQORTQR20::SPLibrary::GetNumberBMCNode() > 1 && !node.empty();
        PrintLine((lastClass_.empty() ? "" : "\n") + TerminalText(className) +
                  (several ? ", node " + TerminalText(node) : ""));
        if (className != kLogRecord) return;
        Row titles;
        for (std::size_t i = 0; i < titles.size(); ++i) titles[i] = kColumns[i].title;
        PrintRow(titles);
        PrintLine(std::string(kWidth, '-'));
    }

    static Row LogRow(const tqrhost::Instance& instance) {
        const std::string direction = DirectionOf(TextOf(instance, "EventType"));
        const std::string sensorType = TextOf(instance, "SensorType");
        return {TextOf(instance, "RecordID"),
                TimeText(TextOf(instance, "MessageTimestamp")),
                SourceOf(TextOf(instance, "Source")),
                sensorType,
                direction,
                MessageOf(TextOf(instance, "Message"), sensorType, direction)};
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
            std::string lead = "  " + Fit(TerminalText(name), kNameWidth) + " ";
            for (const std::string& line :
                 Wrap(TerminalText(ValueText(value)), kWidth - lead.size())) {
                PrintLine(lead + line);
                lead.assign(lead.size(), ' ');
            }
        }
        PrintLine("");
    }

    std::FILE* out_;
    std::map<std::string, unsigned> counts_;
    std::string lastClass_;
    std::string lastNode_;
};

}  // namespace

std::unique_ptr<ReportWriter> MakeTableReport(std::FILE* out, const ReportHead&) {
    return std::make_unique<TableReport>(out);
}

}  // namespace ipmisel
