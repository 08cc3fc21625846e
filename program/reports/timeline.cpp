#include "program/reports/timeline.h"

#include <algorithm>
#include <cmath>
#include <map>
#include <utility>

#include "base/text.h"
#include "ipmi/event_types.h"
#include "ipmi/sensor_types.h"
#include "program/reports/html_text.h"
#include "program/reports/terminal_text.h"
#include "program/reports/wording.h"

namespace ipmisel {
namespace {

constexpr double kLeft = 96;
constexpr double kWidth = 1000;
constexpr double kRight = 12;
constexpr double kLane = 26;
constexpr std::size_t kBins = 180;           // marks side by side in a lane
constexpr std::size_t kTextColumns = 70;     // of a mark's text
constexpr std::int64_t kGapSeconds = 21600;  // six hours
constexpr std::int64_t kJumpSeconds = -5;    // a clock that goes back by more has been set

/// What an ACPI power state is to somebody in front of the machine; null for one that is not known.
const char* PowerOf(std::int64_t offset) {
    switch (offset) {
        case 0:   // S0
        case 11:  // legacy on
            return "power on";
        case 1:  // S1 to S3
        case 2:
        case 3:
        case 8:  // one of them
        case 9:  // S1 to S4
            return "sleep";
        case 4:   // S4, suspended to disk
        case 5:   // S5
        case 6:   // S4 or S5
        case 7:   // G3
        case 10:  // S5 by override
        case 12:  // legacy off
            return "power off";
        default:
            return nullptr;
    }
}

/// What an event changes of the machine as a whole, by sensor type (IPMI 2.0 table 42-3); null for
/// the others.
const char* ChangeOf(const Event& event) {
    namespace type = ipmi::sensor_type;
    if (event.eventTypeCode != ipmi::kSensorSpecificEvents || !event.sensorTypeCode ||
        !event.offset) {
        return nullptr;
    }
    const bool asserted = !event.IsDeasserted();
    switch (*event.sensorTypeCode) {
        case type::kPowerUnit:
            if (*event.offset == 0) return asserted ? "power off" : "power on";
            return *event.offset == 1 && asserted ? "power cycle" : nullptr;
        case type::kSystemEvent:
            return *event.offset == 5 && asserted ? "clock set" : nullptr;
        case type::kSystemBoot:
            return asserted ? "boot" : nullptr;
        case type::kOsBoot:
            return asserted ? "operating system" : nullptr;
        case type::kOsStop:  // 5: no reaction to a shutdown request
            return *event.offset != 5 && asserted ? "operating system stops" : nullptr;
        case type::kAcpiPowerState:
            return asserted ? PowerOf(*event.offset) : nullptr;
        default:
            return nullptr;
    }
}

/// How far a mark stands from the one before it: pauses are drawn short, but not lost.
double Step(std::int64_t seconds) {
    return 0.6 + 1.5 * std::log2(1 + static_cast<double>(std::max<std::int64_t>(0, seconds)) / 10);
}

std::string Circle(double x, double y, double r, const std::string& className) {
    return Format("<circle class=\"%s\" cx=\"%.0f\" cy=\"%.0f\" r=\"%.1f\">", className.c_str(), x,
                  y, r);
}

std::string Link(const std::string& row, const std::string& element) {
    return row.empty() ? element : "<a href=\"#" + row + "\">" + element + "</a>";
}

}  // namespace

void Timeline::Add(const Event& event, const std::string& row) {
    std::string text = TerminalText(Listed({SubjectText(event), event.text}, ": "));
    if (Columns(text) > kTextColumns) text = Fit(text, kTextColumns - 3) + "...";
    points_.push_back({event.time, event.severity, row, std::move(text), ChangeOf(event)});
}

std::vector<double> Timeline::Positions() const {
    std::vector<double> at(points_.size());
    double x = 0;
    MaybeTime last;
    for (std::size_t i = 0; i < points_.size(); ++i) {
        const MaybeTime& time = points_[i].time;
        if (i > 0) x += Step(time && last ? time->seconds - last->seconds : 0);
        if (time) last = time;
        at[i] = x;
    }
    const double scale = x == 0 ? 0 : (kWidth - kLeft - kRight - 10) / x;
    for (double& position : at) position = kLeft + 5 + position * scale;
    return at;
}

/// One drawing, layer by layer: what comes later lies above.
class Timeline::Drawing {
public:
    Drawing(const std::vector<Point>& points, std::vector<double> x)
        : points_(points), x_(std::move(x)) {
        AddLanes();
        AddTimes();
        AddMarks();
    }
    std::string Svg() const {
        return Format(
                   "<svg class=\"timeline\" role=\"group\" viewBox=\"0 0 %.0f %.0f\" "
                   "aria-label=\"Events by time and severity\">",
                   kWidth, Height()) +
               gaps_ + lines_ + labels_ + marks_ + "</svg>";
    }

private:
    double Height() const { return bottom_ + 16; }

    // From the top: the worst first, of those that occur; below them the machine's.
    void AddLanes() {
        const auto all = Severities();
        std::for_each(all.rbegin(), all.rend(), [&](const auto& info) { AddLane(info.severity); });
        AddLane(std::nullopt);
        if (std::any_of(points_.begin(), points_.end(),
                        [](const Point& p) { return p.change != nullptr; })) {
            machineLane_ = bottom_;
            AddLine("power, boot");
        }
    }
    void AddLane(std::optional<Severity> severity) {
        const bool occurs = std::any_of(points_.begin(), points_.end(),
                                        [&](const Point& p) { return p.severity == severity; });
        if (!occurs) return;
        lanes_.emplace_back(severity, bottom_);
        AddLine(severity ? std::string(InfoOf(*severity).name) : "not graded");
    }
    void AddLine(const std::string& name) {
        lines_ += Format("<line class=\"lane\" x1=\"%.0f\" x2=\"%.0f\" y1=\"%.0f\" y2=\"%.0f\"/>",
                         kLeft, kWidth - kRight, bottom_, bottom_);
        AddLabel(kLeft - 10, bottom_ + 4, "end", name);
        bottom_ += kLane;
    }
    void AddLabel(double x, double y, const char* anchor, const std::string& text) {
        labels_ += Format("<text x=\"%.0f\" y=\"%.0f\" text-anchor=\"%s\">", x, y, anchor) +
                   HtmlText(text) + "</text>";
    }

    // Where nothing happened for long, where the clock went back, and when it goes on.
    void AddTimes() {
        double lastLabel = -kWidth;
        double lastX = 0;
        MaybeTime last;
        for (std::size_t i = 0; i < points_.size(); ++i) {
            if (!points_[i].time) continue;
            const NQORTQR20::Time time = *points_[i].time;
            const std::int64_t pause = last ? time.seconds - last->seconds : 0;
            if (last && pause < kJumpSeconds) {
                AddJump(i == 0 ? x_[i] : (x_[i] + x_[i - 1]) / 2, -pause);
            } else if (pause > kGapSeconds && x_[i] - x_[i - 1] > 6) {
                AddGap(x_[i - 1] + 2, x_[i] - 2, pause);
            }
            const bool starts = !last || pause > kGapSeconds || pause < kJumpSeconds;
            if (starts && x_[i] - lastLabel > 112 && x_[i] < kWidth - 110) {
                AddLabel(x_[i], Height() - 3, "start", DateAndTime(time).substr(0, 16));
                lastLabel = x_[i];
            }
            last = time;
            lastX = x_[i];
        }
        if (last && lastX - lastLabel > 240) {
            AddLabel(lastX, Height() - 3, "end", DateAndTime(*last).substr(0, 16));
        }
    }
    void AddJump(double x, std::int64_t seconds) {
        gaps_ += Format("<line class=\"jump\" x1=\"%.0f\" x2=\"%.0f\" y1=\"6\" y2=\"%.0f\"><title>",
                        x, x, bottom_ - 8) +
                 "the clock went back " + DurationText(static_cast<double>(seconds)) +
                 "</title></line>";
    }
    void AddGap(double begin, double end, std::int64_t seconds) {
        gaps_ += Format(
                     "<rect class=\"gap\" x=\"%.0f\" y=\"6\" width=\"%.0f\" height=\"%.0f\">"
                     "<title>",
                     begin, end - begin, bottom_ - 14) +
                 "nothing for " + DurationText(static_cast<double>(seconds)) + "</title></rect>";
    }

    // A mark stands for all events of a lane that fall together.
    struct Mark {
        const Point* first;
        unsigned count = 0;
        double x = 0;
    };
    void AddMarks() {
        std::map<std::pair<std::size_t, std::size_t>, Mark> bins;  // by lane and place
        for (std::size_t i = 0; i < points_.size(); ++i) {
            const Point& point = points_[i];
            const auto bin = static_cast<std::size_t>((x_[i] - kLeft) / (kWidth - kLeft) * kBins);
            const auto lane = std::find_if(lanes_.begin(), lanes_.end(), [&](const auto& l) {
                return l.first == point.severity;
            });
            const auto index = static_cast<std::size_t>(lane - lanes_.begin());
            Mark& mark = bins.try_emplace({index, bin}, Mark{&point, 0, x_[i]}).first->second;
            ++mark.count;
            if (point.change != nullptr) {
                bins.try_emplace({lanes_.size(), bin}, Mark{&point, 1, x_[i]});
            }
        }
        for (const auto& [key, mark] : bins) AddMark(key.first, mark);
    }
    void AddMark(std::size_t lane, const Mark& mark) {
        const bool machine = lane == lanes_.size();
        const Point& first = *mark.first;
        const std::string when = first.time ? DateAndTime(*first.time) + " UTC: " : "";
        const std::string more =
            mark.count > 1 ? Format(" (and %u more)", mark.count - 1) : std::string();
        const std::string name = machine          ? "mark"
                                 : first.severity ? std::string(InfoOf(*first.severity).name)
                                                  : "none";
        const double radius = std::min(9.0, 4 + std::log2(static_cast<double>(mark.count)));
        marks_ += Link(first.row,
                       Circle(mark.x, machine ? machineLane_ : lanes_[lane].second, radius, name) +
                           "<title>" +
                           HtmlText(Listed({when, machine ? first.change : first.text, more}, "")) +
                           "</title></circle>");
    }

    const std::vector<Point>& points_;
    std::vector<double> x_;
    std::vector<std::pair<std::optional<Severity>, double>> lanes_;  ///< and where each lies
    double machineLane_ = 0;
    double bottom_ = 18;  ///< of the lanes
    std::string gaps_, lines_, labels_, marks_;
};

std::string Timeline::Svg() const {
    if (points_.empty()) return {};
    return Drawing(points_, Positions()).Svg();
}

}  // namespace ipmisel
