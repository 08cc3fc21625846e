#include "plugins/ipmisel/requests/request_aux_log.h"
#include "ipmi/command.h"

#include <array>
#include <cstdint>
#include <string>

using namespace ipmisel;

namespace {

// Compatibility: the line speaks of the system event log
// (Exchange.EveryCommandReportsNoAnswerAndCompletionCodes).
constexpr IPMICommand kGetAuxLogStatus{
    .command = ipmi::kGetAuxiliaryLogStatus.number,
    .sendFailure = "Failure in sending command to obtain AUX Log Status.",
    .errorPrefix = "IPMI error in obtaining system event log info: "};
constexpr std::array<std::uint8_t, 1> kStatusRequest{0x01};

/// Bytes between the completion code and the number of entries.
constexpr std::size_t kBeforeCount = 7;

constexpr TraceScope::Words kConstructor{" Constructor entered.\n", " Constructor exited.\n",
                                         kInfo};
constexpr TraceScope::Words kOperation{" entered.\n", " exited.\n", kInfo};

}  // namespace

IPMIRequestAuxLog::IPMIRequestAuxLog(NQORTQR20::SPLibrary* transport) : IPMIMessage(transport) {
    TraceScope trace("IPMIRequestAuxLog::IPMIRequestAuxLog()", kConstructor);
}

unsigned IPMIRequestAuxLog::IPMIGetAuxLogStatus(unsigned int* entryCount) {
    TraceScope trace("IPMIRequestAuxLog::IPMIGetAuxLogStatus()", kOperation);
    *entryCount = 0;
    if (Exchange(kGetAuxLogStatus, kStatusRequest) != kOk) return trace.Fail();
    if (LogEnabled(kInfo)) {
        WriteLog(kInfo, "IPMIRequestAuxLog::Response Length = " + std::to_string(length()) +
                            "\nrspBuf = " + DumpBytes(Response(), Digits::kLowerHex));
    }
    // Compatibility: the number is taken whatever length the transport reported; a shorter reply
    // leaves zeros there (Bounds.ClaimedLengthsAreBelievedAsFarAsTheBufferReaches).
    ByteReader reply = ReplyBuffer();
    reply.Skip(kBeforeCount);
    *entryCount = reply.U16();
    return kOk;
}

unsigned IPMIRequestAuxLog::IPMIReadExtendedData(s_AuxLog_entry*, unsigned int) { return kOk; }
