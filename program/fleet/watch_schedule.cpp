#include "program/fleet/watch_schedule.h"

#include <algorithm>

namespace ipmisel {
namespace {

constexpr std::chrono::hours kMaxPause{1};

}  // namespace

void WatchSchedule::Set(const std::vector<std::string>& sources, Clock::time_point now) {
    for (auto& [source, controller] : controllers_) controller.wanted = false;
    for (const std::string& source : sources) {
        const auto [place, isNew] = controllers_.try_emplace(source);
        place->second.wanted = true;
        if (!isNew) continue;
        place->second.due = now;
        place->second.pause = every_;
    }
    // One under way is forgotten when it has ended.
    std::erase_if(controllers_,
                  [](const auto& each) { return !each.second.wanted && !each.second.underWay; });
    waiting_ = {};
    for (const auto& [source, controller] : controllers_) {
        if (!controller.underWay) waiting_.emplace(controller.due, source);
    }
}

std::optional<std::string> WatchSchedule::TakeDue(Clock::time_point now) {
    if (waiting_.empty() || waiting_.top().first > now) return std::nullopt;
    std::string source = waiting_.top().second;
    waiting_.pop();
    Controller& controller = controllers_.at(source);
    controller.begun = now;
    controller.underWay = true;
    return source;
}

void WatchSchedule::Done(const std::string& source, bool wasRead, Clock::time_point now) {
    const auto place = controllers_.find(source);
    if (place == controllers_.end()) return;
    Controller& controller = place->second;
    if (!controller.wanted) {
        controllers_.erase(place);
        return;
    }
    const Clock::duration most = std::max<Clock::duration>(every_, kMaxPause);
    controller.pause = wasRead ? every_ : std::min(2 * controller.pause, most);
    controller.underWay = false;
    controller.due = std::max(now, controller.begun + controller.pause);
    waiting_.emplace(controller.due, source);
}

std::optional<WatchSchedule::Clock::time_point> WatchSchedule::NextDue() const {
    if (waiting_.empty()) return std::nullopt;
    return waiting_.top().first;
}

}  // namespace ipmisel
