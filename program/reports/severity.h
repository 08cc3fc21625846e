#pragma once

#include <optional>
#include <span>
#include <string_view>

namespace ipmisel {

/// How bad an event is; worse is greater.
enum class Severity { kInformation, kOk, kWarning, kCritical, kFatal };

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
/// By name; empty for any other text.
std::optional<Severity> SeverityNamed(std::string_view name);

}  // namespace ipmisel
