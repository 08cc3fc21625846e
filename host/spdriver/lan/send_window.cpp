#include "host/spdriver/lan/send_window.h"

#include <algorithm>

namespace tqrhost {

unsigned SendWindow::Size() const { return fixed_ ? std::clamp(*fixed_, 1U, kLargest) : size_; }

void SendWindow::Answered(Delay delay, std::uint64_t sent, std::uint64_t lastSent) {
    ++unbroken_;
    if (delay == Delay::kCongested && size_ > 1) {
        if (sent > reducedAt_) Reduce(size_ / 2, lastSent);
        if (size_ == 1) Hold(8);
        return;
    }
    if (held_ > 0) --held_;
    if (delay != Delay::kUsual || held_ > 0) return;
    const bool mayGrow = size_ < kLargestUnproven || (size_ < kLargest && unbroken_ >= kProvenBy);
    if (!mayGrow || ++clean_ < (size_ < threshold_ ? 1 : size_)) return;
    clean_ = 0;
    ++size_;
    if (size_ >= kForgivenAt) patience_ = kShortestPatience;
}

void SendWindow::Lost(std::uint64_t sent, std::uint64_t lastSent) {
    unbroken_ = 0;
    hasLost_ = true;
    clean_ = 0;
    if (sent <= reducedAt_ || size_ == 1) return;
    Reduce(std::min(size_, kLargestUnproven) * 2 / 3, lastSent);
    threshold_ = size_;
    if (size_ == 1) Hold(2);
}

void SendWindow::Hold(unsigned growth) {
    held_ = patience_;
    patience_ = std::min(growth * patience_, kLongestPatience);
}

void SendWindow::Stalled(std::uint64_t lastSent) {
    unbroken_ = 0;
    hasLost_ = true;
    if (size_ > 1) threshold_ = std::max(size_ / 2, 2U);
    Reduce(1, lastSent);
}

void SendWindow::Reduce(unsigned size, std::uint64_t lastSent) {
    size_ = std::max(size, 1U);
    clean_ = 0;
    reducedAt_ = lastSent;
}

}  // namespace tqrhost
