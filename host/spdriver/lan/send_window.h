#pragma once

#include <cstdint>
#include <optional>

namespace tqrhost {

/// How long an answer took, next to what its kind of request takes when it is alone.
enum class Delay {
    kUsual,
    kQueued,     ///< it has waited behind others: more at a time bring nothing
    kCongested,  ///< it has waited much longer than that
};

/// How many requests may be outstanding.
///
/// A given size is kept. The adaptive one starts at 2 and grows by one with every answer up to a
/// threshold, and above by one with every window that was answered whole. A loss takes about a
/// third, long waits take half; what is lost or delayed within one round trip counts once. It goes
/// to 15, and on to 32 only while a controller has answered a long stretch without a loss. Where
/// either leaves 1, it stays for a stretch that grows each time: such a controller takes one at a
/// time. A size of 4 is proof enough that it was the line, and forgives that.
class SendWindow {
public:
    static constexpr unsigned kLargest = 32;
    /// As far ahead of what a controller has acknowledged as every controller takes packets
    /// (IPMI 2.0, 6.12.13).
    static constexpr unsigned kLargestUnproven = 15;

    explicit SendWindow(std::optional<unsigned> fixed) : fixed_(fixed) {}

    unsigned Size() const;
    /// Nothing was lost for a long stretch, or ever: more may be under way than a controller takes
    /// if some of it were lost.
    bool IsUnbroken() const { return unbroken_ >= kProvenBy || !hasLost_; }
    /// `sent` and `lastSent` number all sends: of the request, and the newest.
    void Answered(Delay delay, std::uint64_t sent, std::uint64_t lastSent);
    /// Lost on its way, or refused by a controller that is busy.
    void Lost(std::uint64_t sent, std::uint64_t lastSent);
    /// Nothing at all is answered: begins anew, quickly up to half of what it was.
    void Stalled(std::uint64_t lastSent);

private:
    static constexpr unsigned kShortestPatience = 8;
    static constexpr unsigned kLongestPatience = 512;
    static constexpr unsigned kProvenBy = 4 * kLargestUnproven;  ///< answers in a row
    static constexpr unsigned kForgivenAt = 4;

    void Hold(unsigned growth);
    void Reduce(unsigned size, std::uint64_t lastSent);

    std::optional<unsigned> fixed_;
    unsigned size_ = 2;
    unsigned threshold_ = kLargestUnproven;
    unsigned clean_ = 0;     ///< answers since the size has changed
    unsigned unbroken_ = 0;  ///< answers since the last loss
    bool hasLost_ = false;
    unsigned held_ = 0;  ///< answers until it may grow again
    unsigned patience_ = kShortestPatience;
    std::uint64_t reducedAt_ = 0;
};

}  // namespace tqrhost
