#pragma once

#include <optional>
#include <string>

#include "program/reports/report.h"
#include "program/reports/view.h"

// How the reports for people put the values of the view into words. The texts are those of the
// controller: a report cleans them for where they go.

namespace ipmisel {

/// "2026-03-09 02:31:44", UTC.
std::string DateAndTime(NQORTQR20::Time time);
/// When it happened: date and time; "start +0:12:34" for a time since the controller's start; "-"
/// for none.
std::string WhenText(const Event& event);
/// 4.5 seconds, 3 minutes, 2 hours, 12 days: the largest unit that is not less than two of it.
std::string DurationText(double seconds);
/// At most six significant digits.
std::string NumberText(double number);
/// What an event is about, as closely as it is known: the part, else the sensor, else its type.
std::string SubjectText(const Event& event);
/// "80 degrees C, limit 69"; empty without a reading.
std::string ReadingText(const Event& event);
/// The part, or the parts of which it is one.
std::string PartText(const std::string& part, const Texts& candidates);
/// "part number X, serial number Y", as far as known.
std::string OrderText(const std::string& partNumber, const std::string& serialNumber);
/// From when to when, still present.
std::string CourseText(const Finding& finding);
/// "No problem found", "2 problems, the worst critical"; says so when not everything was read.
std::string VerdictText(const std::vector<Finding>& findings, bool inPart);
/// Why no event is shown, of a node (from 0) or of all of them: there is none, none could be read,
/// or none is wanted.
std::string NoEventsText(const ReportEnd& end, std::optional<std::size_t> node = {});
/// How many events are shown, of all that there are.
std::string ShownText(std::size_t shown, std::size_t hidden);
/// A controller's clock beside the collector's.
std::string ClockText(const Controller& controller);
/// How full the log is and since when it runs.
std::string EventLogText(const EventLog& log);
/// Parts joined by ", ", empty ones left out.
std::string Listed(const Texts& parts, const char* separator = ", ");

}  // namespace ipmisel
