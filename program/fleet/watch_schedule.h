#pragma once

#include <chrono>
#include <map>
#include <optional>
#include <queue>
#include <string>
#include <utility>
#include <vector>

namespace ipmisel {

/// When each of many controllers is visited. No controller is visited oftener than every `every`,
/// counted from the beginning of a visit; one that cannot be read is left alone for twice as long
/// each time, up to an hour or `every`. The clock is handed in.
class WatchSchedule {
public:
    using Clock = std::chrono::steady_clock;

    explicit WatchSchedule(Clock::duration every) : every_(every) {}

    /// These are the controllers from now on. What is known of those that stay is kept; new ones
    /// are due at once.
    void Set(const std::vector<std::string>& sources, Clock::time_point now);
    /// A controller that is due, which is then under way; the longest due first. Empty for none.
    std::optional<std::string> TakeDue(Clock::time_point now);
    /// The visit of one under way has ended.
    void Done(const std::string& source, bool wasRead, Clock::time_point now);
    /// When the next one is due; empty when none waits.
    std::optional<Clock::time_point> NextDue() const;

private:
    struct Controller {
        Clock::time_point begun{};  ///< its last visit
        Clock::time_point due{};    ///< its next one
        Clock::duration pause{};    ///< between them
        bool underWay = false;
        bool wanted = true;
    };
    using Wait = std::pair<Clock::time_point, std::string>;

    Clock::duration every_;
    std::map<std::string, Controller> controllers_;
    /// Each controller that waits stands here with the time that it is due.
    std::priority_queue<Wait, std::vector<Wait>, std::greater<>> waiting_;
};

}  // namespace ipmisel
