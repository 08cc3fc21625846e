#include "plugins/standard/controller.h"

#include <algorithm>
#include <array>
#include <cstddef>
#include <utility>

namespace standard {
namespace {

namespace frame = NQORTQR20::frame;
constexpr std::size_t kMaxData = 1024;
using Buffer = std::array<unsigned char, frame::kDataAt + kMaxData>;

/// A request with room for its answer; empty when it is too long.
std::optional<Buffer> LayOut(const ipmi::Command& command) {
    if (command.data.size() > kMaxData) return std::nullopt;
    std::optional<Buffer> buffer(std::in_place);
    frame::LayOutRequest(*buffer, command.netFn, command.lun, command.command, command.data);
    return buffer;
}

}  // namespace

void Controller::Announce(std::span<const ipmi::Command> commands) {
    for (const ipmi::Command& command : commands) {
        const auto buffer = LayOut(command);
        if (buffer) library_.announceIPMICommand(buffer->data(), static_cast<int>(buffer->size()));
    }
}

std::optional<Answer> Controller::Send(const ipmi::Command& command) {
    auto laidOut = LayOut(command);
    if (!laidOut) return std::nullopt;
    Buffer& buffer = *laidOut;
    int length = static_cast<int>(buffer.size());
    if (!library_.sendIPMICommand(buffer.data(), &length, static_cast<int>(buffer.size()), true)) {
        return std::nullopt;
    }
    const auto count =
        std::clamp<std::size_t>(length < 0 ? 0 : static_cast<std::size_t>(length), 0, kMaxData);
    const auto data = buffer.begin() + frame::kResponseDataAt;
    return Answer{buffer[frame::kCompletionCodeAt],
                  {data, data + static_cast<std::ptrdiff_t>(count)}};
}

std::optional<std::vector<std::uint8_t>> Controller::Completed(const ipmi::Command& command) {
    auto answer = Send(command);
    if (!answer || !answer->Completed()) return std::nullopt;
    return std::move(answer->data);
}

}  // namespace standard
