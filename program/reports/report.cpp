#include "program/reports/report.h"

#include "program/commands/failure.h"

namespace ipmisel {
namespace {

constexpr FormatInfo kFormats[] = {
    {"table", MakeTableReport},
    {"json", MakeJsonReport},
    {"ndjson", MakeNdjsonReport},
};

void AppendPart(const char* separator, const std::string& part, std::string* text) {
    if (part.empty()) return;
    if (!text->empty()) *text += separator;
    *text += part;
}

std::string NotRead(const char* what, const tqrhost::SourceAccount& account) {
    if (account.Missing() == 0) return {};
    return std::to_string(account.Missing()) + " of " +
           std::to_string(*account.announced) + " " + what + " not read";
}

/// The first fault tells why; the report has them all.
std::string FirstFault(const tqrhost::NodeCompleteness& account) {
    for (const tqrhost::ReadFault& fault : account.faults) {
        if (!fault.ofLogOrSensors) continue;
        return fault.what + (fault.record.empty() ? "" : " " + fault.record) + ": " + fault.problem;
    }
    return {};
}

/// What is missing of a collection, in one line; empty when nothing is.
std::string MissingText(const ReportEnd& end) {
    std::string text;
    for (std::size_t node = 0; node < end.completeness.size(); ++node) {
        const tqrhost::NodeCompleteness& account = end.completeness[node];
        if (account.Whole()) continue;
        std::string part;
        AppendPart(", ", NotRead("log records", account.log), &part);
        AppendPart(", ", NotRead("sensor records", account.sensors), &part);
        AppendPart(", ", FirstFault(account), &part);
        if (end.completeness.size() > 1) part.insert(0, "node " + std::to_string(node + 1) + ": ");
        AppendPart("; ", part, &text);
    }
    return text;
}

std::string StopText(tqrhost::StopReason reason) {
    switch (reason) {
        case tqrhost::StopReason::kDeadline:
            return "the deadline has passed";
        case tqrhost::StopReason::kInterrupted:
            return "interrupted";
        case tqrhost::StopReason::kNone:
            break;
    }
    return {};
}

}  // namespace

std::span<const FormatInfo> KnownFormats() { return kFormats; }

Outcome OutcomeOf(const ReportEnd& end) {
    if (!end.hasBmc && end.status.code == NQORTQR20::kStatusOk) {
        return {kExitNoSource, "no BMC: the machine has no management controller",
                "name a machine that has one with --from"};
    }
    std::string missing = StopText(end.stopped);
    AppendPart("; ", MissingText(end), &missing);
    // What was stopped is no failure of the plug-in, whatever it made of the silence.
    if (end.status.code != NQORTQR20::kStatusOk && end.stopped == tqrhost::StopReason::kNone) {
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
