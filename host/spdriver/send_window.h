#pragma once

#include <algorithm>
#include <chrono>
#include <cstdint>
#include <optional>

namespace tqrhost {

/// How many requests may be outstanding. A given size is kept; the adaptive one starts at 2, grows
/// by one after each clean window up to 8, is halved on a loss or on a BMC that says it is busy,
/// and stays at 1 for good once it has fallen there three times: such a BMC takes one at a time.
class SendWindow {
public:
    static constexpr unsigned kLargest = 15;

    explicit SendWindow(std::optional<unsigned> fixed) : fixed_(fixed) {}
    unsigned Size() const { return fixed_ ? std::clamp(*fixed_, 1u, kLargest) : size_; }
    void Answered() {
        if (collapses_ >= kMostCollapses || ++clean_ < size_) return;
        clean_ = 0;
        size_ = std::min(size_ + 1, kLargestAdaptive);
    }
    /// `sent` orders sends: losses among what was out when the window was last halved are one loss.
    void Lost(std::uint64_t sent, std::uint64_t lastSent) {
        clean_ = 0;
        if (sent <= halvedAt_ || size_ == 1) return;
        halvedAt_ = lastSent;
        size_ /= 2;
        if (size_ == 1) ++collapses_;
    }

private:
    static constexpr unsigned kLargestAdaptive = 8;
    static constexpr unsigned kMostCollapses = 3;

    std::optional<unsigned> fixed_;
    unsigned size_ = 2;
    unsigned clean_ = 0;
    unsigned collapses_ = 0;
    std::uint64_t halvedAt_ = 0;
};

/// Session sequence numbers of packets that came: each counts once, also when later ones have
/// overtaken it by up to 31. There is no limit ahead, as a BMC has one: however many answers were
/// lost, the next is taken.
class ReceivedNumbers {
public:
    bool IsNew(std::uint32_t number) {
        if (number > highest_) {
            const std::uint32_t step = number - highest_;
            seen_ = step < kRemembered ? seen_ << step | 1 : 1;
            highest_ = number;
            return true;
        }
        const std::uint32_t behind = highest_ - number;
        if (behind >= kRemembered || (seen_ >> behind & 1) != 0) return false;
        seen_ |= 1U << behind;
        return true;
    }

private:
    static constexpr std::uint32_t kRemembered = 32;

    std::uint32_t highest_ = 0;
    std::uint32_t seen_ = 1;  ///< bit n: highest_ - n has come
};

/// Retry time from the measured round trip (RFC 6298, with a minimum of 200 ms).
class RoundTrip {
public:
    using Duration = std::chrono::microseconds;

    /// Of a request that was sent once only.
    void Measured(Duration time) {
        if (!smoothed_) {
            smoothed_ = time;
            variation_ = time / 2;
            return;
        }
        const Duration difference = time > *smoothed_ ? time - *smoothed_ : *smoothed_ - time;
        variation_ = (3 * variation_ + difference) / 4;
        smoothed_ = (7 * *smoothed_ + time) / 8;
    }
    std::chrono::milliseconds RetryTime() const {
        using std::chrono::milliseconds;
        if (!smoothed_) return milliseconds(1000);
        const auto time = std::chrono::duration_cast<milliseconds>(*smoothed_ + 4 * variation_);
        return std::max(time, milliseconds(200));
    }

private:
    std::optional<Duration> smoothed_;
    Duration variation_{0};
};

}  // namespace tqrhost
