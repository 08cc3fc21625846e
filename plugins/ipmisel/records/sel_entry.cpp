#include "plugins/ipmisel/records/sel_entry.h"

#include <algorithm>
#include <cstring>
#include <initializer_list>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "base/bytes.h"
#include "base/text.h"
#include "ipmi/command.h"
#include "ipmi/event_types.h"
#include "ipmi/sel_info.h"
#include "ipmi/sel_record.h"
#include "plugins/ipmisel/log.h"
#include "plugins/ipmisel/records/sel_texts.h"

using namespace ipmisel;
using NQORTQR20::TCPluginCallbacks;

namespace {

constexpr std::size_t kShutDownCapacity = 512;  // of the caller's buffer
constexpr std::size_t kEventDataCapacity = 256;

// A row is an answer of Get SEL Entry, from the completion code on.
constexpr std::size_t kRowNumbers = ipmi::kRecordAt + ipmi::kSelRecordSize;

// A line of SEL information: 15 groups and the line feed.
constexpr std::size_t kInfoNumbers = 15;
constexpr std::size_t kInfoLineLength = 46;
constexpr unsigned kSelVersion = ipmi::kSelVersion;

constexpr unsigned kRawTextLength = 64;

using Record = ipmi::SelBytes;

/// Between the record as held, its ID high byte first, and as the wire has it; either way.
Record SwapId(Record record) {
    std::swap(record[0], record[1]);
    return record;
}

/// A traced text: built only if somebody reads it.
void Trace(const char* label, std::string_view text) {
    if (LogEnabled(kTrace)) WriteLog(kTrace, std::string(label).append(text));
}

using OemOperation = int (IPMIMapping::*)(TCPluginCallbacks*, const std::uint8_t*, char*,
                                          unsigned int);

unsigned CopyOem(const char* name, TCPluginCallbacks* context, IPMIMapping* mapping,
                 OemOperation describe, const std::uint8_t* bytes, char* out, unsigned len) {
    TraceScope trace(name, TraceScope::kFunction);
    CopyOut(out, len, "");
    if ((mapping->*describe)(context, bytes, out, len) != 0) return trace.Fail();
    return kOk;
}

}  // namespace

unsigned IPMISELEntry::ScanSELDataFile(TCPluginCallbacks* /*context*/, const s_SEL_row* rows,
                                       unsigned int index) {
    TraceScope trace("IPMISELEntry::ScanSELDataFile()", TraceScope::kFunction);
    const s_SEL_row& row = rows[index];
    const auto numbers = ScanHexRow(BoundedView(row.data, sizeof row.data), kRowNumbers);
    if (!numbers) {
        WriteLog(kInfo, "System event log end-of-file found.\n");
        trace.Fail("IPMISELEntry::ScanSELDataFile() function returned.", kTrace);
        return kEndOfData;
    }
    Record wire{};  // what the row lacks is zero
    for (std::size_t i = ipmi::kRecordAt; i < numbers->size(); ++i) {
        wire[i - ipmi::kRecordAt] = static_cast<std::uint8_t>((*numbers)[i]);
    }
    bytes_ = SwapId(wire);
    if (LogEnabled(kTrace)) {
        std::string line = "Results of ScanSELDataFile:";
        for (const std::uint8_t byte : bytes_) line.append(" ").append(std::to_string(byte));
        WriteLog(kTrace, line);
    }
    return kOk;
}

unsigned IPMISELEntry::ScanSELInfoDataFile(TCPluginCallbacks* /*context*/, std::FILE* file,
                                           int* entryCount) {
    TraceScope trace("IPMISELEntry::ScanSELInfoDataFile()", TraceScope::kFunction);
    char line[128];
    if (file == nullptr || std::fgets(line, sizeof line, file) == nullptr) {
        trace.Fail("End-of-file found. No data for SDR Info.");
        return kEndOfData;
    }
    const std::string_view text(line);
    Trace("   SELInfostring=", text);
    Trace("strlen(SELstring) = ", std::to_string(text.size()));
    if (text.size() != kInfoLineLength) {
        return trace.Fail("SELInfostring is not in the correct format.");
    }
    auto numbers = ScanHexRow(text, kInfoNumbers);
    if (!numbers) return trace.Fail("Error in reading data file for SELInfoInfostring");
    numbers->resize(kInfoNumbers);
    const unsigned version = (*numbers)[1];
    if (version != kSelVersion) {
        const std::string refusal =
            Format("This SEL Version (0x%x) does not match the current IPMI Version (0x%x).\n",
                   version, kSelVersion);
        return trace.Fail(refusal.c_str(), kWarning);
    }
    *entryCount = static_cast<int>(((*numbers)[3] & 0xFF) * 256 + ((*numbers)[2] & 0xFF));
    return kOk;
}

unsigned IPMISELEntry::CopyRecordID(TCPluginCallbacks* /*context*/, char* out, unsigned int len,
                                    IPMIMapping* /*mapping*/) const {
    const TraceScope trace("IPMISELEntry::GetRecordID()", TraceScope::kFunction);
    const std::string id = std::to_string(bytes_[0] * 256 + bytes_[1]);
    Trace("Record ID    = ", id);
    CopyOut(out, len, id);
    return kOk;
}

unsigned IPMISELEntry::CopyGeneratorID(TCPluginCallbacks* context, char* out, unsigned int len,
                                       IPMIMapping* /*mapping*/) const {
    // Compatibility: the one name without parentheses
    // (SelEntry.TextsAreTracedAndCutAtTheBufferWithoutANul).
    const TraceScope trace("IPMISELEntry::GetGeneratorID", TraceScope::kFunction);
    if (LogEnabled(kTrace)) {
        WriteLog(kTrace, Format("GenID1, GenID2 = %d, %d", int{bytes_[7]}, int{bytes_[8]}));
    }
    CopyOut(out, len, SourceText(context, bytes_[7], bytes_[8]));
    return kOk;
}

unsigned IPMISELEntry::CopySensorType(TCPluginCallbacks* context, char* out, unsigned int len,
                                      IPMIMapping* mapping) const {
    const TraceScope trace("IPMISELEntry::CopySensorType()", TraceScope::kFunction);
    char text[kSelTextCapacity] = {};
    mapping->GetSensorType(context, bytes_[10], text, sizeof text, bytes_[11]);
    Trace("Sensor Type = ", text);
    CopyOut(out, len, text);
    return kOk;
}

unsigned IPMISELEntry::CopyEventType(TCPluginCallbacks* /*context*/, char* out, unsigned int len,
                                     IPMIMapping* /*mapping*/) const {
    const TraceScope trace("IPMISELEntry::GetEventType()", TraceScope::kFunction);
    const std::string text = EventTypeText(bytes_[12]);
    WriteLog(kTrace, text);
    CopyOut(out, len, text);
    return kOk;
}

unsigned IPMISELEntry::CopyEventData(TCPluginCallbacks* context, char* out, unsigned int len,
                                     const s_SDR_Mod_Units* units, IPMIMapping* mapping) const {
    const TraceScope trace("IPMISELEntry::GetEventData()", TraceScope::kFunction);
    const std::uint8_t type = bytes_[12] & 0x7F;
    char text[kEventDataCapacity] = {};
    switch (ipmi::ClassOfEventType(type)) {
        case ipmi::EventClass::kThreshold:
            mapping->GetThresholdOffset(context, bytes_[13], bytes_[14], bytes_[15], text,
                                        sizeof text, units);
            break;
        case ipmi::EventClass::kGeneric:
            mapping->GetGenericOffset(context, bytes_[13], bytes_[14], bytes_[15], type, bytes_[10],
                                      bytes_[11], text, sizeof text);
            break;
        case ipmi::EventClass::kSensorSpecific:
            mapping->GetSensorOffset(context, bytes_[10], bytes_[13], bytes_[14], bytes_[15], type,
                                     text, sizeof text);
            break;
        default:
            break;
    }
    Trace("Event Data   = ", text);
    CopyOut(out, len, text);
    return kOk;
}

unsigned IPMISELEntry::CopyRawDataString(TCPluginCallbacks* /*context*/, char* out,
                                         unsigned int len, IPMIMapping* /*mapping*/) const {
    TraceScope trace("IPMISELEntry::CopyRawDataString()", TraceScope::kFunction);
    if (len < kRawTextLength) {
        return trace.Fail("Buffer not big enough to copy Raw Data.", kWarning);
    }
    std::string text = DumpBytes(SwapId(bytes_), Digits::kLowerHex);
    text.pop_back();  // the last byte's blank
    CopyOut(out, len, text);
    Trace("RawDataString = ", text);
    return kOk;
}

unsigned IPMISELEntry::CopyRawDataHex(TCPluginCallbacks* /*context*/, unsigned char* out,
                                      unsigned int len) const {
    TraceScope trace("IPMISELEntry::CopyRawDataHex()", TraceScope::kFunction);
    if (len < ipmi::kSelRecordSize) {
        return trace.Fail("Buffer not big enough to copy Raw Hex Data.", kWarning);
    }
    const Record wire = SwapId(bytes_);
    std::fill(std::copy(wire.begin(), wire.end(), out), out + len, std::uint8_t{0});
    return kOk;
}

unsigned IPMISELEntry::GetShutDownEvent(TCPluginCallbacks* /*context*/, char* out,
                                        int /*index*/) const {
    const TraceScope trace("IPMISELEntry::GetShutDownEvent()", TraceScope::kFunction);
    const std::string text = ShutDownText(std::span(bytes_).subspan<10, 5>());
    CopyOut(out, std::min(text.size() + 1, kShutDownCapacity), text);
    return kOk;
}

unsigned IPMISELEntry::GetOEMxC0(TCPluginCallbacks* context, char* out, unsigned int len,
                                 IPMIMapping* mapping) const {
    return CopyOem("IPMISELEntry::GetOEMxC0()", context, mapping, &IPMIMapping::GetOEMxC0,
                   &bytes_[7], out, len);
}

unsigned IPMISELEntry::GetOEMxC1(TCPluginCallbacks* context, char* out, unsigned int len,
                                 IPMIMapping* mapping) const {
    return CopyOem("IPMISELEntry::GetOEMxC1()", context, mapping, &IPMIMapping::GetOEMxC1,
                   &bytes_[7], out, len);
}

unsigned IPMISELEntry::GetOEMxE0(TCPluginCallbacks* context, char* out, unsigned int len,
                                 IPMIMapping* mapping) const {
    std::array<std::uint8_t, 10> bytes{};
    std::copy_n(&bytes_[3], 9, bytes.begin());
    bytes[9] = bytes_[15];
    return CopyOem("IPMISELEntry::GetOEMxE0()", context, mapping, &IPMIMapping::GetOEMxE0,
                   bytes.data(), out, len);
}

unsigned IPMISELEntry::GetOEMxE1(TCPluginCallbacks* context, char* out, unsigned int len,
                                 IPMIMapping* mapping) const {
    return CopyOem("IPMISELEntry::GetOEMxE1()", context, mapping, &IPMIMapping::GetOEMxE1,
                   &bytes_[3], out, len);
}

unsigned IPMISELEntry::GetOEMxE2(TCPluginCallbacks* context, char* out, unsigned int len,
                                 IPMIMapping* mapping) const {
    return CopyOem("IPMISELEntry::GetOEMxE2()", context, mapping, &IPMIMapping::GetOEMxE2,
                   &bytes_[3], out, len);
}

unsigned IPMISELEntry::GetOEMxE3(TCPluginCallbacks* context, char* out, unsigned int len,
                                 IPMIMapping* mapping) const {
    return CopyOem("IPMISELEntry::GetOEMxE3()", context, mapping, &IPMIMapping::GetOEMxE3,
                   &bytes_[3], out, len);
}

void IPMISELEntry::Print_variables(TCPluginCallbacks* /*context*/) const {
    const TraceScope trace("IPMISELEntry::Print_variables()", TraceScope::kFunction);
    if (!LogEnabled(kTrace)) return;
    // Compatibility: the fourth column is the last data byte where a reader expects the time stamp
    // (SelEntry.PrintsItsVariablesInTheirOldOrder).
    const Record& b = bytes_;
    WriteLog(
        kTrace,
        Format("Variables: %02x %02x %02x %08x %02x %02x %02x %02x %02x %02x %02x %02x %02x\n",
               b[1], b[0], b[2], b[15], b[6], b[7], b[8], b[9], b[10], b[11], b[12], b[13], b[14]));
}

unsigned FillSELArray(TCPluginCallbacks* context, const s_SEL_row* rows, IPMISELEntry* entries,
                      unsigned int count) {
    TraceScope trace("FillSELArray()", TraceScope::kFunction);
    for (unsigned i = 0; i < count; ++i) {
        if (entries[i].ScanSELDataFile(context, rows, i) != kOk) {
            return trace.Fail("Could not open process all SELs.", kWarning);
        }
    }
    return kOk;
}

unsigned PrintSELArray(TCPluginCallbacks* context, const IPMISELEntry* entries,
                       unsigned int count) {
    const TraceScope trace("PrintSELArray()", TraceScope::kFunction);
    for (unsigned i = 0; i < count; ++i) {
        Trace("Array index# ", std::to_string(i) + ": ");
        entries[i].Print_variables(context);
    }
    return kOk;
}
