#include "plugins/ipmisel/requests/request_fru_locator.h"

#include <algorithm>
#include <array>
#include <string>

#include "base/text.h"
#include "ipmi/command.h"
#include "ipmi/id_string.h"
#include "ipmi/sdr_record.h"

using namespace ipmisel;

namespace {

/// Compatibility: the room for the reply as the transport is given it, although the buffer ends
/// earlier (Bounds.RoomThatIsClaimedForTheReply).
constexpr int kClaimedLength = IPMIFRULocator::kFruDataLength;

constexpr IPMICommand FruCommand(std::uint8_t command, const char* sendFailure,
                                 const char* errorPrefix) {
    return {.command = command,
            .bufferName = "fRspBuf",
            .length = kClaimedLength,
            .sendFailure = sendFailure,
            .errorPrefix = errorPrefix,
            .errorSeverity = kInfo};
}

constexpr IPMICommand kReserveSdr =
    FruCommand(ipmi::kReserveSdrRepository.number, "Failure in sending command to reserve SDR.",
               "IPMI error in reserving sensor data record: ");
constexpr IPMICommand kGetSdrHeader =
    FruCommand(ipmi::kGetSdr.number, "Failure in sending command to obtain SDR Header.",
               "IPMI error in obtaining sensor data record header: ");
constexpr IPMICommand kGetSdrString =
    FruCommand(ipmi::kGetSdr.number, "Failure in sending command to obtain SDR String.",
               "IPMI error in obtaining sensor data record string: ");

// IPMI 2.0, table 43-7.
constexpr auto kFruDeviceLocator = static_cast<std::uint8_t>(ipmi::SdrType::kFruLocator);
constexpr std::uint8_t kHeaderOffset = 0;
constexpr auto kStringOffset = static_cast<std::uint8_t>(ipmi::kLocatorNameAt);
constexpr std::uint8_t kHeaderCount = kStringOffset;

constexpr unsigned kInventoryBytes = 256;
constexpr std::uint8_t kChunk = 16;

/// Compatibility: unlike the walk over the sensors, only both bytes of 0xFF end this one
/// (FruWalk.OneByteOfFfGoesOn).
bool EndsRepository(const IPMIRecordID& id) { return id.high == 0xFF && id.low == 0xFF; }

/// Takes over a record's first 15 bytes.
void ReadLocator(ByteReader* in, IPMIFRULocator* locator) {
    locator->SetRecordID_LSB(in->U8());
    locator->SetRecordID_MSB(in->U8());
    locator->SetSDRVersion(in->U8());
    locator->SetRecordType(in->U8());
    locator->SetRecordLength(in->U8());
    locator->SetDeviceAccessAddr(in->U8());
    locator->SetFRUDevIDSlaveAddr(in->U8());
    locator->SetLogPhysLUNBusID(in->U8());
    locator->SetChannelNumber(in->U8());
    in->Skip(1);  // reserved
    locator->SetDeviceType(in->U8());
    locator->SetDeviceTypeModifier(in->U8());
    locator->SetFRUEntityID(in->U8());
    locator->SetFRUEntityInstance(in->U8());
    locator->SetOEM(in->U8());
}

}  // namespace

IPMIRequestFRULocator::IPMIRequestFRULocator(NQORTQR20::SPLibrary* transport)
    : IPMIMessage(transport) {}

unsigned IPMIRequestFRULocator::ReadRecord(const IPMICommand& command, std::uint8_t offset,
                                           std::uint8_t count) {
    const std::array<std::uint8_t, 6> request{
        reservationId_.low, reservationId_.high, recordId_.low, recordId_.high, offset, count};
    const unsigned result = Exchange(command, request);
    if (result == kOk) LogResponse();
    return result;
}

void IPMIRequestFRULocator::LogResponse() const {
    if (!LogEnabled(kInfo)) return;
    WriteLog(kInfo, "fRspBuf = " + DumpBytes(Response(), Digits::kUpperHex));
    WriteLog(kInfo, "Response Length = " + std::to_string(length()));
}

unsigned IPMIRequestFRULocator::IPMIReserveSDR(NQORTQR20::TCPluginCallbacks*) {
    TraceScope trace("IPMIRequestFRULocator::IPMIReserveSDR()");
    if (Exchange(kReserveSdr) != kOk) return trace.Fail();
    ByteReader reply = Reply();
    reservationId_ = ReadRecordID(&reply);
    return kOk;
}

unsigned IPMIRequestFRULocator::IPMIGetSDRHeader(NQORTQR20::TCPluginCallbacks*,
                                                 IPMIFRULocator* locator) {
    TraceScope trace("IPMIRequestFRULocator::IPMIGetSDRHeader()");
    if (ReadRecord(kGetSdrHeader, kHeaderOffset, kHeaderCount) != kOk) return trace.Fail();
    ByteReader reply = Reply();
    nextRecordId_ = ReadRecordID(&reply);
    ByteReader record = reply;
    record.Skip(3);
    const std::uint8_t type = record.U8();
    record.Skip(2);
    const std::uint8_t device = record.U8();
    // Compatibility: a locator of device 0 is passed over like any other record
    // (FruWalk.KeepsFruDeviceLocatorsAlone).
    if (type != kFruDeviceLocator || device == 0) {
        WriteLog(kTrace,
                 "This is not a FRU Locator. Exiting IPMIRequestFRULocator::IPMIGetSDRHeader().");
        trace.Silence();
        return kOtherRecord;
    }
    ReadLocator(&reply, locator);
    return kOk;
}

unsigned IPMIRequestFRULocator::IPMIGetSDRString(NQORTQR20::TCPluginCallbacks*,
                                                 IPMIFRULocator* locator) {
    TraceScope trace("IPMIRequestFRULocator::IPMIGetSDRString()");
    if (ReadRecord(kGetSdrString, kStringOffset, ipmi::kWholeRecord) != kOk) return trace.Fail();
    constexpr std::size_t kBeforeText = ipmi::kRecordAt + 1;  // the type/length byte
    ByteReader reply = Reply();
    reply.Skip(2);
    const std::uint8_t typeLength = reply.U8();
    locator->SetIDStringTypeLength(typeLength);
    const auto response = Response();
    const auto text = response.subspan(std::min(response.size(), kBeforeText));
    // Compatibility: the type bits count as length (FruWalk.IdStringIsTheTextOfTheRecord).
    const auto end = std::find(
        text.begin(), text.begin() + std::min<std::ptrdiff_t>(std::ssize(text), typeLength), 0);
    locator->SetIDString(std::string(text.begin(), end));
    const unsigned length = ipmi::TypeLength::FromByte(typeLength).length;
    if (text.size() < length) {
        WriteLog(kNotice, Format("The ID string of FRU device %u is cut short: %zu of %u bytes.",
                                 locator->GetFRUDevIDSlaveAddr(), text.size(), length));
    }
    return kOk;
}

unsigned IPMIRequestFRULocator::IPMIGetSDREntry(NQORTQR20::TCPluginCallbacks* context,
                                                std::vector<IPMIFRULocator>* locators) {
    TraceScope trace("IPMIRequestFRULocator::IPMIGetSDREntry()");
    if (IPMIReserveSDR(context) != kOk) return trace.Fail();
    for (unsigned read = 0; read < kMaxRecords && !EndsRepository(recordId_); ++read) {
        IPMIFRULocator locator;
        const unsigned result = IPMIGetSDRHeader(context, &locator);
        if (result == kOk) {
            if (IPMIGetSDRString(context, &locator) != kOk) return trace.Fail();
            locators->push_back(std::move(locator));
        } else if (result != kOtherRecord) {
            return trace.Fail();
        }
        recordId_ = nextRecordId_;
    }
    WriteLog(kTrace, "Obtained the following FRU Locators.");
    printFRUVector(context, locators);
    return kOk;
}

unsigned IPMIRequestFRULocator::IPMIGetFRUData(NQORTQR20::TCPluginCallbacks*,
                                               IPMIFRULocator* locator, bool deviceZero) {
    TraceScope trace("IPMIRequestFRULocator::IPMIGetFRUData()");
    const std::uint8_t device = deviceZero ? std::uint8_t{0} : locator->GetFRUDevIDSlaveAddr();
    const std::string errorPrefix =
        "FRU data not available for Device ID " + std::to_string(device) + ": ";
    const IPMICommand readFruData =
        FruCommand(ipmi::kReadFruData.number, "Failure in sending command to obtain FRU Data.",
                   errorPrefix.c_str());
    for (unsigned offset = 0; offset < kInventoryBytes; offset += kChunk) {
        const std::array<std::uint8_t, 4> request{device, static_cast<std::uint8_t>(offset), 0x00,
                                                  kChunk};
        if (Exchange(readFruData, request) != kOk) return trace.Fail();
        LogResponse();
        // A device that answers more than it was asked for has it cut, so that no chunk runs into
        // the next one or out of the locator.
        constexpr std::size_t kBeforeData = 2;  // completion code, count
        const auto response = Response();
        const auto data = response.subspan(std::min(response.size(), kBeforeData));
        if (data.size() != kChunk) {
            WriteLog(kNotice, Format("FRU device %u answered %zu bytes at offset %u, not %u.",
                                     device, data.size(), offset, kChunk));
        }
        locator->SetFRUData(static_cast<int>(offset), data.data(),
                            static_cast<unsigned>(std::min<std::size_t>(data.size(), kChunk)));
    }
    return kOk;
}

unsigned IPMIRequestFRULocator::printFRUVector(NQORTQR20::TCPluginCallbacks*,
                                               std::vector<IPMIFRULocator>* locators) {
    TraceScope trace("IPMIRequestFRULocator::printFRUVector()");
    if (!LogEnabled(kTrace)) return kOk;
    WriteLog(kTrace, "Number of FRU Locators is " + std::to_string(locators->size()));
    for (const IPMIFRULocator& locator : *locators) {
        WriteLog(kTrace, "Device ID " + std::to_string(locator.GetFRUDevIDSlaveAddr()));
        WriteLog(kTrace, "FRUData = " +
                             DumpBytes({locator.GetFRUData(), kInventoryBytes}, Digits::kUpperHex));
    }
    return kOk;
}
