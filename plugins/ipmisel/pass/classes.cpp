#include <cstdint>
#include <iterator>

#include "plugins/ipmisel/class_names.h"
#include "plugins/ipmisel/texts/numbered_texts.h"
#include "tqr/classes.h"

namespace {

using enum NQORTQR20::fdrClassMark;
using enum NQORTQR20::fdrPropertyType;
using NQORTQR20::fdrClassInfo;
using NQORTQR20::fdrPropertyInfo;

constexpr fdrPropertyInfo kBmcFirmware[] = {
    {"CreationClassName", kText, "the class"},
    {"Name", kText, "\"BMC\", with the node before it where there are several"},
    {"Manufacturer", kText, "manufacturer ID (IANA enterprise number), decimal"},
    {"VersionString", kText, "\"major.minor\""},
    {"MajorVersion", kText, "major version"},
    {"MinorVersion", kText, "minor version"},
    {"Revision", kText, "auxiliary firmware revision, or the embedded controller's release"},
    {"IdentifyingNumber", kText, "device ID and product ID"},
};

constexpr fdrPropertyInfo kPartFirmware[] = {
    {"CreationClassName", kText, "the class"},
    {"Name", kText, "what the firmware is of, with the node before it where there are several"},
    {"VersionString", kText, "version"},
    {"IdentifyingNumber", kText, "bus number of a backplane"},
};

constexpr fdrPropertyInfo kFru[] = {
    {"ElementName", kText, "name of the device"},
    {"Vendor", kText, "fourth readable string of the inventory; of a memory module its vendor"},
    {"Name", kText, "fifth readable string of the inventory"},
    {"SerialNumber", kText, "sixth readable string; of a memory module its serial number"},
    {"PartNumber", kText, "seventh readable string; of a memory module its part number"},
    {"Status", kText, "\"NORMAL\", of devices that the machine's family lists"},
    {"FRUNumber", kText, "one blank"},
    {"IdentifyingNumber", kText, "one blank"},
};

constexpr fdrPropertyInfo kLogRecord[] = {
    {"CreationClassName", kText, "\"QORSG_IPMILog\""},
    {"LogCreationClassName", kText, "\"QORSG_IPMILog\""},
    {"LogName", kText, "\"IPMILogEntry\""},
    {"RecordID", kText, "record ID, decimal"},
    {"MessageTimestamp", kText, "time of the event as CIM date-time"},
    {"CreationTimeStamp", kText, "the same; not of boot and shutdown records"},
    {"Source", kText, "who generated the event"},
    {"SensorType", kText, "sensor type, or the kind of another record"},
    {"EventType", kText, "direction and class"},
    {"Entity", kText, "the part"},
    {"EntityInstance", kText, "its number"},
    {"SensorInformation", kText, "name of the sensor"},
    {"Message", kText, "what happened"},
    {"AuxLog", kText, "the auxiliary log's entry of the record"},
    {"SourceNode", kText, "node, from 1"},
    {"RawData", kByteList, "the 16 bytes of the record"},
};

constexpr fdrPropertyInfo kAuxDebugRecord[] = {
    {"MessageTimestamp", kText, "time of the event as CIM date-time"},
    {"CreationClassName", kText, "the class"},
    {"LogCreationClassName", kText, "the class"},
    {"LogName", kText, "the class"},
    {"RecordID", kText, "place in the auxiliary log, from 0"},
    {"RawData", kByteList, "the bytes of the entry"},
};

constexpr fdrPropertyInfo kMessageLog[] = {
    {"CreationClassName", kText, "the class"},
    {"Name", kText, "\"MessageLogEntry\""},
};

constexpr fdrPropertyInfo kRecordInLog[] = {
    {"MessageLog", kReference, "the log"},
    {"LogRecord", kReference, "the record"},
};

template <std::uint32_t N>
constexpr fdrClassInfo Class(const char* name, const char* description, std::uint32_t marks,
                             const fdrPropertyInfo (&properties)[N],
                             const char* nodeProperty = nullptr, const char* exporter = nullptr) {
    return {name, description, marks, nodeProperty, exporter, properties, N};
}

constexpr fdrClassInfo kClasses[] = {
    Class(ipmisel::kBmcFirmwareClass, "firmware of the management controller",
          kByDefault | kInbandOnly, kBmcFirmware),
    Class(ipmisel::kCpldFirmwareClass, "CPLD versions", kByDefault | kInbandOnly, kPartFirmware),
    Class(ipmisel::kFpgaFirmwareClass, "FPGA revisions", kByDefault | kInbandOnly, kPartFirmware),
    Class(ipmisel::kBackplaneFirmwareClass, "backplane controller firmware",
          kByDefault | kInbandOnly, kPartFirmware),
    Class(ipmisel::kFruClass, "inventory of field-replaceable units",
          kByDefault | kReadsSensors | kWrittenAtEnd | kInbandOnly, kFru),
    Class(ipmisel::kLogRecordClass, "the system event log, decoded",
          kByDefault | kPerLogRecord | kReadsLog | kReadsSensors, kLogRecord, "SourceNode"),
    Class(ipmisel::kAuxDebugClass, "debug entries of the auxiliary log",
          kByDefault | kReadsLog | kReadsSensors, kAuxDebugRecord),
    Class(ipmisel::kMessageLogClass, "the event log as a whole (only when named with --class)", 0,
          kMessageLog, nullptr, "ExportMessageLog"),
    Class(ipmisel::kRecordInLogClass,
          "log records' places in the log (only when named with --class)", 0, kRecordInLog, nullptr,
          "ExportReferences"),
};

constexpr NQORTQR20::fdrNeededFile kNeededFiles[] = {
    {"ipmisel.INI", ipmisel::kMaxTextFile},
};

}  // namespace

const NQORTQR20::fdrClassTable fdrPluginClasses{
    .size = sizeof(NQORTQR20::fdrClassTable),
    .classInfoSize = sizeof(fdrClassInfo),
    .classes = kClasses,
    .classCount = std::size(kClasses),
    .neededFiles = kNeededFiles,
    .neededFileCount = std::size(kNeededFiles),
};
