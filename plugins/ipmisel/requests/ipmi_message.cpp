#include "plugins/ipmisel/requests/ipmi_message.h"

#include <algorithm>

namespace ipmisel {
namespace {

namespace frame = NQORTQR20::frame;

// Generic completion codes from kNodeBusy on; the last two have no text. Texts that end without a
// full stop have always done so.
constexpr std::array<std::string_view, 24> kCompletionCodes{
    "Node Busy.",
    "Invalid Command.",
    "Command invalid for given LUN.",
    "Timeout while processing command.",
    "Out of space.",
    "Reservation Canceled or Invalid Reservation ID.",
    "Request data truncated.",
    "Request data length",
    "Request data field length",
    "Parameter out of range.",
    "Cannot return number of requested data bytes.",
    "Requested Sensor, data, or record not present.",
    "Invalid data field in Request",
    "Command illegal for specified sensor or record type.",
    "Command response could not be provided.",
    "Cannot execute duplicated request.",
    "Command response could not be provided. SDR Repository in update mode.",
    "Command response could not be provided. Device in firmware update mode.",
    "Command response could not be provided. BMC initialization or initialization agent in "
    "progress",
    "Destination unavailable.",
    "Cannot execute command. Insufficient privilege level.",
    "Cannot execute command. Command, or request parameter(s), not supported in present state.",
};
static_assert(
    kCompletionCodes[ipmi::kNotPresent - ipmi::kNodeBusy].starts_with("Requested Sensor"));
static_assert(!kCompletionCodes[ipmi::kNotSupportedInState - ipmi::kNodeBusy].empty());
static_assert(kCompletionCodes[ipmi::kSubfunctionDisabled - ipmi::kNodeBusy].empty());

}  // namespace

std::string_view CompletionCodeText(std::uint8_t code, bool eraseTextToo) {
    if (code == ipmi::kSelEraseInProgress && eraseTextToo) {
        return "Cannot execute command, SEL erase in progress.\n";
    }
    const std::size_t index = static_cast<std::size_t>(code) - ipmi::kNodeBusy;
    if (index < kCompletionCodes.size() && !kCompletionCodes[index].empty()) {
        return kCompletionCodes[index];
    }
    return "Unknown error\n";
}

}  // namespace ipmisel

unsigned IPMIMessage::Exchange(const ipmisel::IPMICommand& command,
                               std::span<const std::uint8_t> data) {
    using namespace ipmisel;
    netFn_ = command.netFn;
    lun_ = command.lun;
    command_ = command.command;
    if (data.size() > transferBuffer_.size() - frame::kDataAt) {
        WriteLog(command.sendFailureSeverity, command.sendFailure);
        return command.sendFailureResult;
    }
    // Nothing of an earlier reply stays behind the frame.
    transferBuffer_.fill(0);
    frame::LayOutRequest(transferBuffer_, netFn_, lun_, command_, data);
    if (LogEnabled(kTrace)) {
        const auto request =
            std::span<const std::uint8_t>(transferBuffer_)
                .first(std::max(frame::kLeastLength, frame::kDataAt + data.size()));
        WriteLog(kTrace, std::string("Contents of buffer to send (") + command.bufferName +
                             "):" + DumpFrame(request, command.frameDigits));
    }

    length_ = command.length;
    if (transport_ == nullptr ||
        !transport_->sendIPMICommand(transferBuffer_.data(), &length_,
                                     static_cast<int>(transferBuffer_.size()), true)) {
        WriteLog(command.sendFailureSeverity, command.sendFailure);
        return command.sendFailureResult;
    }
    const std::uint8_t completionCode = transferBuffer_[frame::kCompletionCodeAt];
    if (completionCode != ipmi::kCompleted) {
        std::string line = command.errorPrefix;
        line += CompletionCodeText(completionCode, command.eraseText);
        WriteLog(command.errorSeverity, line);
        return kFailed;
    }
    return kOk;
}

std::span<const std::uint8_t> IPMIMessage::Response() const {
    const auto all = std::span(transferBuffer_).subspan(NQORTQR20::frame::kResponseAt);
    if (length_ < 0) return {};
    return all.first(std::min(all.size(), static_cast<std::size_t>(length_) + 1));
}

ipmisel::ByteReader IPMIMessage::Reply() const {
    ipmisel::ByteReader in(Response());
    in.Skip(1);
    return in;
}

ipmisel::ByteReader IPMIMessage::ReplyBuffer() const {
    return ipmisel::ByteReader(
        std::span(transferBuffer_).subspan(NQORTQR20::frame::kResponseDataAt));
}
