#include "program/reports/severity.h"

#include <algorithm>
#include <array>
#include <cstddef>

namespace ipmisel {
namespace {

// Redfish: DSP0268, EventSeverity. OpenTelemetry: log data model, "Field: SeverityNumber".
constexpr std::array<SeverityInfo, 5> kSeverities{{
    {Severity::kInformation, "information", "info", "OK", 9, "INFO"},
    {Severity::kOk, "ok", "ok", "OK", 10, "INFO2"},
    {Severity::kWarning, "warning", "warning", "Warning", 13, "WARN"},
    {Severity::kCritical, "critical", "critical", "Critical", 18, "ERROR2"},
    {Severity::kFatal, "fatal", "fatal", "Critical", 21, "FATAL"},
}};
static_assert(kSeverities[static_cast<std::size_t>(Severity::kFatal)].name == "fatal");

}  // namespace

std::span<const SeverityInfo> Severities() { return kSeverities; }

const SeverityInfo& InfoOf(Severity severity) {
    return kSeverities[static_cast<std::size_t>(severity)];
}

std::optional<Severity> SeverityNamed(std::string_view name) {
    const auto* const info = std::find_if(kSeverities.begin(), kSeverities.end(),
                                          [name](const SeverityInfo& i) { return i.name == name; });
    if (info == kSeverities.end()) return std::nullopt;
    return info->severity;
}

}  // namespace ipmisel
