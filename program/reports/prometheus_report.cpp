#include <algorithm>
#include <array>
#include <map>
#include <set>
#include <string>
#include <tuple>
#include <unordered_map>

#include "base/text.h"
#include "program/reports/report.h"
#include "program/reports/systems.h"
#include "program/reports/terminal_text.h"

// Prometheus text exposition format 0.0.4: a HELP and a TYPE line before the samples of a metric,
// gauges only, no time stamps (a node exporter refuses a text file that has some).

namespace ipmisel {
namespace {

using Labels = std::vector<std::pair<std::string_view, std::string>>;

std::string LabelText(std::string_view text) {
    std::string out;
    for (const char c : TerminalText(text)) {
        if (c == '\\' || c == '"') out += '\\';
        out += c;
    }
    return out;
}

class Metric {
public:
    Metric(OutputFile& out, std::string_view name, std::string_view help)
        : out_(out), name_("ipmisel_" + std::string(name)), help_(help) {}
    void Sample(const Labels& labels, double value) {
        if (first_) {
            out_.Write("# HELP " + name_ + " " + help_ + "\n# TYPE " + name_ + " gauge\n");
            first_ = false;
        }
        std::string list;
        for (const auto& [label, text] : labels) {
            if (text.empty()) continue;
            list += (list.empty() ? "" : ",") + std::string(label) + "=\"" + LabelText(text) + "\"";
        }
        // Whole numbers as such: a count of 52 is not 52.0.
        const auto whole = static_cast<std::int64_t>(value);
        const std::string number =
            static_cast<double>(whole) == value ? std::to_string(whole) : Format("%.6g", value);
        out_.Write(name_ + (list.empty() ? "" : "{" + list + "}") + " " + number + "\n");
    }

private:
    OutputFile& out_;
    std::string name_;
    std::string help_;
    bool first_ = true;
};

class PrometheusReport : public ReportWriter {
public:
    PrometheusReport(OutputFile& out, const ReportHead& head)
        : out_(out), head_(head), systems_(head) {}

    void Add(const NQORTQR20::Instance& instance) override {
        if (instance.className == kEventClass) {
            AddEvent(EventOf(instance));
        } else if (machine_.Add(instance) && instance.className == kControllerClass) {
            systems_.Add(machine_.controllers.back());
        }
    }

    void Finish(const ReportEnd& end) override {
        WriteCollection(end);
        WriteFindings();
        WriteEventLogs();
        Metric offset(out_, "controller_clock_offset_seconds",
                      "The controller's clock less the collector's.");
        for (const Controller& c : machine_.controllers) {
            if (c.clockOffset) offset.Sample({{"system", Name(c.node)}}, *c.clockOffset);
        }
    }

private:
    /// A series stands once.
    std::string Name(Integer node) const { return systems_.UniqueNameOf(node); }
    static Integer NodeAt(std::size_t index) { return static_cast<std::int64_t>(index + 1); }

    void AddEvent(const Event& event) {
        if (event.severity && event.time) {
            MaybeTime& last = last_[{event.node.value_or(1), *event.severity}];
            if (!last || last->seconds < event.time->seconds) last = event.time;
        }
        // A finding names its events by key; it says nothing of the sensor's type.
        if (event.severity >= Severity::kWarning) {
            const auto type = types_.insert(event.sensorType).first;
            typeOfEvent_.try_emplace(event.key, &*type);
        }
    }

    void WriteCollection(const ReportEnd& end) {
        Metric success(out_, "collection_success",
                       "1 when all was read, 0 when a part is missing.");
        for (std::size_t i = 0; i < systems_.All().size(); ++i) {
            const bool whole = i < end.completeness.size() ? end.completeness[i].Whole() : false;
            const bool good = OutcomeOf(end).exitStatus == 0 ||
                              (whole && end.status.code == NQORTQR20::kStatusOk);
            success.Sample({{"system", Name(NodeAt(i))}}, good ? 1 : 0);
        }
        Metric collected(out_, "collection_timestamp_seconds", "When the collection was made.");
        for (std::size_t i = 0; i < systems_.All().size(); ++i) {
            collected.Sample({{"system", Name(NodeAt(i))}},
                             static_cast<double>(head_.collected.seconds));
        }
        Metric duration(out_, "collection_duration_seconds", "How long the collection took.");
        if (end.seconds) duration.Sample({}, *end.seconds);
    }

    std::string SensorTypeOf(const Finding& finding) const {
        for (const std::string& key : finding.events) {
            const auto found = typeOfEvent_.find(key);
            if (found != typeOfEvent_.end()) return *found->second;
        }
        return {};
    }

    /// Every severity of a fault has its line, so that a rule sees nothing found as 0.
    void WriteFindings() {
        constexpr Severity kFaults[] = {Severity::kWarning, Severity::kCritical, Severity::kFatal};
        using Key = std::tuple<std::int64_t, Severity, std::string>;
        std::map<Key, unsigned> byType;
        for (const Finding& f : machine_.findings) {
            if (f.severity) ++byType[{f.node.value_or(1), *f.severity, SensorTypeOf(f)}];
        }
        Metric findings(out_, "findings", "Problems that stand, by severity.");
        for (std::size_t i = 0; i < systems_.All().size(); ++i) {
            for (const Severity severity : kFaults) {
                unsigned count = 0;
                for (const auto& [key, number] : byType) {
                    const bool counts = std::get<0>(key) == static_cast<std::int64_t>(i + 1) &&
                                        std::get<1>(key) == severity;
                    if (counts) count += number;
                }
                findings.Sample(
                    {{"system", Name(NodeAt(i))}, {"severity", std::string(InfoOf(severity).name)}},
                    count);
            }
        }
        Metric types(out_, "findings_by_sensor_type",
                     "Problems that stand, by severity and sensor type; none where there is none.");
        for (const auto& [key, count] : byType) {
            const auto& [node, severity, type] = key;
            types.Sample({{"system", Name(node)},
                          {"severity", std::string(InfoOf(severity).name)},
                          {"sensor_type", type.empty() ? "none" : type}},
                         count);
        }
    }

    void WriteEventLogs() {
        Metric last(out_, "last_event_timestamp_seconds",
                    "Time of the newest event of a severity, by the controller's clock.");
        for (const auto& [key, time] : last_) {
            last.Sample(
                {{"system", Name(key.first)}, {"severity", std::string(InfoOf(key.second).name)}},
                static_cast<double>(time->seconds));
        }
        Metric records(out_, "event_log_records", "Records in the event log.");
        for (const EventLog& log : machine_.eventLogs) {
            if (log.records) {
                records.Sample({{"system", Name(log.node)}}, static_cast<double>(*log.records));
            }
        }
        Metric used(out_, "event_log_used_ratio", "How full the event log is, 0 to 1.");
        for (const EventLog& log : machine_.eventLogs) {
            if (log.usedPercent) used.Sample({{"system", Name(log.node)}}, *log.usedPercent / 100);
        }
        Metric overflow(out_, "event_log_overflow", "1 when the log has dropped events.");
        for (const EventLog& log : machine_.eventLogs) {
            if (log.overflow) overflow.Sample({{"system", Name(log.node)}}, *log.overflow ? 1 : 0);
        }
    }

    OutputFile& out_;
    ReportHead head_;
    Systems systems_;
    MachineState machine_;
    std::map<std::pair<std::int64_t, Severity>, MaybeTime> last_;
    std::set<std::string> types_;
    std::unordered_map<std::string, const std::string*> typeOfEvent_;
};

}  // namespace

std::unique_ptr<ReportWriter> MakePrometheusReport(OutputFile& out, const ReportHead& head,
                                                   const ReportLook&) {
    return std::make_unique<PrometheusReport>(out, head);
}

}  // namespace ipmisel
