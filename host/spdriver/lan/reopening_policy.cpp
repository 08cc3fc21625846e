#include "host/spdriver/lan/reopening_policy.h"

#include <algorithm>

namespace tqrhost {
namespace {

constexpr std::chrono::seconds kIdle{30};
constexpr std::chrono::milliseconds kMaxSilence{1500};
constexpr std::chrono::milliseconds kRefusedSilence{250};
constexpr std::chrono::milliseconds kPause{500};
constexpr unsigned kTriesOfUnproven = 2;
constexpr unsigned kTries = 3;

}  // namespace

void ReopeningPolicy::NoteIdle(Clock::duration idle) { unproven_ |= idle > kIdle; }

void ReopeningPolicy::NoteReopening(Clock::time_point now, bool again) {
    reopenedAt_ = now;
    again_ = again;
    unproven_ = refused_ = false;
}

std::optional<Clock::time_point> ReopeningPolicy::At(const SessionRequests::Silence& silence,
                                                     Clock::time_point lastHeard) const {
    if (again_) return reopenedAt_ + kPause;
    // Once, until the new session has brought an answer.
    if (lastHeard <= reopenedAt_) return std::nullopt;
    if (refused_) return silence.since + kRefusedSilence;
    if (silence.tries < (unproven_ ? kTriesOfUnproven : kTries)) return std::nullopt;
    const Clock::duration expected = 2 * silence.expected;
    if (unproven_) return silence.since + expected;
    return silence.since + std::max<Clock::duration>(
                               std::min<Clock::duration>(kMaxSilence, timeout_ / 3), expected);
}

}  // namespace tqrhost
