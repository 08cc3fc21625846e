#pragma once

#include <algorithm>
#include <chrono>
#include <cstdint>
#include <map>
#include <optional>

#include "host/spdriver/lan/send_window.h"
#include "ipmi/command.h"

namespace tqrhost {

using Clock = std::chrono::steady_clock;

/// How long one kind of request takes, and when it is to be sent again: RFC 6298, sections 2, 3 and
/// 5, with a least time of 30 ms. Every try has a number of its own, so that it is known which of
/// them was answered and each answer is a measurement.
class CommandTiming {
public:
    using Duration = std::chrono::microseconds;
    static constexpr Duration kMinTime{30'000};
    static constexpr Duration kMaxTime{10'000'000};

    /// `opening` is the round trip of the session's opening, if it is known.
    explicit CommandTiming(std::optional<Duration> opening) : opening_(opening) {}

    /// `alone`: nothing else was outstanding when it was sent.
    Delay Measured(Duration time, bool alone) {
        if (!smoothed_) {
            smoothed_ = time;
            variation_ = time / 2;
        } else {
            const Duration difference = time > *smoothed_ ? time - *smoothed_ : *smoothed_ - time;
            variation_ = (3 * variation_ + difference) / 4;
            smoothed_ = (7 * *smoothed_ + time) / 8;
        }
        backOff_ = 0;
        base_ = alone ? time : std::min(base_.value_or(time), time);
        // A line's own unsteadiness is no queue.
        constexpr Duration kQueue{50'000};
        if (time > 3 * *base_ + 2 * kQueue) return Delay::kCongested;
        return time > 2 * *base_ + kQueue ? Delay::kQueued : Delay::kUsual;
    }
    /// A try was not answered in its time; of those that were out together one counts. `sent` and
    /// `lastSent` number all sends, as for SendWindow.
    void BackOff(std::uint64_t sent, std::uint64_t lastSent) {
        if (sent <= backedOffAt_ || RetryTime() >= kMaxTime) return;
        ++backOff_;
        backedOffAt_ = lastSent;
    }
    /// Until a request that is sent now is sent again. A controller takes longer for a command than
    /// for the opening of a session, so that the opening alone says no less than a quarter of a
    /// second.
    Duration RetryTime() const { return std::min(Expected() * (1 << backOff_), kMaxTime); }
    /// The same without the back-off: an answer comes within this time, as far as is known.
    Duration Expected() const {
        constexpr Duration kUnknown{1'000'000};
        constexpr Duration kUnmeasured{250'000};
        Duration time = opening_ ? std::clamp(3 * *opening_, kUnmeasured, kUnknown) : kUnknown;
        if (smoothed_) time = std::max(*smoothed_ + 4 * variation_, kMinTime);
        return time;
    }
    /// Later tries that were answered this much after it was sent say that a try was lost.
    Duration Disorder() const { return smoothed_ ? *smoothed_ / 4 : kMaxTime; }

private:
    std::optional<Duration> opening_;
    std::optional<Duration> smoothed_;
    std::optional<Duration> base_;  ///< of a request that did not wait behind others
    Duration variation_{0};
    std::uint64_t backedOffAt_ = 0;
    int backOff_ = 0;
};

/// By command, since a controller may answer one from its memory and another from a slow chip.
class CommandTimings {
public:
    void Opened(std::optional<CommandTiming::Duration> opening) { opening_ = opening; }
    CommandTiming& Of(const ipmi::Command& command) {
        return timings_.try_emplace(command.code(), opening_).first->second;
    }

private:
    std::optional<CommandTiming::Duration> opening_;
    std::map<ipmi::CommandCode, CommandTiming> timings_;
};

}  // namespace tqrhost
