#include "plugins/standard/event_time.h"

#include <cmath>
#include <cstddef>

#include "ipmi/event_data.h"
#include "ipmi/timestamp.h"

namespace standard {

namespace {

constexpr std::int64_t kSecondsPerMinute = 60;
// A clock of whole seconds may seem to step by one without having been set.
constexpr std::int64_t kResolution = 1;

bool IsStep(std::int64_t seconds) { return seconds < -kResolution || seconds > kResolution; }

// Goes through the log and marks where the clock was set or lost.
class ClockWatch {
public:
    void See(LoggedEvent* event) {
        const ipmi::TimeKind kind = event->timeKind();
        if (kind == ipmi::TimeKind::kNone) return;
        // A controller that started anew has lost its clock, until somebody sets it.
        event->clockChanged = lastKind_ && *lastKind_ != kind;
        lastKind_ = kind;
        if (kind != ipmi::TimeKind::kClock) return;
        const std::int64_t now = *event->time;
        const std::optional<ipmi::ClockSet> set = ipmi::ClockSetOf(event->record);
        if (afterLoneFirst_ && set != ipmi::ClockSet::kSecond) {
            // The second record of the pair is missing: how far the clock went is not known.
            event->clockChanged = true;
        } else if (set == ipmi::ClockSet::kSecond && beforeSetting_) {
            const std::int64_t step = now - *beforeSetting_;
            if (IsStep(step)) {
                event->clockChanged = true;
                event->clockStep = step;
            }
        } else if (set == ipmi::ClockSet::kSecond || set == ipmi::ClockSet::kUnspecified) {
            event->clockChanged = true;
        } else if (last_ && now < *last_ - kResolution) {
            event->clockChanged = true;
            event->clockStep = now - *last_;
        }
        afterLoneFirst_ = set == ipmi::ClockSet::kFirst;
        beforeSetting_ = afterLoneFirst_ ? std::optional(now) : std::nullopt;
        last_ = now;
    }

private:
    std::optional<ipmi::TimeKind> lastKind_;
    std::optional<std::int64_t> last_;
    std::optional<std::int64_t> beforeSetting_;  // time of the first record of a pair, just seen
    bool afterLoneFirst_ = false;
};

}  // namespace

void SetTimes(const NodeFacts& node, std::span<LoggedEvent> events) {
    ClockWatch watch;
    std::size_t afterLastChange = 0;
    for (std::size_t i = 0; i < events.size(); ++i) {
        LoggedEvent& event = events[i];
        if (event.timeKind() == ipmi::TimeKind::kClock) {
            event.time = static_cast<std::int64_t>(event.record.time) -
                         node.utcOffsetMinutes.value_or(0) * kSecondsPerMinute;
        }
        watch.See(&event);
        if (event.clockChanged) afterLastChange = i;
    }
    if (!node.clock || std::abs(node.clock->offset) <= node.clock->uncertainty) return;
    const auto offset = static_cast<std::int64_t>(std::llround(node.clock->offset));
    for (LoggedEvent& event : events.subspan(afterLastChange)) {
        if (event.time) event.correctedTime = *event.time - offset;
    }
}

}  // namespace standard
