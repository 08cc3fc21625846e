#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <span>
#include <string>
#include <string_view>

#include "base/bytes.h"
#include "ipmi/command.h"
#include "plugins/ipmisel/log.h"
#include "plugins/ipmisel/result.h"
#include "tqr/splibrary.h"

namespace ipmisel {

/// One IPMI command as a request class states it: what goes to the BMC, and how what happens to it
/// is worded in the log.
struct IPMICommand {
    std::uint8_t netFn = ipmi::kNetFnStorage;
    std::uint8_t lun = ipmi::kBmcLun;
    std::uint8_t command = 0x00;

    const char* bufferName = "rspBuf";      ///< as the trace of the request frame calls it
    Digits frameDigits = Digits::kDecimal;  ///< of the same trace
    int length = 256;                       ///< handed to the transport, which does not read it

    const char* sendFailure = "";  ///< the line of a request that got no answer
    Severity sendFailureSeverity = kError;
    unsigned sendFailureResult = kFailed;

    const char* errorPrefix = "";  ///< before the text of a completion code
    Severity errorSeverity = kWarning;
    bool eraseText = false;  ///< 0x81 tells of a log erase in progress
};

/// What a completion code other than 0 means (IPMI 2.0, table 5-2). `eraseTextToo`: 0x81 is the
/// Storage commands' code for a SEL erase in progress.
std::string_view CompletionCodeText(std::uint8_t code, bool eraseTextToo);

/// A record or reservation ID as the request objects keep it: high byte first. The wire has it low
/// byte first.
struct IPMIRecordID {
    std::uint8_t high = 0;
    std::uint8_t low = 0;
};
static_assert(sizeof(IPMIRecordID) == 2);
/// A log or repository that still goes on after as many records leads in a circle.
constexpr unsigned kMaxRecords = 0x10000;

inline IPMIRecordID ReadRecordID(ByteReader* in) {
    IPMIRecordID id;
    id.low = in->U8();
    id.high = in->U8();
    return id;
}

}  // namespace ipmisel

/// Base of the request classes: one IPMI command after the other over the transport of one BMC
/// node. The request frame is laid at the start of the transfer buffer, and the reply frame comes
/// back in the same buffer.
class IPMIMessage {
public:
    /// The transport is borrowed for the life of the object; without one nothing can be sent.
    explicit IPMIMessage(NQORTQR20::SPLibrary* transport = nullptr) : transport_(transport) {}
    IPMIMessage(const IPMIMessage&) = delete;
    IPMIMessage& operator=(const IPMIMessage&) = delete;

    /// The combined byte of the IPMI message header (IPMI 2.0, 5.1); two bits of the LUN count.
    static unsigned char GetNetFnLun(unsigned char netFn, unsigned char lun) {
        return static_cast<unsigned char>(netFn << 2 | (lun & 0x03));
    }

protected:
    ~IPMIMessage() = default;

    /// One command exchange: frames the command with its data (247 bytes at most), traces the
    /// frame, sends it and tests the completion code. kOk when the reply is in the buffer;
    /// otherwise its failure is logged, and the result is kFailed, or the command's own result of
    /// a failed send.
    unsigned Exchange(const ipmisel::IPMICommand& command, std::span<const std::uint8_t> data = {});

    /// The reply from the completion code on, as far as transport and buffer reach.
    std::span<const std::uint8_t> Response() const;
    /// The reply after the completion code.
    ipmisel::ByteReader Reply() const;
    /// As Reply, as far as the buffer reaches, whatever length the transport reported.
    ipmisel::ByteReader ReplyBuffer() const;
    /// Length of the reply after the completion code, as the transport reported it.
    int length() const { return length_; }

private:
    std::uint8_t netFn_ = 0;
    std::uint8_t lun_ = 0;
    std::uint8_t command_ = 0;
    std::array<std::uint8_t, 256> transferBuffer_{};
    int length_ = 256;
    NQORTQR20::SPLibrary* transport_;
};
