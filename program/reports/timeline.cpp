#include "program/reports/timeline.h"

#include <algorithm>
#include <cmath>
#include <map>
#include <utility>

#include "base/text.h"
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

/// What an event changes of the machine as a whole, by sensor type (IPMI 2.0 table 42-3); null for
/// the others.
const char* ChangeOf(const Event& event) {
    if (event.eventTypeCode != 0x6F || !event.sensorTypeCode || !event.offset) return nullptr;
    const bool asserted = !event.IsDeasserted();
    switch (*event.sensorTypeCode) {
        case 0x09:  // power unit
            if (*event.offset == 0) return asserted ? "power off" : "power on";
            if (*event.offset == 1 && asserted) return "power cycle";
            return nullptr;
        case 0x12:  // system event
            return *event.offset == 5 && asserted ? "clock set" : nullptr;
        case 0x1D:  // system boot or restart initiated
            return asserted ? "boot" : nullptr;
        case 0x1F:  // base OS boot or installation status
            return asserted ? "operating system" : nullptr;
        case 0x20:  // OS stop or shutdown
            return asserted ? "operating system stops" : nullptr;
        case 0x22:  // system ACPI power state
            if (!asserted) return nullptr;
            return *event.offset == 0 ? "power on" : *event.offset <= 7 ? "power off" : nullptr;
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

std::string Timeline::Svg() const {
    if (points_.empty()) return {};
    // Lanes from the top: the worst first, of those that occur; below them the machine's.
    std::vector<std::pair<std::optional<Severity>, double>> lanes;
    double y = 18;
    const auto addLane = [&](std::optional<Severity> severity) {
        const bool occurs = std::any_of(points_.begin(), points_.end(),
                                        [&](const Point& p) { return p.severity == severity; });
        if (!occurs) return;
        lanes.emplace_back(severity, y);
        y += kLane;
    };
    const auto all = Severities();
    std::for_each(all.rbegin(), all.rend(), [&](const auto& info) { addLane(info.severity); });
    addLane(std::nullopt);
    const bool changes = std::any_of(points_.begin(), points_.end(),
                                     [](const Point& p) { return p.change != nullptr; });
    const double machineLane = y;
    if (changes) y += kLane;
    const double height = y + 16;

    std::string lines, gaps, labels, marks;
    const auto label = [&](double x, double at, const char* anchor, const std::string& text) {
        labels += Format("<text x=\"%.0f\" y=\"%.0f\" text-anchor=\"%s\">", x, at, anchor) +
                  HtmlText(text) + "</text>";
    };
    const auto lane = [&](double at, const std::string& name) {
        lines += Format("<line class=\"lane\" x1=\"%.0f\" x2=\"%.0f\" y1=\"%.0f\" y2=\"%.0f\"/>",
                        kLeft, kWidth - kRight, at, at);
        label(kLeft - 10, at + 4, "end", name);
    };
    for (const auto& [severity, at] : lanes) {
        lane(at, severity ? std::string(InfoOf(*severity).name) : "not graded");
    }
    if (changes) lane(machineLane, "power, boot");

    const std::vector<double> x = Positions();
    // A mark stands for all events of a lane that fall together.
    struct Mark {
        const Point* first;
        unsigned count = 0;
        double x = 0;
    };
    std::map<std::pair<std::size_t, std::size_t>, Mark> bins;
    double lastLabel = -kWidth;
    double lastX = 0;
    MaybeTime last;
    for (std::size_t i = 0; i < points_.size(); ++i) {
        const Point& point = points_[i];
        const auto bin = static_cast<std::size_t>((x[i] - kLeft) / (kWidth - kLeft) * kBins);
        const auto found = std::find_if(lanes.begin(), lanes.end(),
                                        [&](const auto& l) { return l.first == point.severity; });
        const auto index = static_cast<std::size_t>(found - lanes.begin());
        Mark& mark = bins.try_emplace({index, bin}, Mark{&point, 0, x[i]}).first->second;
        ++mark.count;
        if (point.change != nullptr) {
            bins.try_emplace({lanes.size(), bin}, Mark{&point, 1, x[i]});
        }
        if (!point.time) continue;
        const std::int64_t pause = last ? point.time->seconds - last->seconds : 0;
        const double middle = i == 0 ? x[i] : (x[i] + x[i - 1]) / 2;
        if (last && pause < kJumpSeconds) {
            gaps +=
                Format("<line class=\"jump\" x1=\"%.0f\" x2=\"%.0f\" y1=\"6\" y2=\"%.0f\"><title>",
                       middle, middle, y - 8) +
                "the clock went back " + DurationText(static_cast<double>(-pause)) +
                "</title></line>";
        } else if (pause > kGapSeconds && x[i] - x[i - 1] > 6) {
            gaps += Format(
                        "<rect class=\"gap\" x=\"%.0f\" y=\"6\" width=\"%.0f\" height=\"%.0f\">"
                        "<title>",
                        x[i - 1] + 2, x[i] - x[i - 1] - 4, y - 14) +
                    "nothing for " + DurationText(static_cast<double>(pause)) + "</title></rect>";
        }
        const bool starts = !last || pause > kGapSeconds || pause < kJumpSeconds;
        if (starts && x[i] - lastLabel > 112 && x[i] < kWidth - 110) {
            label(x[i], height - 3, "start", DateAndTime(*point.time).substr(0, 16));
            lastLabel = x[i];
        }
        last = point.time;
        lastX = x[i];
    }
    if (last && lastX - lastLabel > 240) {
        label(lastX, height - 3, "end", DateAndTime(*last).substr(0, 16));
    }
    for (const auto& [key, mark] : bins) {
        const auto& [index, bin] = key;
        const bool machine = index == lanes.size();
        const Point& first = *mark.first;
        const std::string when = first.time ? DateAndTime(*first.time) + " UTC: " : "";
        const std::string more =
            mark.count > 1 ? Format(" (and %u more)", mark.count - 1) : std::string();
        const std::string name = machine          ? "mark"
                                 : first.severity ? std::string(InfoOf(*first.severity).name)
                                                  : "none";
        const double radius = std::min(9.0, 4 + std::log2(static_cast<double>(mark.count)));
        marks += Link(first.row,
                      Circle(mark.x, machine ? machineLane : lanes[index].second, radius, name) +
                          "<title>" +
                          HtmlText(Listed({when, machine ? first.change : first.text, more}, "")) +
                          "</title></circle>");
    }
    return Format(
               "<svg class=\"timeline\" role=\"group\" viewBox=\"0 0 %.0f %.0f\" "
               "aria-label=\"Events by time and severity\">",
               kWidth, height) +
           gaps + lines + labels + marks + "</svg>";
}

}  // namespace ipmisel
