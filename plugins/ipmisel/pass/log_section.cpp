#include <algorithm>
#include <array>
#include <memory>
#include <string>
#include <vector>

#include "base/text.h"
#include "plugins/ipmisel/export/aux_debug_export.h"
#include "plugins/ipmisel/export/sel_export.h"
#include "plugins/ipmisel/log.h"
#include "plugins/ipmisel/pass/sections.h"
#include "plugins/ipmisel/records/rows.h"

// The event log of one node: rows of text from the BMC, decoded into records with the help of the
// sensor cache, exported with what the auxiliary log says of them.

namespace ipmisel {
namespace {

using InfoText = std::array<unsigned char, kSdrInfoTextLength + 1>;

unsigned CountSelEntries(Node& node) {
    unsigned count = 0;
    IPMIRequestSEL& request = *node.objects.sel;
    if (request.IPMIGetSELInfo(node.context, &count) != kOk &&
        request.IPMIGetSELInfo(node.context, &count) != kOk) {
        WriteLog(kWarning, "Failed to communicate with BMC. This machine could be non-BMC.");
        throw SectionFailure{NQORTQR20::kStatusFailed};
    }
    return count;
}

template <std::size_t N>
std::string TextOf(const char (&field)[N]) {
    return std::string(BoundedView(field, N));
}

void DumpSdr(const std::vector<s_SDR_entry>& sensors, const InfoText& info) {
    if (!LogEnabled(kTrace)) return;
    WriteLog(kTrace, "Printing out the SDR buffer...");
    WriteLog(kTrace,
             "SDR Info = " + std::string(info.begin(), std::find(info.begin(), info.end(), '\0')));
    for (const s_SDR_entry& sensor : sensors) {
        WriteLog(kTrace, "SDR Header = " + TextOf(sensor.SDRHeaderData));
        WriteLog(kTrace, "SDR Units = " + TextOf(sensor.SDRUnitsData));
        WriteLog(kTrace, "SDR String = " + TextOf(sensor.SDRStringData));
    }
}

/// Whether the text of an answer holds so many bytes, each two digits and a blank.
template <std::size_t N>
bool Holds(const char (&field)[N], std::size_t count) {
    return BoundedView(field, N).size() + 1 >= 3 * count;
}

/// Takes out the elements of which not everything came, so that none is made from zeros that the
/// BMC never sent.
template <typename Elements, typename IsWhole>
void DropPartial(Elements* elements, IsWhole isWhole, const char* what) {
    const std::size_t dropped =
        std::erase_if(*elements, [&](const auto& element) { return !isWhole(element); });
    if (dropped != 0) WriteLog(kNotice, Format("%zu %s left out: short answers.", dropped, what));
}

bool IsWholeSensor(const s_SDR_entry& sensor) {
    constexpr std::size_t kHeaderAndUnits = 13;  // completion code, next record ID, ten bytes
    constexpr std::size_t kNameHead = 4;         // the same, type and length of the name
    return Holds(sensor.SDRHeaderData, kHeaderAndUnits) &&
           Holds(sensor.SDRUnitsData, kHeaderAndUnits) && Holds(sensor.SDRStringData, kNameHead);
}

bool IsWholeRow(const s_SEL_row& row) {
    constexpr std::size_t kRow = 19;  // completion code, next record ID, the record
    return Holds(row.data, kRow);
}

/// Leaves a node's head entry to the cache as soon as it is in there, however the building ends.
class HeadHandover {
public:
    explicit HeadHandover(NodeObjects& objects) : objects_(objects) {
        if (objects_.sdrHead == nullptr) objects_.sdrHead = std::make_unique<IPMISDREntry>();
    }
    ~HeadHandover() {
        const SDRCache& cache = *objects_.sdrCache->get();
        if (std::find(cache.begin(), cache.end(), objects_.sdrHead.get()) != cache.end()) {
            static_cast<void>(objects_.sdrHead.release());
        }
    }
    HeadHandover(const HeadHandover&) = delete;
    HeadHandover& operator=(const HeadHandover&) = delete;

private:
    NodeObjects& objects_;
};

/// Fills the node's sensor cache. A second log class of the pass finds the repository read to its
/// end and the cache as the first one left it.
void BuildSdrCache(Node& node) {
    NodeObjects& objects = node.objects;
    std::vector<s_SDR_entry> sensors;
    InfoText info{};
    if (objects.sdr->IPMIGetSDREntry(node.context, &sensors, info.data()) != kOk) {
        WriteLog(kError, "Could not collect all sensor data records\n");
    }
    DumpSdr(sensors, info);
    DropPartial(&sensors, IsWholeSensor, "sensors");

    const HeadHandover handover(objects);
    if (CreateSDRCache(node.context, objects.sdrHead.get(), objects.sdrCache->get(), &sensors,
                       info.data()) != kOk) {
        WriteLog(kWarning, "No SDR data obtained.\n");
    }
}

/// Reads the log into the node's records; the number of those that the BMC has answered.
unsigned ReadRecords(Node& node) {
    NodeObjects& objects = node.objects;
    const unsigned count = CountSelEntries(node);
    // Cleared, and one at least: the first entry is stored even of a log that counts none.
    std::vector<s_SEL_row> rows(std::max(count, 1U));
    unsigned filled = 0;
    objects.sel->IPMIGetSELEntry(node.context, rows.data(), count, &filled);

    BuildSdrCache(node);

    rows.resize(std::min(filled, count));
    DropPartial(&rows, IsWholeRow, "log records");
    filled = static_cast<unsigned>(rows.size());
    rows.resize(std::max(count, 1U));
    objects.selEntries.assign(count, IPMISELEntry());
    if (FillSELArray(node.context, rows.data(), objects.selEntries.data(), count) != kOk) {
        WriteLog(kWarning, "Failed to fill all the entries into SEL array.\n");
    }
    WriteLog(kTrace, "num_SELentries = " + std::to_string(count));
    return filled;
}

/// The auxiliary log's entries, cleared: the read operation places nothing in them.
std::vector<s_AuxLog_entry> AuxLogEntries(unsigned count) {
    WriteLog(kTrace, "num_AuxLogEntries = " + std::to_string(count));
    return std::vector<s_AuxLog_entry>(count);
}

std::vector<IPMIExtendedSELDataEntry> ReadExtendedEntries(IPMIRequestAuxLog& request) {
    unsigned count = 0;
    request.IPMIGetAuxLogStatus(&count);  // 0 on failure
    std::vector<s_AuxLog_entry> entries = AuxLogEntries(count);
    request.IPMIReadExtendedData(entries.data(), count);
    return ParseExtendedSELData(entries.data(), count);
}

}  // namespace

void CollectLogRecords(Node& node) {
    WriteLog(kInfo, "Getting log records.");
    NodeObjects& objects = node.objects;
    const unsigned count = ReadRecords(node);
    if (ExportSEL(node.number, node.context, node.output, objects.selEntry.get(),
                  objects.mapping.get(), nullptr, objects.sdrCache->get(),
                  objects.selEntries.data(), count, 0, ReadExtendedEntries(*objects.auxLog),
                  node.library) != kOk) {
        WriteLog(kError, "Failed to export SEL array.\n");
        throw SectionFailure{NQORTQR20::kStatusFailed};
    }
    WriteLog(kTrace, "Completed all collecting and exporting of SEL/SDR.");
}

void CollectAuxDebugRecords(Node& node) {
    WriteLog(kInfo, "Getting log records.");
    const unsigned selCount = ReadRecords(node);
    WriteLog(kInfo, "Getting Aux Log Records.");
    IPMIRequestAuxLog& request = *node.objects.auxLog;
    unsigned count = 0;
    if (request.IPMIGetAuxLogStatus(&count) != kOk) {
        WriteLog(kWarning, "IPMIGetAuxLogStatus() returned Error.");
        return;
    }
    std::vector<s_AuxLog_entry> entries = AuxLogEntries(count);
    if (request.IPMIReadExtendedData(entries.data(), count) != kOk) {
        WriteLog(kWarning, "IPMIReadExtendedData() returned Error.");
        return;
    }
    NodeObjects& objects = node.objects;
    ExportAuxDebugLog(node.number, node.context, node.output, entries.data(), count,
                      objects.selEntries.data(), selCount, objects.mapping.get(), node.library);
}

}  // namespace ipmisel
