#include "program/reports/completeness_json.h"
#include "program/reports/json_text.h"
#include "program/reports/report.h"
#include "program/reports/spool.h"
#include "program/reports/systems.h"

namespace ipmisel {
namespace {

/// The status stands before the instances and is known after them: they wait in a spool.
class JsonReport : public ReportWriter {
public:
    JsonReport(OutputFile& out, const ReportHead& head) : out_(out), head_(head), systems_(head) {}
    void Add(const NQORTQR20::Instance& instance) override {
        if (instance.className == kControllerClass) systems_.Add(ControllerOf(instance));
        spool_.Write((any_ ? ",\n    " : "\n    ") + JsonInstance(instance));
        any_ = true;
    }
    void Finish(const ReportEnd& end) override {
        out_.Write("{\n  \"format\": " + JsonText(kFormatVersion));
        out_.Write(",\n  \"source\": " + JsonText(head_.source));
        if (!head_.machineType.empty()) {
            out_.Write(",\n  \"machine_type\": " + JsonText(head_.machineType));
        }
        out_.Write(",\n  \"collected\": " + JsonText(TimeText(head_.collected)));
        const Outcome outcome = OutcomeOf(end);
        out_.Write(std::string(",\n  \"complete\": ") +
                   (outcome.exitStatus == 0 ? "true" : "false"));
        if (!outcome.problem.empty()) out_.Write(",\n  \"problem\": " + JsonText(outcome.problem));
        out_.Write(",\n  \"systems\": " + JsonLine(systems_.AsJson()));
        out_.Write(",\n  \"plugin\": " + JsonLine(PluginJson(head_.plugin)));
        Json plugins = Json::array();
        for (const NQORTQR20::PluginStatus& each : end.plugins) {
            plugins.push_back(PluginJson(each.plugin));
            plugins.back()["status"] = StatusJson(each.status);
        }
        out_.Write(",\n  \"plugins\": " + JsonLine(plugins));
        out_.Write(",\n  \"status\": " + JsonLine(StatusJson(end.status)));
        out_.Write(",\n  \"instances\": [");
        spool_.CopyTo(out_);
        out_.Write(any_ ? "\n  ]" : "]");
        out_.Write(",\n  \"notices\": " + JsonLine(end.notices));
        out_.Write(",\n  \"completeness\": " + JsonLine(CompletenessJson(end)) + "\n}\n");
    }

private:
    OutputFile& out_;
    ReportHead head_;
    Systems systems_;
    Spool spool_;
    bool any_ = false;
};

}  // namespace

std::unique_ptr<ReportWriter> MakeJsonReport(OutputFile& out, const ReportHead& head,
                                             const ReportLook&) {
    return std::make_unique<JsonReport>(out, head);
}

}  // namespace ipmisel
