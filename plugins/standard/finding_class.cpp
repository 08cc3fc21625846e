#include <iterator>

#include "plugins/standard/classes.h"

namespace standard {

namespace {

using enum NQORTQR20::fdrPropertyType;
using NQORTQR20::fdrPropertyInfo;

constexpr fdrPropertyInfo kProperties[] = {
    {"Node", kInteger, "node, from 1"},
    {"Severity", kText, "warning, critical or fatal"},
    {"State", kText, "open, or momentary for a fault of late that is over"},
    {"Title", kText, "what is wrong, in one line"},
    {"Part", kText, "part that it is about"},
    {"PartNumber", kText, "its part number"},
    {"SerialNumber", kText, "its serial number"},
    {"PartCertain", kBoolean, "the evidence names the part itself"},
    {"PartCandidates", kTextList, "parts, one of which it is about"},
    {"FirstTime", kTime, "time of its first event"},
    {"LastTime", kTime, "time of its last event"},
    {"Count", kInteger, "number of its events; 0 where only the sensor tells"},
    {"Events", kTextList, "keys of its events"},
    {"FirstCause", kText, "key of the first fault in the burst of its first event"},
    {"Evidence", kTextList, "what it is concluded from"},
    {"StillPresent", kBoolean, "by the present reading of the sensor"},
};

void WriteFindings(NodePass& pass, Output& output) {
    const Events& events = pass.GetEvents();
    for (const Finding& finding : pass.Findings()) {
        if (!output.Begin(kFindingClass.info.name)) return;
        output.Integer("Node", pass.node().number());
        output.Text("Severity", ipmi::SeverityName(finding.severity));
        output.Text("State",
                    EventStateName(finding.isOpen ? EventState::kOpen : EventState::kMomentary));
        output.Text("Title", finding.title);
        WritePart(finding.part, output);
        std::vector<std::string> keys;
        std::optional<std::int64_t> first;
        std::optional<std::int64_t> last;  // of those that have a time
        for (const std::size_t i : finding.events) {
            keys.push_back(events.KeyOf(i));
            const auto time = events.Logged()[i].time;
            if (!time) continue;
            if (!first) first = time;
            last = time;
        }
        output.Time("FirstTime", first);
        output.Time("LastTime", last);
        output.Integer("Count", static_cast<std::int64_t>(finding.events.size()));
        output.Texts("Events", keys);
        if (finding.firstCause) output.Text("FirstCause", events.KeyOf(*finding.firstCause));
        output.Texts("Evidence", finding.evidence);
        output.Boolean("StillPresent", finding.stillPresent);
        output.End();
    }
}

}  // namespace

const ClassEntry kFindingClass{
    .info = {.name = "IPMI_Finding",
             .description = "what is wrong now, worst first, with its evidence",
             .marks = NQORTQR20::kByDefault | NQORTQR20::kReadsLog | NQORTQR20::kReadsSensors,
             .nodeProperty = "Node",
             .exporter = nullptr,
             .properties = kProperties,
             .propertyCount = std::size(kProperties)},
    .write = WriteFindings,
    .announce = [](NodePass& pass) { pass.AnnounceEvents(); }};

}  // namespace standard
