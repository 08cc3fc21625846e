#include "plugins/ipmisel/export/sel_export.h"

#include <algorithm>
#include <array>
#include <cstdlib>
#include <string>

#include "base/text.h"
#include "ipmi/sel_record.h"
#include "plugins/ipmisel/class_names.h"
#include "plugins/ipmisel/export/clock_difference.h"
#include "plugins/ipmisel/export/copied_text.h"
#include "plugins/ipmisel/export/event_message.h"
#include "plugins/ipmisel/export/value_array.h"
#include "plugins/ipmisel/log.h"
#include "plugins/ipmisel/texts/entity_names.h"

using NQORTQR20::fdriIOHandle;
using NQORTQR20::kStatusFailed;
using NQORTQR20::SPLibrary;
using NQORTQR20::TCPluginCallbacks;

namespace ipmisel {
namespace {

constexpr std::size_t kEntityLength = 128;
constexpr std::size_t kSensorNameLength = 17;

/// The first sensor of the cache with each number: a repository may have 65,000, a log as many
/// events.
using SensorIndex = std::array<const IPMISDREntry*, 256>;

SensorIndex IndexSensors(const SDRCache* cache) {
    SensorIndex index{};
    if (cache == nullptr) return index;
    for (const IPMISDREntry* const entry : *cache) {
        if (entry != nullptr && index[entry->sensorNumber] == nullptr) {
            index[entry->sensorNumber] = entry;
        }
    }
    return index;
}

/// What is the same for all records of one export.
struct Export {
    int node;
    TCPluginCallbacks* context;
    fdriIOHandle* output;
    IPMIMapping* mapping;
    const SDRCache* cache;
    int recordIdOffset;
    std::vector<IPMIExtendedSELDataEntry>* extendedEntries;
    ClockDifference clock;
    SensorIndex sensors;
};

struct Record {
    const Export& exported;
    const IPMISELEntry& entry;
    int index;
    int number = 0;  ///< its ID with the offset, once RecordID is written
};

// ---- Texts of a record --------------------------------------------------------------------------

using CopyOperation = unsigned (IPMISELEntry::*)(TCPluginCallbacks*, char*, unsigned,
                                                 IPMIMapping*) const;

CopiedText Copied(const Record& record, CopyOperation copy) {
    return RunCopy([&](char* out, unsigned length) {
        return (record.entry.*copy)(record.exported.context, out, length, record.exported.mapping);
    });
}

using CopyTimeOperation = unsigned (IPMISELEntry::*)(TCPluginCallbacks*, char*, unsigned,
                                                     IPMIMapping*, NQORTQR20::TCIMDateTime, bool,
                                                     bool) const;

CopiedText Copied(const Record& record, CopyTimeOperation copy) {
    const ClockDifference& clock = record.exported.clock;
    return RunCopy([&](char* out, unsigned length) {
        return (record.entry.*copy)(record.exported.context, out, length, record.exported.mapping,
                                    clock.difference, clock.bmcNotBehind, clock.synchronise);
    });
}

/// The text of an operation whose failure is logged and otherwise ignored.
std::string LoggedOnly(const CopiedText& copied, const char* failure) {
    if (copied.result != kOk) WriteLog(kNotice, failure);
    return copied.text;
}

// ---- Properties. False abandons the record; why has been logged ---------------------------------

/// `what` is how the error line calls the property.
bool AddProperty(const Record& record, const char* name, const std::string& value,
                 const char* what) {
    return Added(NQORTQR20::fdrAddProperty(record.exported.output, name, value.c_str()), what);
}

bool AddProperty(const Record& record, const char* name, const std::string& value) {
    return AddProperty(record, name, value, name);
}

bool AddHead(const Record& record) {
    return Added(NQORTQR20::fdrGetInstance(record.exported.output, kLogRecordClass),
                 kLogRecordClass) &&
           // Compatibility: the class name of the log, not of the record
           // (SelExport.WritesThePropertiesOfEachRecordTypeInOrder).
           AddProperty(record, "CreationClassName", "QORSG_IPMILog") &&
           AddProperty(record, "LogCreationClassName", "QORSG_IPMILog") &&
           AddProperty(record, "LogName", "IPMILogEntry");
}

bool AddRecordId(Record* record, const char* what = "RecordID") {
    const CopiedText id = Copied(*record, &IPMISELEntry::CopyRecordID);
    if (id.result != kOk) return false;
    record->number = static_cast<int>(std::strtol(id.text.c_str(), nullptr, 10)) +
                     record->exported.recordIdOffset;
    return AddProperty(*record, "RecordID", std::to_string(record->number), what);
}

enum class Stamps { kBoth, kMessageOnly, kNoTime };

bool AddTimestamps(const Record& record, Stamps stamps) {
    std::string text = kNoTime;
    if (stamps != Stamps::kNoTime) {
        CopiedText time = Copied(record, &IPMISELEntry::CopyTimestamp);
        if (time.result != kOk) return false;
        text = std::move(time.text);
    }
    return AddProperty(record, "MessageTimestamp", text) &&
           (stamps == Stamps::kMessageOnly || AddProperty(record, "CreationTimeStamp", text));
}

// ---- System event records -----------------------------------------------------------------------

const IPMISDREntry* FindSensor(const Record& record) {
    const SDRCache* const cache = record.exported.cache;
    if (cache == nullptr || cache->empty()) {
        WriteLog(kTrace, "SDR cache is empty.");
        return nullptr;
    }
    return record.exported.sensors[record.entry.SensorNumber()];
}

s_SDR_Mod_Units UnitsOf(const IPMISDREntry& sensor) {
    return {.SDRType = sensor.recordType,
            .SensorUnits1 = sensor.sensorUnits1,
            .SensorUnits2 = sensor.baseUnit,
            .SensorUnits3 = sensor.modifierUnit,
            .Linearization = sensor.linearization,
            .M = sensor.m,
            .B = sensor.b,
            .Rexp = static_cast<std::uint16_t>(sensor.rExponent),
            .Bexp = static_cast<std::uint16_t>(sensor.bExponent)};
}

/// All zero without a sensor.
s_SDR_Mod_Units FindUnits(const IPMISDREntry* sensor) {
    if (sensor == nullptr) {
        WriteLog(kTrace, "No matching SDR for this SEL.");
        return {};
    }
    WriteLog(kTrace, "Found matching SDR for this SEL.");
    const s_SDR_Mod_Units units = UnitsOf(*sensor);
    if (LogEnabled(kTrace)) {
        WriteLog(kTrace, Format("RecordID = %d. Linearization = %d. M = %d. B = %d. Rexp = %d. "
                                "Bexp = %d. SDRType = %d. SensorUnits1 = %d. SensorUnits2 = %d. "
                                "SensorUnits3 = %d",
                                sensor->recordIdMs * 256 + sensor->recordIdLs, units.Linearization,
                                units.M, units.B, units.Rexp, units.Bexp, units.SDRType,
                                units.SensorUnits1, units.SensorUnits2, units.SensorUnits3));
    }
    return units;
}

/// Name of an entity that has a numbered text; empty for every other.
std::string NumberedEntityName(const Record& record, std::uint8_t entityId) {
    if (entityId > kLastNumberedEntity) return {};
    std::array<char, kEntityLength> buffer{};
    if (record.exported.mapping->GetString(record.exported.context, kEntityTextBase + entityId,
                                           buffer.data(), buffer.size()) != kOk) {
        WriteLog(kError, "Error in obtaining string.");
    }
    return std::string(BoundedView(buffer.data(), buffer.size()));
}

bool AddSensor(const Record& record, const IPMISDREntry* sensor, EventMessage* message) {
    std::string entityProperty;
    if (sensor != nullptr) {
        // Compatibility: a name that is no numbered text reaches the message, not the property
        // (SelExport.EntityNamesAboveTheNumberedOnesReachOnlyTheMessage).
        entityProperty = NumberedEntityName(record, sensor->entityId);
        message->entity = sensor->entityId <= kLastNumberedEntity
                              ? entityProperty
                              : std::string(HeldEntityName(sensor->entityId));
        message->entityInstance = std::to_string(sensor->entityInstance);
        message->sensorInformation = BoundedView(sensor->IDString.get(), kSensorNameLength);
    }
    return AddProperty(record, "Entity", entityProperty) &&
           AddProperty(record, "EntityInstance", message->entityInstance) &&
           AddProperty(record, "SensorInformation", message->sensorInformation);
}

bool AddSystemEvent(Record* record) {
    const IPMISELEntry& entry = record->entry;
    const IPMISDREntry* const sensor = FindSensor(*record);
    if (!AddRecordId(record) || !AddTimestamps(*record, Stamps::kBoth)) return false;

    const std::string source =
        LoggedOnly(Copied(*record, &IPMISELEntry::CopyGeneratorID), "Error CopyGeneratorID().");
    if (!AddProperty(*record, "Source", source)) return false;

    EventMessage message;
    message.deassertion = (entry.EventDirectionAndType() & 0x80) != 0;
    message.sensorType =
        LoggedOnly(Copied(*record, &IPMISELEntry::CopySensorType), "Error CopySensorType().");
    if (!AddProperty(*record, "SensorType", message.sensorType)) return false;

    const std::string eventType =
        LoggedOnly(Copied(*record, &IPMISELEntry::CopyEventType), "Error CopyEventType().");
    if (!AddProperty(*record, "EventType", eventType)) return false;

    const s_SDR_Mod_Units units = FindUnits(sensor);
    message.event = LoggedOnly(RunCopy([&](char* out, unsigned length) {
                                   return entry.CopyEventData(record->exported.context, out, length,
                                                              &units, record->exported.mapping);
                               }),
                               "Error CopyEventData().");
    return AddSensor(*record, sensor, &message) &&
           AddProperty(*record, "Message", Compose(std::move(message)));
}

// ---- Records of other types ---------------------------------------------------------------------

template <CopyOperation copy>
CopiedText TextOf(const Record& record) {
    return Copied(record, copy);
}

CopiedText BootTime(const Record& record) {
    return Copied(record, &IPMISELEntry::CopyOSBootTimestamp);
}

CopiedText ShutDown(const Record& record) {
    return RunCopy([&](char* out, unsigned) {
        return record.entry.GetShutDownEvent(record.exported.context, out, record.index);
    });
}

/// How a record type is written whose message is one text.
struct Kind {
    std::uint8_t recordType;
    const char* sensorType;
    Stamps stamps;
    CopiedText (*message)(const Record&);
    const char* failure;  ///< when the text cannot be had; null: what there is of it counts
    const char* recordIdName = "RecordID";      ///< in error lines
    const char* sensorTypeName = "SensorType";  ///< in error lines
};

constexpr std::array<Kind, 6> kKinds{{
    {0xC0, "OEM POST with Time Stamp", Stamps::kBoth, TextOf<&IPMISELEntry::GetOEMxC0>,
     "Error in obtaining OEMxC0"},
    {0xC1, "OEM SMI Handler with Time Stamp", Stamps::kBoth, TextOf<&IPMISELEntry::GetOEMxC1>,
     "Error in obtaining OEMxC1"},
    {0xE0, "OEM POST No Time Stamp", Stamps::kNoTime, TextOf<&IPMISELEntry::GetOEMxE0>,
     "Error in obtaining OEMxE0"},
    {0xE1, "OEM SMI No Time Stamp", Stamps::kNoTime, TextOf<&IPMISELEntry::GetOEMxE1>,
     "Error in obtaining OEMxE1"},
    {0xDC, "Boot Time", Stamps::kMessageOnly, BootTime, nullptr, "OS bootTime RecordID",
     "OS bootTime SensorType"},
    {0xDD, "Shutdown Event", Stamps::kMessageOnly, ShutDown, nullptr, "OS bootTime RecordID",
     "OS bootTime SensorType"},
}};

bool AddKind(Record* record, const Kind& kind) {
    if (!AddRecordId(record, kind.recordIdName) || !AddTimestamps(*record, kind.stamps) ||
        !AddProperty(*record, "SensorType", kind.sensorType, kind.sensorTypeName)) {
        return false;
    }
    const CopiedText message = kind.message(*record);
    if (kind.failure != nullptr && message.result != kOk) {
        WriteLog(kWarning, kind.failure);
        return true;
    }
    return AddProperty(*record, "Message", message.text);
}

bool AddUnknown(Record* record) {
    const IPMISELEntry& entry = record->entry;
    if (!AddRecordId(record) || !AddTimestamps(*record, Stamps::kNoTime)) return false;
    // Compatibility: the ID is given with its bytes swapped
    // (SelExport.UnknownTypeIsLoggedWithItsIdSwapped).
    if (LogEnabled(kTrace)) {
        WriteLog(kTrace, Format("This SEL entry (ID %d) has an unknown type (0x%x).\n",
                                entry.Byte(1) * 256 + entry.Byte(0), entry.RecordType()));
    }
    const CopiedText raw = Copied(*record, &IPMISELEntry::CopyRawDataString);
    if (raw.result != kOk) WriteLog(kTrace, "No Raw Data obtained.");
    const std::string message = "Unknown log type. Raw Data:\n" + raw.text;
    // The one property that a record can do without.
    if (NQORTQR20::fdrAddProperty(record->exported.output, "Message", message.c_str()).code ==
        kStatusFailed) {
        WriteLog(kTrace, "No Raw Data Message.");
    }
    return true;
}

bool AddBody(Record* record) {
    const std::uint8_t type = record->entry.RecordType();
    if (type == ipmi::kSystemEventType) return AddSystemEvent(record);
    const auto* const kind = std::find_if(kKinds.begin(), kKinds.end(),
                                          [&](const Kind& k) { return k.recordType == type; });
    return kind != kKinds.end() ? AddKind(record, *kind) : AddUnknown(record);
}

// ---- The end of every record --------------------------------------------------------------------

std::string AuxLogText(const Record& record) {
    IPMIExtendedSELDataEntry extended;
    if (GetExtendedSELEntry(record.number, record.exported.extendedEntries, &extended) != kOk) {
        return "No Extended Data";
    }
    return "Type: " + extended.GetTypeString() + " Sev: " + extended.GetSeverityString() +
           " Class: " + extended.GetClassString() + " Sub-Class: " + extended.GetSubclassString() +
           " Instance: " + extended.GetFRUInstanceString() + " GUID: " + extended.GetGUIDString() +
           " Extended Data: " + extended.GetExtendedDataString();
}

void FillArray(const ValueArray& array,
               const std::array<unsigned char, ipmi::kSelRecordSize>& bytes) {
    const bool traced = LogEnabled(kTrace);
    WriteLog(kTrace, "Raw Hex Data values:");
    for (const unsigned char byte : bytes) {
        if (traced) WriteLog(kTrace, std::to_string(byte));
        if (NQORTQR20::fdrArrayAddUint8(array.get(), byte).code == kStatusFailed) {
            WriteLog(kWarning, "Failed to add uint8 to array.");
        }
        if (traced) WriteLog(kTrace, "Exporting array element.");
    }
}

/// Adds RawData and closes the instance. False when no value array could be had.
bool Finish(const Record& record) {
    ValueArray array;
    if (array.get() == nullptr) {
        WriteLog(kWarning, "Could not create Array for Raw Hex Data.");
        return false;
    }
    std::array<unsigned char, ipmi::kSelRecordSize> bytes{};
    if (record.entry.CopyRawDataHex(record.exported.context, bytes.data(), bytes.size()) != kOk) {
        WriteLog(kTrace, "No Raw Hex Data obtained.");
        return true;
    }
    FillArray(array, bytes);
    fdriIOHandle* const output = record.exported.output;
    if (NQORTQR20::fdrAddArrayProperty(output, "RawData", array.get()).code == kStatusFailed) {
        WriteLog(kWarning, "Failed to add array property.");
    } else {
        NQORTQR20::fdrAddInstance(output);
    }
    WriteLog(kTrace, "Deleting valArray.");
    array.Delete();
    return true;
}

/// False when the whole export has to end. A record that is abandoned is never added.
bool ExportRecord(const Export& exported, const IPMISELEntry& entry, int index) {
    Record record{exported, entry, index};
    if (!AddHead(record) || !AddBody(&record) ||
        !AddProperty(record, "AuxLog", AuxLogText(record)) ||
        !AddProperty(record, "SourceNode", std::to_string(exported.node + 1),
                     "QORSG_IPMILogRecord -- SourceNode")) {
        return true;
    }
    return Finish(record);
}

}  // namespace
}  // namespace ipmisel

unsigned ExportSEL(int node, TCPluginCallbacks* context, fdriIOHandle* output,
                   IPMISELEntry* /*decoder*/, IPMIMapping* mapping, std::FILE* /*traceFile*/,
                   SDRCache* cache, IPMISELEntry* entries, unsigned int count, int recordIdOffset,
                   std::vector<IPMIExtendedSELDataEntry> extendedEntries, SPLibrary* library) {
    using namespace ipmisel;
    TraceScope trace("ExportSEL()", {" function entered.", " function complete.", kTrace});
    const Export exported{node,
                          context,
                          output,
                          mapping,
                          cache,
                          recordIdOffset,
                          &extendedEntries,
                          MeasureClock(context, library),
                          IndexSensors(cache)};
    for (unsigned i = 0; i < count; ++i) {
        if (!ExportRecord(exported, entries[i], static_cast<int>(i))) return trace.Fail();
    }
    return kOk;
}
