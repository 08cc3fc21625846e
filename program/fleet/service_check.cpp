#include "program/fleet/service_check.h"

#include <algorithm>
#include <cstddef>
#include <optional>

#include "base/text.h"
#include "program/commands/failure.h"
#include "program/reports/severity.h"
#include "program/reports/terminal_text.h"
#include "program/reports/wording.h"

namespace ipmisel {
namespace {

constexpr const char* kWords[] = {"OK", "WARNING", "CRITICAL", "UNKNOWN"};
/// A monitoring system keeps so much, or less, of a line.
constexpr std::size_t kMaxText = 1000;

/// The bar would begin the performance data.
std::string LineText(const std::string& text) {
    std::string line = TerminalText(text).substr(0, kMaxText);
    std::replace(line.begin(), line.end(), '|', '/');
    return TerminalText(line);  // what was cut within a character
}

std::string Line(int status, const std::string& text) {
    return std::string("IPMI ") + kWords[status] + " - " + LineText(text);
}

/// What nobody could grade is a warning.
int StatusOf(const Finding& finding) {
    return finding.severity >= Severity::kCritical ? kCheckCritical : kCheckWarning;
}

std::string FindingText(const Finding& finding) {
    return Listed({finding.title, PartText("", finding.partCandidates),
                   OrderText(finding.partNumber, finding.serialNumber)});
}

std::string PerformanceData(const std::vector<SystemSummary>& systems) {
    std::size_t problems = 0, critical = 0, notWhole = 0;
    Integer records;
    std::optional<double> used;
    for (const SystemSummary& system : systems) {
        problems += system.problems;
        critical += system.critical;
        if (system.outcome.exitStatus != kExitCollected) ++notWhole;
        if (system.records) records = records.value_or(0) + *system.records;
        used = std::max(used, system.logUsedPercent);
    }
    // label=value[unit];warning;critical;minimum;maximum
    std::string data = Format("critical=%zu;;0;0 warning=%zu;0;;0", critical, problems - critical);
    if (records) data += Format(" records=%lld;;;0", static_cast<long long>(*records));
    if (used) data += Format(" log_used=%.1f%%;;;0;100", *used);
    if (systems.size() != 1) data += Format(" systems=%zu", systems.size());
    return data + Format(" not_whole=%zu;;;0;%zu", notWhole, systems.size());
}

}  // namespace

CheckResult CheckFailed(const std::string& why) {
    return {kCheckUnknown, Line(kCheckUnknown, why)};
}

CheckResult CheckSystems(const std::vector<SystemSummary>& systems) {
    if (systems.empty()) return CheckFailed("no system to check");
    const SystemSummary& worst = systems.front();
    const auto notWhole = std::find_if(
        systems.begin(), systems.end(),
        [](const SystemSummary& system) { return system.outcome.exitStatus != kExitCollected; });
    const auto named = [&](const SystemSummary& system, const std::string& text) {
        return systems.size() == 1 ? text : system.name + ": " + text;
    };
    int status = kCheckOk;
    std::string text = "no problem";
    if (!worst.findings.empty()) {
        std::size_t problems = 0;
        for (const SystemSummary& system : systems) problems += system.problems;
        status = StatusOf(worst.findings.front());
        text = named(worst, FindingText(worst.findings.front()));
        if (problems > 1) text += Format("; %zu more", problems - 1);
    } else if (notWhole != systems.end()) {
        status = kCheckUnknown;
        text.clear();
    } else if (systems.size() > 1) {
        text += Format(" in %zu systems", systems.size());
    }
    if (notWhole != systems.end()) {
        text = Listed({text, named(*notWhole, LineOf(notWhole->outcome))}, "; ");
    }
    return {status, Line(status, text) + " | " + PerformanceData(systems)};
}

}  // namespace ipmisel
