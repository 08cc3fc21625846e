#include "plugins/standard/event_severity.h"

namespace standard {

namespace {

std::optional<ipmi::Severity> SeverityOf(ipmi::PefSeverity severity) {
    switch (severity) {
        case ipmi::PefSeverity::kInformation:
            return ipmi::Severity::kInformation;
        case ipmi::PefSeverity::kOk:
            return ipmi::Severity::kOk;
        case ipmi::PefSeverity::kNonCritical:
            return ipmi::Severity::kWarning;
        case ipmi::PefSeverity::kCritical:
            return ipmi::Severity::kCritical;
        case ipmi::PefSeverity::kNonRecoverable:
            return ipmi::Severity::kFatal;
        default:
            return std::nullopt;
    }
}

ipmi::FilteredEvent Filtered(const ipmi::SelRecord& record) {
    return {.generator = {record.bytes[7], record.bytes[8]},
            .sensorType = record.sensorType,
            .sensorNumber = record.sensorNumber,
            .directionAndType = record.bytes[12],
            .data = record.data};
}

// Records that are no sensor events and say themselves that something failed.
ipmi::EventGrade GradeOfRecord(const ipmi::SelRecord& record) {
    using ipmi::Duration;
    using ipmi::Severity;
    if (record.kind == ipmi::RecordKind::kSensorEvent) {
        return ipmi::GradeOf(record.eventType, record.sensorType, record.offset());
    }
    if (record.kind == ipmi::RecordKind::kLinuxPanic) {
        return {
            .asserted = Severity::kCritical, .deasserted = {}, .duration = Duration::kMomentary};
    }
    if (const auto error = ipmi::ParsePcieError(record)) {
        return {.asserted = error->correctable ? Severity::kWarning : Severity::kCritical,
                .deasserted = {},
                .duration = Duration::kLatched};
    }
    return {};
}

}  // namespace

void SetSeverity(std::span<const ipmi::EventFilter> filters, const SeverityRules& rules,
                 LoggedEvent* event) {
    const ipmi::EventGrade grade = GradeOfRecord(event->record);
    event->duration = grade.duration;
    event->severity = grade.Of(event->record.deassertion);
    event->severityFrom = SeverityOrigin::kStandard;
    if (!event->isSensorEvent()) return;
    if (const SeverityRules::Rule* rule = rules.Match(*event)) {
        event->severity = rule->severity;
        event->severityFrom = SeverityOrigin::kUser;
        return;
    }
    if (const auto platform = ipmi::PlatformSeverity(filters, Filtered(event->record))) {
        event->severity = SeverityOf(*platform);
        event->severityFrom = SeverityOrigin::kPlatform;
    }
}

}  // namespace standard
