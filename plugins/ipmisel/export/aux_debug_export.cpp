#include "plugins/ipmisel/export/aux_debug_export.h"

#include <algorithm>
#include <array>
#include <cstdlib>
#include <span>
#include <string>

#include "plugins/ipmisel/class_names.h"
#include "plugins/ipmisel/export/clock_difference.h"
#include "plugins/ipmisel/export/copied_text.h"
#include "plugins/ipmisel/export/value_array.h"

using NQORTQR20::fdriIOHandle;
using NQORTQR20::kStatusFailed;
using NQORTQR20::SPLibrary;
using NQORTQR20::TCPluginCallbacks;

namespace ipmisel {
namespace {

constexpr std::array<unsigned char, 3> kSignature{0x4D, 0x4F, 0x00};
constexpr std::uint8_t kDebugCode = 0x03;
constexpr std::size_t kDataAt = 10;

/// What is the same for all entries of one export.
struct AuxDebugExport {
    TCPluginCallbacks* context;
    fdriIOHandle* output;
    std::span<const IPMISELEntry> selEntries;
    IPMIMapping* mapping;
    ClockDifference clock;
};

bool IsDebugEntry(const s_AuxLog_entry& entry) {
    return std::equal(kSignature.begin(), kSignature.end(), entry.bytes) &&
           entry.bytes[kDataAt] == kDebugCode;
}

/// The first SEL record with the ID; null when there is none.
const IPMISELEntry* FindSelEntry(const AuxDebugExport& exported, int wanted) {
    for (const IPMISELEntry& entry : exported.selEntries) {
        const CopiedText id = RunCopy([&](char* out, unsigned length) {
            return entry.CopyRecordID(exported.context, out, length, exported.mapping);
        });
        if (id.result != kOk) {
            WriteLog(kWarning, "CopyRecordID() failed.");
            continue;
        }
        const auto number = static_cast<int>(std::strtol(id.text.c_str(), nullptr, 10));
        if (LogEnabled(kInfo)) WriteLog(kInfo, "selid is " + std::to_string(number) + "\n");
        if (number == wanted) {
            WriteLog(kWarning, "Found corresponding SEL Record Entry.");
            return &entry;
        }
    }
    WriteLog(kWarning, "No corresponding SEL Record found.");
    return nullptr;
}

CopiedText TimestampOf(const AuxDebugExport& exported, const IPMISELEntry& entry) {
    const ClockDifference& clock = exported.clock;
    return RunCopy([&](char* out, unsigned length) {
        return entry.CopyTimestamp(exported.context, out, length, exported.mapping,
                                   clock.difference, clock.bmcNotBehind, clock.synchronise);
    });
}

/// False abandons the entry; why has been logged.
bool AddProperties(fdriIOHandle* output, const std::string& timestamp, unsigned index) {
    const auto add = [output](const char* name, const char* value) {
        return Added(NQORTQR20::fdrAddProperty(output, name, value), name);
    };
    return Added(NQORTQR20::fdrGetInstance(output, kAuxDebugClass), kAuxDebugClass) &&
           add("MessageTimestamp", timestamp.c_str()) && add("CreationClassName", kAuxDebugClass) &&
           add("LogCreationClassName", kAuxDebugClass) && add("LogName", kAuxDebugClass) &&
           add("RecordID", std::to_string(index).c_str());
}

/// As many bytes as the record size tells, no farther than the entry goes.
void FillArray(const ValueArray& array, std::span<const unsigned char> bytes) {
    const unsigned recordSize = bytes[3] | unsigned{bytes[4]} << 8;
    WriteLog(kTrace, "RecordSize= " + std::to_string(recordSize) + "\n");
    const auto data = bytes.subspan(kDataAt);
    for (const unsigned char byte : data.first(std::min<std::size_t>(recordSize, data.size()))) {
        if (NQORTQR20::fdrArrayAddUint8(array.get(), byte).code == kStatusFailed) {
            WriteLog(kWarning, "Failed to add uint8 to array.");
            break;
        }
        WriteLog(kTrace, "Exporting array element.");
    }
}

/// Adds RawData and closes the instance. False when no value array could be had.
bool Finish(fdriIOHandle* output, const s_AuxLog_entry& entry) {
    ValueArray array;
    if (array.get() == nullptr) {
        WriteLog(kWarning, "Could not create Array for Raw Hex Data.");
        return false;
    }
    FillArray(array, entry.bytes);
    if (NQORTQR20::fdrAddArrayProperty(output, "RawData", array.get()).code == kStatusFailed) {
        WriteLog(kWarning, "Failed to add array property.");
        return true;
    }
    // Compatibility: before the instance is added, where the event records have it after
    // (AuxDebugLog.WritesDebugCodesOfKnownRecords).
    WriteLog(kTrace, "Deleting valArray.");
    array.Delete();
    NQORTQR20::fdrAddInstance(output);
    return true;
}

/// False when the whole export has to end.
bool ExportEntry(const AuxDebugExport& exported, const s_AuxLog_entry& entry, unsigned index) {
    if (!IsDebugEntry(entry)) return true;
    const IPMISELEntry* const selEntry =
        FindSelEntry(exported, entry.bytes[5] | entry.bytes[6] << 8);
    if (selEntry == nullptr) return true;
    const CopiedText timestamp = TimestampOf(exported, *selEntry);
    if (timestamp.result != kOk) {
        WriteLog(kWarning, "CopyTimestamp() failed.");
        return false;
    }
    if (!AddProperties(exported.output, timestamp.text, index)) return true;
    return Finish(exported.output, entry);
}

}  // namespace
}  // namespace ipmisel

unsigned ExportAuxDebugLog(int /*node*/, TCPluginCallbacks* context, fdriIOHandle* output,
                           s_AuxLog_entry* entries, unsigned int count, IPMISELEntry* selEntries,
                           unsigned int selCount, IPMIMapping* mapping, SPLibrary* library) {
    using namespace ipmisel;
    TraceScope trace("ExportAuxDebugLog()", {" function entered.", " function exited.", kTrace});
    const AuxDebugExport exported{
        context, output, {selEntries, selCount}, mapping, MeasureClock(context, library)};
    for (unsigned i = 0; i < count; ++i) {
        if (!ExportEntry(exported, entries[i], i)) return trace.Fail();
    }
    return kOk;
}
