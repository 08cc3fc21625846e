#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <optional>

#include "host/spdriver/lan/command_timing.h"

namespace tqrhost {

/// One packet that is under way, or whose answer may still come.
struct Try {
    std::optional<std::uint64_t> request;  ///< whose; empty: nobody's any more
    std::uint32_t sequence = 0;            ///< session sequence number
    std::uint64_t serial = 0;              ///< order among all sends
    Clock::time_point sentAt;
    Clock::time_point freeAt;  ///< nobody's number is not given again before this
    bool alone = false;        ///< nothing else was outstanding then
    bool owed = false;         ///< an answer to an earlier try of this number never came
    bool shared = false;       ///< stands for an earlier try of the request too
};

/// The six-bit numbers by which a controller's answers are told apart (rqSeq, IPMI 2.0, 13.8).
/// Every try of a request takes one of its own, so that an answer says which try it answers. One
/// that was given up rests for a while, since its answer may still come.
class RqSeqTable {
public:
    static constexpr std::size_t kCount = 64;

    Try& operator[](std::uint8_t rqSeq) { return tries_[rqSeq % kCount]; }
    /// Empty when all are in use or rest.
    std::optional<std::uint8_t> Free(Clock::time_point now) {
        for (std::size_t step = 1; step <= kCount; ++step) {
            const auto candidate = static_cast<std::uint8_t>((last_ + step) % kCount);
            if (tries_[candidate].request || tries_[candidate].freeAt > now) continue;
            last_ = candidate;
            return candidate;
        }
        return std::nullopt;
    }
    /// The tries of a request are nobody's from now on and rest until `freeAt`; but for `answered`,
    /// which has had its only answer.
    void GiveUp(std::uint64_t request, std::optional<std::uint8_t> answered,
                Clock::time_point freeAt) {
        for (std::size_t i = 0; i < kCount; ++i) {
            if (tries_[i].request != request) continue;
            tries_[i].request.reset();
            if (answered == i && !tries_[i].shared) continue;
            tries_[i].freeAt = freeAt;
            tries_[i].owed = true;
        }
    }
    /// A new session: no answer of the old one is believed.
    void Clear() { tries_ = {}; }

private:
    std::array<Try, kCount> tries_{};
    std::uint8_t last_ = 0;
};

}  // namespace tqrhost
