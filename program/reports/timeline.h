#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "program/reports/view.h"

namespace ipmisel {

/// The events of one log as a drawing (SVG): a lane for each severity, a mark for each event that
/// leads to its row, breaks where nothing happened for long, and a lane of what changed the state
/// of the whole machine: power, boot, clock.
class Timeline {
public:
    /// `row` is the identity of the row that shows the event; empty when it has none.
    void Add(const Event& event, const std::string& row);
    /// The element; empty when there is nothing to draw. Its size does not grow with the number of
    /// events beyond some hundred marks.
    std::string Svg() const;

private:
    struct Point {
        MaybeTime time;
        std::optional<Severity> severity;
        std::string row;
        std::string text;              ///< cut
        const char* change = nullptr;  ///< of the state of the machine: "power off"
    };
    class Drawing;
    std::vector<double> Positions() const;

    std::vector<Point> points_;
};

}  // namespace ipmisel
