#pragma once

#include <cstdint>
#include <optional>
#include <span>
#include <vector>

#include "host/core/internal.h"
#include "ipmi/command.h"
#include "tqr/splibrary.h"

namespace NQORTQR20 {

/// One request frame as a plug-in laid it out.
class RequestFrame {
public:
    /// Takes the frame from the start of a transfer buffer; empty when the buffer is shorter than
    /// the frame says. The padding is part of it, as far as the buffer goes.
    static std::optional<RequestFrame> FromBuffer(std::span<const std::uint8_t> buffer);
    explicit RequestFrame(const ipmi::Command& command);

    std::uint8_t netFn() const { return bytes_[frame::kNetFnAt]; }
    std::uint8_t lun() const { return bytes_[frame::kLunAt]; }
    std::uint8_t command() const { return bytes_[frame::kCommandAt]; }
    ipmi::CommandCode code() const { return {netFn(), command()}; }
    std::span<const std::uint8_t> data() const {
        return std::span(bytes_).subspan(frame::kDataAt, dataLength_);
    }
    std::span<const std::uint8_t> bytes() const { return bytes_; }
    ipmi::Command ToCommand() const;

private:
    RequestFrame() = default;

    std::vector<std::uint8_t> bytes_;
    std::size_t dataLength_ = 0;
};

/// Completion code, then the response data. Never empty.
using Response = std::vector<std::uint8_t>;

/// The way to one BMC node.
class Transport {
public:
    virtual ~Transport() = default;
    /// Empty when the request could not be sent or no response came.
    virtual std::optional<Response> Exchange(const RequestFrame& request) = 0;
};

}  // namespace NQORTQR20
