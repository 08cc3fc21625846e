#pragma once

#include <cstdint>

namespace tqrhost {

/// Session sequence numbers of packets that came: each counts once, also when later ones have
/// overtaken it by up to 31. There is no limit ahead, as a controller has one: however many answers
/// were lost, the next is taken. Numbers wrap past FFFFFFFFh, and 0 stands for no session: a packet
/// with it is none of ours.
class ReceivedNumbers {
public:
    bool IsNew(std::uint32_t number) {
        if (number == 0) return false;
        const std::uint32_t step = number - highest_;
        // Where a controller begins is its own affair.
        if (seen_ == 0 || (step != 0 && step < kHalf)) {
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
    static constexpr std::uint32_t kHalf = 0x80000000;

    std::uint32_t highest_ = 0;
    std::uint32_t seen_ = 0;  ///< bit n: highest_ - n has come
};

}  // namespace tqrhost
