#include "host/spdriver/stop.h"

#include <atomic>

namespace tqrhost {
namespace {

using Clock = std::chrono::steady_clock;

std::atomic<bool> gInterrupted{false};
static_assert(std::atomic<bool>::is_always_lock_free, "a signal handler sets it");
std::optional<Clock::time_point> gDeadline;

}  // namespace

void StopAt(std::optional<Clock::time_point> deadline) { gDeadline = deadline; }

void StopNow() { gInterrupted = true; }

void ClearStop() {
    gInterrupted = false;
    gDeadline.reset();
}

StopReason Stopped() {
    if (gInterrupted) return StopReason::kInterrupted;
    if (gDeadline && Clock::now() >= *gDeadline) return StopReason::kDeadline;
    return StopReason::kNone;
}

Clock::time_point StopTime() { return gDeadline.value_or(Clock::time_point::max()); }

}  // namespace tqrhost
