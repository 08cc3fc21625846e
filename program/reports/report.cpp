#include "program/reports/report.h"

#include <algorithm>
#include <charconv>
#include <iterator>
#include <variant>

#include "program/commands/failure.h"
#include "program/reports/view.h"

namespace ipmisel {
namespace {

// What a format is made of, where not of all classes.
constexpr std::string_view kReading[] = {kControllerClass, kEventLogClass, kSensorClass,
                                         kFruClass,        kEventClass,    kFindingClass};
constexpr std::string_view kEvents[] = {kControllerClass, kEventClass};
constexpr std::string_view kEventRows[] = {kEventClass};
constexpr std::string_view kState[] = {kControllerClass, kEventLogClass, kEventClass,
                                       kFindingClass};

constexpr FormatInfo kFormats[] = {
    {"table", "for reading, on a terminal", MakeTableReport, kReading, true},
    {"json", "one object", MakeJsonReport, {}},
    {"ndjson", "an object per line, a line per instance", MakeNdjsonReport, {}},
    {"events", "an object per line, a line per event, flat", MakeEventsReport, kEvents},
    {"csv", "comma-separated values, a row per event", MakeCsvReport, kEventRows},
    {"html", "one page for a browser", MakeHtmlReport, kReading, true},
    {"redfish", "a Redfish LogEntryCollection", MakeRedfishReport, kEvents},
    {"prometheus", "metrics for a node exporter's textfile collector", MakePrometheusReport,
     kState},
    {"otlp", "OpenTelemetry logs (OTLP/JSON)", MakeOtlpReport, kEvents},
};

void AppendPart(const char* separator, const std::string& part, std::string* text) {
    if (part.empty()) return;
    if (!text->empty()) *text += separator;
    *text += part;
}

std::string NotRead(const char* what, const NQORTQR20::SourceAccount& account) {
    if (account.Missing() == 0) return {};
    return std::to_string(account.Missing()) + " of " + std::to_string(*account.announced) + " " +
           what + " not read";
}

/// The first fault tells why; the report has them all.
std::string FirstFault(const NQORTQR20::NodeCompleteness& account) {
    for (const NQORTQR20::ReadFault& fault : account.faults) {
        if (!fault.ofLogOrSensors) continue;
        return fault.what + (fault.record.empty() ? "" : " " + fault.record) + ": " + fault.problem;
    }
    return {};
}

/// What is missing of a collection, in one line; empty when nothing is.
std::string MissingText(const ReportEnd& end) {
    std::string text;
    for (std::size_t node = 0; node < end.completeness.size(); ++node) {
        const NQORTQR20::NodeCompleteness& account = end.completeness[node];
        if (account.Whole()) continue;
        std::string part;
        AppendPart(", ", NotRead("log records", account.log), &part);
        AppendPart(", ", NotRead("sensor records", account.sensors), &part);
        if (const unsigned lost = account.log.NotExported(); lost != 0) {
            AppendPart(", ",
                       std::to_string(lost) + " of " + std::to_string(account.log.read) +
                           " log records not exported",
                       &part);
        }
        AppendPart(", ", FirstFault(account), &part);
        if (end.completeness.size() > 1) {
            part.insert(0, "node " + std::to_string(node + 1) + " (" + account.source + "): ");
        }
        AppendPart("; ", part, &text);
    }
    return text;
}

std::string StopText(NQORTQR20::StopReason reason) {
    switch (reason) {
        case NQORTQR20::StopReason::kDeadline:
            return "the deadline has passed";
        case NQORTQR20::StopReason::kInterrupted:
            return "interrupted";
        case NQORTQR20::StopReason::kNone:
            break;
    }
    return {};
}

}  // namespace

std::span<const FormatInfo> KnownFormats() { return kFormats; }

const FormatInfo* FindFormat(std::string_view name) {
    const auto* const found = std::find_if(std::begin(kFormats), std::end(kFormats),
                                           [name](const FormatInfo& f) { return f.name == name; });
    return found == std::end(kFormats) ? nullptr : found;
}

std::optional<std::int64_t> NodeOf(const NQORTQR20::Instance& instance, std::string_view property) {
    for (const auto& [name, value] : instance.properties) {
        if (name != property) continue;
        std::int64_t node = 0;
        if (const auto* const number = std::get_if<std::int64_t>(&value)) node = *number;
        if (const auto* const text = std::get_if<std::string>(&value)) {
            std::from_chars(text->data(), text->data() + text->size(), node);
        }
        if (node >= 1) return node;
    }
    return std::nullopt;
}

std::string_view NodeProperty(std::string_view className, const ReportHead& head) {
    const auto info =
        std::find_if(head.classes.begin(), head.classes.end(),
                     [&](const NQORTQR20::ClassInfo& each) { return each.name == className; });
    return info == head.classes.end() ? "Node" : std::string_view(info->nodeProperty);
}

std::optional<std::int64_t> NodeOf(const NQORTQR20::Instance& instance, const ReportHead& head) {
    return NodeOf(instance, NodeProperty(instance.className, head));
}

std::string LineOf(const Outcome& outcome) {
    return outcome.problem + (outcome.advice.empty() ? "" : "; " + outcome.advice);
}

Outcome OutcomeOf(const ReportEnd& end) {
    if (end.recorded) return *end.recorded;
    if (!end.hasBmc && end.status.code == NQORTQR20::kStatusOk) {
        return {kExitNoSource, "no BMC: the machine has no management controller",
                "name a machine that has one with --from"};
    }
    std::string missing = StopText(end.stopped);
    for (const NQORTQR20::UnreachableNode& node : end.unreachable) {
        AppendPart("; ", node.name + " could not be opened", &missing);
    }
    AppendPart("; ", MissingText(end), &missing);
    // What was stopped is no failure of the plug-in, whatever it made of the silence.
    if (end.status.code != NQORTQR20::kStatusOk && end.stopped == NQORTQR20::StopReason::kNone) {
        std::string problem = "the pass ended with status " + std::to_string(end.status.code) +
                              " (" + end.status.TranslateStatusCode() + ")";
        AppendPart("; ", missing, &problem);
        return {kExitPassFailed, problem, "--log-level info shows where it failed"};
    }
    if (missing.empty()) return {kExitCollected, "", ""};
    return {kExitPart, "collected in part: " + missing,
            "collect again, or see completeness in --format json"};
}

}  // namespace ipmisel
