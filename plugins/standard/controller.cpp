#include "plugins/standard/controller.h"

#include <algorithm>
#include <array>
#include <cstddef>
#include <utility>

namespace standard {
namespace {

// The transfer buffer of SPLibrary::sendIPMICommand.
constexpr std::size_t kRequestDataAt = 9;
constexpr std::size_t kCompletionCodeAt = 4;
constexpr std::size_t kResponseDataAt = 9;
constexpr std::size_t kMaxData = 1024;

}  // namespace

std::optional<Answer> Controller::Send(const ipmi::Command& command) {
    if (command.data.size() > kMaxData) return std::nullopt;
    std::array<unsigned char, kRequestDataAt + kMaxData> buffer{};
    buffer[0] = 0x01;
    buffer[1] = ipmi::kBmcAddress;
    buffer[2] = command.netFn;
    buffer[3] = command.lun;
    buffer[4] = command.command;
    buffer[5] = static_cast<unsigned char>(command.data.size());
    buffer[6] = static_cast<unsigned char>(command.data.size() >> 8);
    std::copy(command.data.begin(), command.data.end(), buffer.begin() + kRequestDataAt);
    int length = static_cast<int>(buffer.size());
    if (!library_.sendIPMICommand(buffer.data(), &length, static_cast<int>(buffer.size()), true)) {
        return std::nullopt;
    }
    const auto count =
        std::clamp<std::size_t>(length < 0 ? 0 : static_cast<std::size_t>(length), 0, kMaxData);
    const auto data = buffer.begin() + kResponseDataAt;
    return Answer{buffer[kCompletionCodeAt], {data, data + static_cast<std::ptrdiff_t>(count)}};
}

std::optional<std::vector<std::uint8_t>> Controller::Completed(const ipmi::Command& command) {
    auto answer = Send(command);
    if (!answer || !answer->Completed()) return std::nullopt;
    return std::move(answer->data);
}

}  // namespace standard
