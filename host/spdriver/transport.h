#pragma once

#include <cstdint>
#include <optional>
#include <span>
#include <vector>

#include "host/core/internal.h"
#include "ipmi/command.h"

namespace NQORTQR20 {

/// One request frame as a plug-in laid it out: 0x01, responder address, NetFn, LUN, command, number
/// of data bytes (little-endian, 32 bits), data from byte 9.
class RequestFrame {
public:
    /// Takes the frame from the start of a transfer buffer; empty when the buffer is shorter than
    /// the frame says. Frames shorter than 15 bytes are padded to 15, as far as the buffer goes.
    static std::optional<RequestFrame> FromBuffer(std::span<const std::uint8_t> buffer);
    explicit RequestFrame(const ipmi::Command& command);

    std::uint8_t netFn() const { return bytes_[2]; }
    std::uint8_t lun() const { return bytes_[3]; }
    std::uint8_t command() const { return bytes_[4]; }
    ipmi::CommandCode code() const { return {netFn(), command()}; }
    std::span<const std::uint8_t> data() const { return std::span(bytes_).subspan(9, dataLength_); }
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
