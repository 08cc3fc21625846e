#include "host/spdriver/transport.h"

#include <algorithm>

namespace NQORTQR20 {

static_assert(frame::kResponder == ipmi::kBmcAddress);

std::optional<RequestFrame> RequestFrame::FromBuffer(std::span<const std::uint8_t> buffer) {
    if (buffer.size() < frame::kDataAt) return std::nullopt;
    std::size_t count = 0;
    for (std::size_t i = frame::kDataAt; i > frame::kCountAt; --i) {
        count = count << 8 | buffer[i - 1];
    }
    if (count > buffer.size() - frame::kDataAt) return std::nullopt;
    RequestFrame request;
    request.dataLength_ = count;
    const auto bytes = buffer.first(
        std::max(frame::kDataAt + count, std::min(frame::kLeastLength, buffer.size())));
    request.bytes_.assign(bytes.begin(), bytes.end());
    return request;
}

RequestFrame::RequestFrame(const ipmi::Command& command)
    : bytes_(std::max(frame::kDataAt + command.data.size(), frame::kLeastLength)),
      dataLength_(command.data.size()) {
    frame::LayOutRequest(bytes_, command.netFn, command.lun, command.command, command.data);
}

ipmi::Command RequestFrame::ToCommand() const {
    return {netFn(), lun(), command(), std::vector<std::uint8_t>(data().begin(), data().end())};
}

}  // namespace NQORTQR20
