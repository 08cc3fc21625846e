#include "host/spdriver/stop.h"

#include <atomic>

namespace NQORTQR20 {
namespace {

using Clock = std::chrono::steady_clock;

/// When the interruption came, in the clock's ticks; 0 for none.
std::atomic<Clock::rep> gInterrupted{0};
static_assert(std::atomic<Clock::rep>::is_always_lock_free, "a signal handler sets it");
std::optional<Clock::time_point> gDeadline;

}  // namespace

void StopAt(std::optional<Clock::time_point> deadline) { gDeadline = deadline; }

void StopNow() { gInterrupted = Clock::now().time_since_epoch().count(); }

void ClearStop() {
    gInterrupted = 0;
    gDeadline.reset();
}

StopReason Stopped() {
    if (gInterrupted != 0) return StopReason::kInterrupted;
    if (gDeadline && Clock::now() >= *gDeadline) return StopReason::kDeadline;
    return StopReason::kNone;
}

bool StoppedFor(Clock::duration time) {
    const auto now = Clock::now();
    const Clock::rep interrupted = gInterrupted;
    if (interrupted != 0 && now.time_since_epoch() - Clock::duration(interrupted) >= time) {
        return true;
    }
    return gDeadline && now - *gDeadline >= time;
}

Clock::time_point StopTime() { return gDeadline.value_or(Clock::time_point::max()); }

}  // namespace NQORTQR20
