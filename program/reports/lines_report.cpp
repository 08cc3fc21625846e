#include <map>

#include "program/reports/completeness_json.h"
#include "program/reports/json_text.h"
#include "program/reports/report.h"
#include "program/reports/systems.h"

namespace ipmisel {
namespace {

/// An object per line, a line per instance or per event, at the end a line per system that sums up.
class LinesReport : public ReportWriter {
public:
    LinesReport(OutputFile& out, const ReportHead& head)
        : out_(out), head_(head), systems_(head), counts_(systems_.All().size()) {}

    void Finish(const ReportEnd& end) override {
        const Json completeness = CompletenessJson(end);
        const bool complete = OutcomeOf(end).exitStatus == 0;
        for (std::size_t i = 0; i < systems_.All().size(); ++i) {
            Json summary = {{"complete", complete}, {"status", StatusJson(end.status)}};
            Json counts = Json::object();
            for (const auto& [name, count] : counts_[i]) counts[name] = count;
            summary["counts"] = std::move(counts);
            if (i < completeness.size()) summary["completeness"] = completeness[i];
            Json line = {{"format", kFormatVersion}};
            if (!systems_.All()[i].name.empty()) line["system"] = systems_.All()[i].name;
            line["summary"] = std::move(summary);
            out_.Write(JsonLine(line) + "\n");
        }
    }

protected:
    void Learn(const NQORTQR20::Instance& instance) {
        if (instance.className == kControllerClass) systems_.Add(ControllerOf(instance));
    }
    /// `"format": ..., "system": ...`, and counts the instance as one of the system.
    std::string Lead(const NQORTQR20::Instance& instance, Integer node) {
        const std::string& name = systems_.Of(node).name;
        const auto index = static_cast<std::size_t>(node.value_or(1) - 1);
        if (index < counts_.size()) ++counts_[index][instance.className];
        return "{\"format\": " + JsonText(kFormatVersion) +
               (name.empty() ? "" : ", \"system\": " + JsonText(name));
    }

    OutputFile& out_;
    ReportHead head_;
    Systems systems_;

private:
    std::vector<std::map<std::string, unsigned>> counts_;  ///< by system
};

class NdjsonReport : public LinesReport {
public:
    using LinesReport::LinesReport;
    void Add(const NQORTQR20::Instance& instance) override {
        Learn(instance);
        out_.Write(Lead(instance, NodeOf(instance, head_)) +
                   ", \"class\": " + JsonText(instance.className) + ", \"properties\": {" +
                   JsonProperties(instance) + "}}\n");
    }
};

/// The properties of an event stand beside what they belong to, so that a log store has them flat.
class EventsReport : public LinesReport {
public:
    using LinesReport::LinesReport;
    void Add(const NQORTQR20::Instance& instance) override {
        Learn(instance);
        if (instance.className != kEventClass) return;
        const Integer node = NodeOf(instance, head_);
        const std::string& guid = systems_.Of(node).guid;
        out_.Write(Lead(instance, node) + (guid.empty() ? "" : ", \"guid\": " + JsonText(guid)) +
                   ", \"collected\": " + JsonText(TimeText(head_.collected)) + ", " +
                   JsonProperties(instance) + "}\n");
    }
};

}  // namespace

std::unique_ptr<ReportWriter> MakeNdjsonReport(OutputFile& out, const ReportHead& head,
                                               const ReportLook&) {
    return std::make_unique<NdjsonReport>(out, head);
}

std::unique_ptr<ReportWriter> MakeEventsReport(OutputFile& out, const ReportHead& head,
                                               const ReportLook&) {
    return std::make_unique<EventsReport>(out, head);
}

}  // namespace ipmisel
