#include "program/reports/wording.h"

#include <algorithm>
#include <cmath>

#include "base/text.h"

namespace ipmisel {
namespace {

std::string Counted(std::int64_t count, const std::string& what) {
    return std::to_string(count) + " " + what + (count == 1 ? "" : "s");
}

}  // namespace

std::string DateAndTime(NQORTQR20::Time time) {
    std::string text = TimeText(time);  // 2026-03-09T02:31:44Z
    text[10] = ' ';
    text.pop_back();
    return text;
}

std::string WhenText(const Event& event) {
    if (event.time) return DateAndTime(*event.time);
    if (!event.secondsSinceStart) return "-";
    const auto s = static_cast<long long>(*event.secondsSinceStart);
    if (s >= 86400)
        return Format("start +%lldd %02lld:%02lld", s / 86400, s / 3600 % 24, s / 60 % 60);
    return Format("start +%lld:%02lld:%02lld", s / 3600, s / 60 % 60, s % 60);
}

std::string DurationText(double seconds) {
    constexpr struct {
        double seconds;
        const char* unit;
    } kUnits[] = {{86400, "days"}, {3600, "hours"}, {60, "minutes"}};
    for (const auto& [length, unit] : kUnits) {
        if (seconds >= 2 * length) return Format("%.0f %s", seconds / length, unit);
    }
    return Format(seconds < 10 ? "%.1f seconds" : "%.0f seconds", seconds);
}

std::string NumberText(double number) { return Format("%.6g", number); }

std::string SubjectText(const Event& event) {
    std::string part = PartText(event.part, event.partCandidates);
    if (!part.empty()) return part;
    return event.sensor.empty() ? event.sensorType : event.sensor;
}

std::string ReadingText(const Event& event) {
    if (!event.reading) return {};
    std::string text = NumberText(*event.reading);
    if (!event.unit.empty()) text += " " + event.unit;
    if (event.threshold) text += ", limit " + NumberText(*event.threshold);
    return text;
}

std::string Listed(const Texts& parts, const char* separator) {
    std::string text;
    for (const std::string& part : parts) {
        if (!part.empty()) text += (text.empty() ? "" : separator) + part;
    }
    return text;
}

std::string PartText(const std::string& part, const Texts& candidates) {
    if (candidates.size() > 1) return "one of: " + Listed(candidates, "; ");
    return part.empty() ? Listed(candidates) : part;
}

std::string OrderText(const std::string& partNumber, const std::string& serialNumber) {
    return Listed({partNumber.empty() ? "" : "part number " + partNumber,
                   serialNumber.empty() ? "" : "serial number " + serialNumber});
}

std::string CourseText(const Finding& finding) {
    std::string when;
    if (finding.firstTime && finding.lastTime && *finding.firstTime != *finding.lastTime) {
        when = DateAndTime(*finding.firstTime) + " to " + DateAndTime(*finding.lastTime);
    } else if (finding.firstTime || finding.lastTime) {
        when = DateAndTime(finding.firstTime ? *finding.firstTime : *finding.lastTime);
    }
    return Listed({when, finding.stillPresent == true ? "still present now" : ""});
}

std::string VerdictText(const std::vector<Finding>& findings, bool inPart) {
    if (findings.empty()) {
        return std::string("No problem found") + (inPart ? " in what could be read" : "");
    }
    std::optional<Severity> worst;
    for (const Finding& finding : findings) worst = std::max(worst, finding.severity);
    return Counted(static_cast<std::int64_t>(findings.size()), "problem") +
           (worst
                ? (findings.size() == 1 ? ", " : ", the worst ") + std::string(InfoOf(*worst).name)
                : "") +
           (inPart ? "; not everything could be read" : "");
}

std::string NoEventsText(const ReportEnd& end, std::optional<std::size_t> node) {
    if (end.hiddenEvents > 0) return "No such events.";
    if (OutcomeOf(end).exitStatus == 0) return "No events.";
    bool empty = !end.completeness.empty();
    for (std::size_t i = 0; i < end.completeness.size(); ++i) {
        if (!node || *node == i) empty = empty && end.completeness[i].log.announced == 0u;
    }
    return empty ? "No events." : "No event could be read.";
}

std::string ShownText(std::size_t shown, std::size_t hidden) {
    return Format("Shown: %zu of %zu events, as --since, --severity and --last ask.", shown,
                  shown + hidden);
}

std::string ClockText(const Controller& controller) {
    // What local time can be away from UTC: from a quarter of an hour to fourteen hours, and what a
    // clock is often wrong by beside it.
    constexpr double kMinZone = 14 * 60;
    constexpr double kMaxZone = (14 * 60 + 1) * 60;
    const double offset = controller.clockOffset.value_or(0);
    const bool otherZone =
        !controller.utcOffset && std::fabs(offset) >= kMinZone && std::fabs(offset) <= kMaxZone;
    std::string text =
        controller.time ? DateAndTime(*controller.time) + (otherZone ? "" : " UTC") : "";
    if (controller.clockOffset) {
        const bool within = std::fabs(offset) <= controller.clockUncertainty.value_or(0);
        text += text.empty() ? "" : ", ";
        if (otherZone) {
            text += DurationText(std::fabs(offset)) + (offset > 0 ? " ahead of" : " behind") +
                    " UTC, its time zone not known";
        } else {
            text += within ? "right"
                           : DurationText(std::fabs(offset)) + (offset > 0 ? " fast" : " slow");
        }
    }
    if (controller.utcOffset) {
        const auto minutes = static_cast<int>(*controller.utcOffset);
        text += Format("%stime zone UTC%c%02d:%02d", text.empty() ? "" : ", ",
                       minutes < 0 ? '-' : '+', std::abs(minutes) / 60, std::abs(minutes) % 60);
    }
    return text;
}

std::string EventLogText(const EventLog& log) {
    return Listed({log.records ? Counted(*log.records, "record") : "",
                   log.usedPercent ? Format("%.0f %% used", *log.usedPercent) : "",
                   log.overflow == true ? "full: events were dropped" : "",
                   log.lastAddition ? "last added to " + DateAndTime(*log.lastAddition) : "",
                   log.lastErase ? "last erased " + DateAndTime(*log.lastErase) : ""});
}

}  // namespace ipmisel
