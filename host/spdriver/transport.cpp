#include "host/spdriver/transport.h"

#include <algorithm>

namespace NQORTQR20 {
namespace {

constexpr std::uint8_t kFrameStart = 0x01;
constexpr std::size_t kCountAt = 5;
constexpr std::size_t kDataAt = 9;
constexpr std::size_t kPaddedFrame = 15;

}  // namespace

std::optional<RequestFrame> RequestFrame::FromBuffer(std::span<const std::uint8_t> buffer) {
    if (buffer.size() < kDataAt) return std::nullopt;
    std::size_t count = 0;
    for (std::size_t i = kDataAt - 1; i >= kCountAt; --i) count = count << 8 | buffer[i];
    if (count > buffer.size() - kDataAt) return std::nullopt;
    RequestFrame frame;
    frame.dataLength_ = count;
    const auto bytes =
        buffer.first(std::max(kDataAt + count, std::min(kPaddedFrame, buffer.size())));
    frame.bytes_.assign(bytes.begin(), bytes.end());
    return frame;
}

RequestFrame::RequestFrame(const ipmi::Command& command) : dataLength_(command.data.size()) {
    bytes_ = {kFrameStart, ipmi::kBmcAddress, command.netFn, command.lun, command.command};
    for (std::size_t shift = 0; shift < 32; shift += 8) {
        bytes_.push_back(static_cast<std::uint8_t>(dataLength_ >> shift));
    }
    bytes_.insert(bytes_.end(), command.data.begin(), command.data.end());
    if (bytes_.size() < kPaddedFrame) bytes_.resize(kPaddedFrame);
}

ipmi::Command RequestFrame::ToCommand() const {
    return {netFn(), lun(), command(), std::vector<std::uint8_t>(data().begin(), data().end())};
}

}  // namespace NQORTQR20
