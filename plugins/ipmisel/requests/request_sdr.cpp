#include "plugins/ipmisel/requests/request_sdr.h"

#include <algorithm>
#include <array>

#include "base/text.h"
#include "ipmi/command.h"
#include "ipmi/sdr_record.h"

using namespace ipmisel;

namespace {

constexpr IPMICommand SdrCommand(std::uint8_t command, const char* sendFailure,
                                 const char* errorPrefix) {
    return {.command = command,
            .frameDigits = Digits::kUpperHex,
            .sendFailure = sendFailure,
            .errorPrefix = errorPrefix};
}

constexpr IPMICommand kGetSdrInfo =
    SdrCommand(ipmi::kGetSdrRepositoryInfo.number, "Failure in sending command to obtain SDR info.",
               "IPMI error in obtaining sensor data record info: ");
constexpr IPMICommand kReserveSdr =
    SdrCommand(ipmi::kReserveSdrRepository.number, "Failure in sending command to reserve SDR.",
               "IPMI error in reserving sensor data record: ");
constexpr IPMICommand kGetSdrHeader =
    SdrCommand(ipmi::kGetSdr.number, "Failure in sending command to obtain SDR Header.",
               "IPMI error in obtaining sensor data record header: ");
constexpr IPMICommand kGetSdrUnits =
    SdrCommand(ipmi::kGetSdr.number, "Failure in sending command to obtain SDR Units.",
               "IPMI error in obtaining sensor data record units: ");
constexpr IPMICommand kGetSdrString =
    SdrCommand(ipmi::kGetSdr.number, "Failure in sending command to obtain SDR String.",
               "IPMI error in obtaining sensor data record string: ");

// Record types, and offsets in their records (IPMI 2.0, tables 43-1 and 43-2).
constexpr auto kFullSensor = static_cast<std::uint8_t>(ipmi::SdrType::kFull);
constexpr auto kCompactSensor = static_cast<std::uint8_t>(ipmi::SdrType::kCompact);
constexpr std::uint8_t kHeaderOffset = 0;
constexpr std::uint8_t kHeaderCount = 10;
constexpr std::uint8_t kRecordTypeAt = 3;
constexpr std::uint8_t kUnitsOffset = 20;
constexpr std::uint8_t kUnitsCount = 10;
constexpr auto kFullStringOffset = static_cast<std::uint8_t>(ipmi::kFullNameAt);
constexpr auto kCompactStringOffset = static_cast<std::uint8_t>(ipmi::kCompactNameAt);

/// Compatibility: one byte of 0xFF ends the repository, so that a record whose ID has such a byte
/// is never read (SdrWalk.AnyFfByteEndsTheWalk).
bool EndsRepository(const IPMIRecordID& id) { return id.high == 0xFF || id.low == 0xFF; }

}  // namespace

IPMIRequestSDR::IPMIRequestSDR(NQORTQR20::SPLibrary* transport) : IPMIMessage(transport) {}

unsigned IPMIRequestSDR::ReadRecord(const IPMICommand& command, std::uint8_t offset,
                                    std::uint8_t count) {
    const std::array<std::uint8_t, 6> request{
        reservationId_.low, reservationId_.high, recordId_.low, recordId_.high, offset, count};
    return Exchange(command, request);
}

void IPMIRequestSDR::StoreText(std::span<char> field) const {
    const auto response = Response();
    const std::size_t shown = std::min(response.size(), field.size() / 3 + 1);
    CopyOut(field.data(), field.size(), DumpBytes(response.first(shown), Digits::kUpperHex));
}

bool IPMIRequestSDR::IsSensorRecord() const {
    return recordType_ == kFullSensor || recordType_ == kCompactSensor;
}

unsigned IPMIRequestSDR::IPMIGetSDRInfo(NQORTQR20::TCPluginCallbacks*, unsigned char* infoText) {
    TraceScope trace("IPMIRequestSDR::IPMIGetSDRInfo()");
    if (Exchange(kGetSdrInfo) != kOk) return trace.Fail();
    StoreText({reinterpret_cast<char*>(infoText), kSdrInfoTextLength});
    return kOk;
}

unsigned IPMIRequestSDR::IPMIReserveSDR(NQORTQR20::TCPluginCallbacks*) {
    TraceScope trace("IPMIRequestSDR::IPMIReserveSDR()");
    if (Exchange(kReserveSdr) != kOk) return trace.Fail();
    ByteReader reply = Reply();
    reservationId_ = ReadRecordID(&reply);
    return kOk;
}

unsigned IPMIRequestSDR::IPMIGetSDRHeader(NQORTQR20::TCPluginCallbacks*, s_SDR_entry* entry) {
    TraceScope trace("IPMIRequestSDR::IPMIGetSDRHeader()");
    if (ReadRecord(kGetSdrHeader, kHeaderOffset, kHeaderCount) != kOk) return trace.Fail();
    ByteReader reply = Reply();
    nextRecordId_ = ReadRecordID(&reply);
    reply.Skip(kRecordTypeAt);
    recordType_ = reply.U8();
    // Compatibility: for other records neither text nor completed line
    // (SdrWalk.OtherRecordTypesAreSkipped).
    if (!IsSensorRecord()) return trace.Silence();
    StoreText(entry->SDRHeaderData);
    return kOk;
}

unsigned IPMIRequestSDR::IPMIGetSDRUnits(NQORTQR20::TCPluginCallbacks*, s_SDR_entry* entry) {
    TraceScope trace("IPMIRequestSDR::IPMIGetSDRUnits()");
    if (ReadRecord(kGetSdrUnits, kUnitsOffset, kUnitsCount) != kOk) return trace.Fail();
    StoreText(entry->SDRUnitsData);
    return kOk;
}

unsigned IPMIRequestSDR::IPMIGetSDRString(NQORTQR20::TCPluginCallbacks*, s_SDR_entry* entry) {
    TraceScope trace("IPMIRequestSDR::IPMIGetSDRString()");
    const std::uint8_t offset =
        recordType_ == kFullSensor ? kFullStringOffset : kCompactStringOffset;
    if (ReadRecord(kGetSdrString, offset, ipmi::kWholeRecord) != kOk) return trace.Fail();
    StoreText(entry->SDRStringData);
    return kOk;
}

unsigned IPMIRequestSDR::IPMIGetSDREntry(NQORTQR20::TCPluginCallbacks* context,
                                         std::vector<s_SDR_entry>* entries,
                                         unsigned char* infoText) {
    TraceScope trace("IPMIRequestSDR::IPMIGetSDREntry()");
    if (IPMIGetSDRInfo(context, infoText) != kOk) return trace.Fail();
    if (IPMIReserveSDR(context) != kOk) return trace.Fail();
    for (unsigned read = 0; read < kMaxRecords && !EndsRepository(recordId_); ++read) {
        s_SDR_entry entry{};
        if (IPMIGetSDRHeader(context, &entry) != kOk) return trace.Fail();
        if (IsSensorRecord()) {
            if (IPMIGetSDRUnits(context, &entry) != kOk) return trace.Fail();
            if (IPMIGetSDRString(context, &entry) != kOk) return trace.Fail();
            entries->push_back(entry);
        }
        recordId_ = nextRecordId_;
    }
    return kOk;
}

unsigned IPMIRequestSDR::IPMIOpenFile(NQORTQR20::TCPluginCallbacks*) {
    TraceScope trace("IPMIRequestSDR::IPMIOpenFile()");
    if (debugFile_.Open("./sdr.out")) return kOk;
    WriteLog(kError, "Could not open file SDR_FILE");
    WriteLog(kTrace, "IPMIRequestSDR::IPMIOpenFile() returning.");
    return trace.Fail();
}

unsigned IPMIRequestSDR::IPMICloseFile(NQORTQR20::TCPluginCallbacks*) {
    TraceScope trace("IPMIRequestSDR::IPMICloseFile()");
    if (debugFile_.Close()) return kOk;
    // Compatibility: the line stands twice, as error and as trace (DebugFiles.OpenAndClose).
    WriteLog(kError, "Could not close file SDR_FILE");
    WriteLog(kTrace, "Could not close file SDR_FILE");
    return trace.Fail();
}
