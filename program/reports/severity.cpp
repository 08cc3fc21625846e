#include "program/reports/severity.h"

#include <array>
#include <cstddef>

namespace ipmisel {
namespace {

// Redfish: DSP0268, EventSeverity. OpenTelemetry: log data model, "Field: SeverityNumber".
constexpr std::array<SeverityInfo, 5> kSeverities{{
    {Severity::kInformation, ipmi::SeverityName(Severity::kInformation), "info", "OK", 9, "INFO"},
    {Severity::kOk, ipmi::SeverityName(Severity::kOk), "ok", "OK", 10, "INFO2"},
    {Severity::kWarning, ipmi::SeverityName(Severity::kWarning), "warning", "Warning", 13, "WARN"},
    {Severity::kCritical, ipmi::SeverityName(Severity::kCritical), "critical", "Critical", 18,
     "ERROR2"},
    {Severity::kFatal, ipmi::SeverityName(Severity::kFatal), "fatal", "Critical", 21, "FATAL"},
}};
static_assert(kSeverities[static_cast<std::size_t>(Severity::kFatal)].name == "fatal");

}  // namespace

std::span<const SeverityInfo> Severities() { return kSeverities; }

const SeverityInfo& InfoOf(Severity severity) {
    return kSeverities[static_cast<std::size_t>(severity)];
}

}  // namespace ipmisel
