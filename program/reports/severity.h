#pragma once

#include <span>
#include <string_view>

#include "ipmi/severity.h"

namespace ipmisel {

using ipmi::ParseSeverity;
using ipmi::Severity;

/// A severity on the scales of others.
struct SeverityInfo {
    Severity severity;
    std::string_view name;
    std::string_view shortName;  ///< at most eight columns
    std::string_view redfish;    ///< EventSeverity of Redfish's LogEntry
    int otelNumber;              ///< SeverityNumber of OpenTelemetry's log data model
    std::string_view otelText;
};

/// From the least to the worst.
std::span<const SeverityInfo> Severities();
const SeverityInfo& InfoOf(Severity severity);

}  // namespace ipmisel
