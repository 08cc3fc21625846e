#pragma once

#include <chrono>
#include <optional>

#include "host/core/internal.h"

namespace NQORTQR20 {

/// Why a collection is to end early, with what was read so far.
enum class StopReason { kNone, kDeadline, kInterrupted };

/// No command is begun after this time; empty for no deadline.
void StopAt(std::optional<std::chrono::steady_clock::time_point> deadline);
/// No command is begun from now on. May be called from a signal handler.
void StopNow();
/// Forgets deadline and interruption.
void ClearStop();

StopReason Stopped();
/// Whether it is so long ago that the collection was to stop.
bool StoppedFor(std::chrono::steady_clock::duration time);
/// The deadline, or a far time: for waits that must not outlast it.
std::chrono::steady_clock::time_point StopTime();

}  // namespace NQORTQR20
