#include "plugins/ipmisel/requests/request_sel.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <string>

#include "base/text.h"
#include "ipmi/command.h"
#include "ipmi/sel_info.h"

using namespace ipmisel;

namespace {

constexpr IPMICommand kGetSelInfo{.command = ipmi::kGetSelInfo.number,
                                  .sendFailure = "Failure in sending command to obtain SEL info.",
                                  .errorPrefix = "IPMI error in obtaining system event log info: ",
                                  .eraseText = true};

constexpr IPMICommand kGetFirstEntry{
    .command = ipmi::kGetSelEntry.number,
    .sendFailure = "Failure in sending command to obtain SEL Entry.",
    .errorPrefix = "IPMI error in obtaining system event log entry: ",
    .eraseText = true};

// Compatibility: an answer missing in the middle of the walk is tolerated and ends it well
// (SelWalk.MissingAnswerInTheMiddleKeepsTheRowsAndIsTolerated).
constexpr IPMICommand kGetLaterEntry{
    .command = ipmi::kGetSelEntry.number,
    .sendFailure = "Failure in sending command to obtain SEL entry.\n",
    .sendFailureSeverity = kTrace,
    .sendFailureResult = kEndOfData,
    .errorPrefix = "IPMI error in obtaining system event log entry: ",
    .eraseText = true};

constexpr std::size_t kDumpCapacity = 256;

}  // namespace

IPMIRequestSEL::IPMIRequestSEL(NQORTQR20::SPLibrary* transport) : IPMIMessage(transport) {}

std::string IPMIRequestSEL::ResponseText() const {
    std::string text = DumpBytes(Response(), Digits::kUpperHex);
    text += '\n';
    if (text.size() >= kDumpCapacity) text.resize(kDumpCapacity - 1);
    return text;
}

unsigned IPMIRequestSEL::IPMIGetSELInfo(NQORTQR20::TCPluginCallbacks*, unsigned int* entryCount) {
    TraceScope trace("IPMIRequestSEL::IPMIGetSELInfo()");
    if (Exchange(kGetSelInfo) != kOk) return trace.Fail();
    if (LogEnabled(kTrace)) WriteLog(kTrace, "IPMIGetSELInfo::tempbuf = " + ResponseText());
    if (Response().empty()) return trace.Fail("Error in reading data for SEL information.");
    ByteReader reply = Reply();
    if (reply.U8() != ipmi::kSelVersion) {
        return trace.Fail("The SEL Version does not match the Current IPMI Version\n");
    }
    *entryCount = reply.U16();
    WriteLog(kTrace, "IPMIGetSELInfo::num_SELentries = " + std::to_string(*entryCount));
    return kOk;
}

unsigned IPMIRequestSEL::IPMIGetSELEntry(NQORTQR20::TCPluginCallbacks*, s_SEL_row* rows,
                                         unsigned int rowCount, unsigned int* rowsFilled) {
    TraceScope trace("IPMIRequestSEL::IPMIGetSELEntry()");
    if (rowsFilled != nullptr) *rowsFilled = 0;
    // Compatibility: the first entry is stored whatever the caller's row count
    // (SelWalk.FirstEntryIsStoredEvenForNoRows).
    const unsigned stored = std::max(rowCount, 1U);
    nextRecordId_ = {};  // stands for the first entry
    for (unsigned counter = 0; counter < kMaxRecords; ++counter) {
        // A reservation is not needed for whole records, hence ID 0x0000.
        const std::array<std::uint8_t, 6> request{
            0x00, 0x00, nextRecordId_.low, nextRecordId_.high, 0x00, ipmi::kWholeRecord};
        const unsigned result = Exchange(counter == 0 ? kGetFirstEntry : kGetLaterEntry, request);
        if (result == kEndOfData) break;
        if (result != kOk) return trace.Fail();

        if (counter < stored || LogEnabled(kTrace)) {
            s_SEL_row row;
            StringCchCopy(row.data, sizeof row.data, ResponseText().c_str());
            if (LogEnabled(kTrace)) {
                WriteLog(kTrace, "buffer[" + std::to_string(counter) + "].data = " + row.data);
            }
            if (counter < stored) {
                rows[counter] = row;
                if (rowsFilled != nullptr) *rowsFilled = counter + 1;
            }
        }
        // Stands at its place in the buffer, whatever length the transport reported.
        ByteReader reply = ReplyBuffer();
        nextRecordId_ = ReadRecordID(&reply);
        // Compatibility: any next ID of 0xFFxx ends the walk, not only 0xFFFF
        // (SelWalk.HighByteFfEndsTheWalk).
        if (nextRecordId_.high == 0xFF) break;
    }
    return kOk;
}

unsigned IPMIRequestSEL::IPMIOpenFile(NQORTQR20::TCPluginCallbacks*) {
    TraceScope trace("IPMIRequestSEL::IPMIOpenFile()");
    if (debugFile_.Open("./sel.out")) return kOk;
    WriteLog(kError, "Could not open file SEL_FILE");
    WriteLog(kTrace, "IPMIRequestSEL::IPMIOpenFile() returning.");
    return trace.Fail();
}

unsigned IPMIRequestSEL::IPMICloseFile(NQORTQR20::TCPluginCallbacks*) {
    TraceScope trace("IPMIRequestSEL::IPMICloseFile()");
    if (debugFile_.Close()) return kOk;
    WriteLog(kError, "Could not close file SEL_FILE");
    WriteLog(kTrace, "IPMIRequestSEL::IPMICloseFile() returning.");
    return trace.Fail();
}
