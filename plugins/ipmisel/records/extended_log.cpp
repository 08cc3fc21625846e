#include "plugins/ipmisel/records/extended_log.h"

#include <algorithm>
#include <span>
#include <string_view>

#include "base/bytes.h"
#include "base/hex.h"
#include "base/text.h"
#include "plugins/ipmisel/log.h"

using namespace ipmisel;

namespace {

constexpr std::string_view kUnknown = "Unknown";

std::string_view TypeText(std::uint8_t type) {
    switch (type) {
        case 0x01:
            return "PROGRESS_CODE";
        case 0x02:
            return "ERROR_CODE";
        case 0x03:
            return "DEBUG_CODE";
        case 0x80:
            return "PLATFORM_P80_CODE";
        default:
            return kUnknown;
    }
}

std::string_view SeverityText(std::uint8_t severity) {
    switch (severity) {
        case 0x40:
            return "QOR_ERROR_INFO";
        case 0x80:
            return "QOR_ERROR_WARNING";
        case 0x90:
        case 0xA0:
            return "QOR_ERROR_FATAL";
        default:
            return kUnknown;
    }
}

// Classes and subclasses of status codes, UEFI Platform Initialization specification, volume 3.
constexpr std::array<std::string_view, 7> kComputing{
    "Undefined", "Host Processor", "Boot Processor", "I/O Processor", "Cache", "Memory", "Chipset"};
constexpr std::array<std::string_view, 13> kPeripheral{
    "Undefined",     "Keyboard",      "Mouse",       "Local Console",   "Remote Console",
    "Serial Port",   "Parallel Port", "Fixed Media", "Removable Media", "Spec Reserved",
    "Spec Reserved", "Spec Reserved", "Network"};
constexpr std::array<std::string_view, 13> kIoBus{"Undefined", "PCI",   "USB",  kUnknown, kUnknown,
                                                  kUnknown,    "LPC",   "SCSI", "ATAPI",  kUnknown,
                                                  kUnknown,    "SMBUS", "I2C"};
constexpr std::array<std::string_view, 19> kSoftware{"Undefined",
                                                     "SEC",
                                                     "PEI Core",
                                                     "PEI Driver",
                                                     "DXE Core",
                                                     "DXE Boot Driver",
                                                     "DXE Runtime Driver",
                                                     "SMM Driver",
                                                     "uEFI Application",
                                                     "OS Loader",
                                                     kUnknown,
                                                     kUnknown,
                                                     "EBC Exception",
                                                     "X86 Exception",
                                                     kUnknown,
                                                     "PEI Service",
                                                     "uEFI Boot Service",
                                                     "uEFI Runtime Service",
                                                     "DXE Service"};
static_assert(kPeripheral[12] == "Network" && kIoBus[11] == "SMBUS" &&
              kSoftware[15] == "PEI Service");

struct CodeClass {
    std::string_view name;
    std::span<const std::string_view> subclasses;
};
constexpr std::array<CodeClass, 4> kClasses{{{"Computing", kComputing},
                                             {"Peripheral", kPeripheral},
                                             {"I/O BUS", kIoBus},
                                             {"Software", kSoftware}}};

/// "0x" and two digits per byte, in stored order.
std::string HexNumber(std::span<const std::uint8_t> bytes) {
    return "0x" + HexText(bytes, HexCase::kUpper);
}

constexpr std::array<std::uint8_t, 3> kSignature{0x4D, 0x4F, 0x00};
constexpr unsigned kExtendedDataAt = 32;
/// The record size counts from byte 10 on: what stands before the extended data.
constexpr unsigned kSizeWithoutData = 22;
constexpr unsigned kMaxExtendedData = sizeof(s_AuxLog_entry) - kExtendedDataAt;

using Bytes = std::span<const std::uint8_t>;

/// As much of the extended data as the record size says and the entry holds.
Bytes ExtendedData(Bytes entry, unsigned recordSize) {
    const unsigned length = recordSize > kSizeWithoutData ? recordSize - kSizeWithoutData : 0;
    return entry.subspan(kExtendedDataAt, std::min(length, kMaxExtendedData));
}

std::string DataTrace(unsigned recordSize, Bytes data) {
    std::string line = "recordsize = " + std::to_string(recordSize);
    unsigned listed = 0;
    for (const std::uint8_t byte : data) {
        line += Format(" t = %02X", byte);
        if (++listed % 10 == 0) line += '\n';
    }
    return line + "\n x = " + std::to_string(listed);
}

}  // namespace

void IPMIExtendedSELDataEntry::SetType(unsigned char type) {
    type_ = type;
    typeText_ = TypeText(type);
}

void IPMIExtendedSELDataEntry::SetSeverity(unsigned char severity) {
    severity_ = severity;
    severityText_ = SeverityText(severity);
}

void IPMIExtendedSELDataEntry::SetOperation(const unsigned char* operation) {
    std::copy_n(operation, operation_.size(), operation_.begin());
    operationText_ = HexNumber(operation_);
}

void IPMIExtendedSELDataEntry::SetSubclass(unsigned char subclass) { subclass_ = subclass; }

void IPMIExtendedSELDataEntry::SetClass(unsigned char classCode) {
    class_ = classCode;
    if (classCode >= kClasses.size()) {
        // Compatibility: the subclass text stays that of the class before
        // (ExtendedLog.UnknownClassKeepsTheSubclassText).
        classText_ = kUnknown;
        return;
    }
    const CodeClass& known = kClasses[classCode];
    classText_ = known.name;
    subclassText_ = subclass_ < known.subclasses.size() ? known.subclasses[subclass_] : kUnknown;
}

void IPMIExtendedSELDataEntry::SetFRUInstance(const unsigned char* instance) {
    std::copy_n(instance, fruInstance_.size(), fruInstance_.begin());
    fruInstanceText_ = HexNumber(fruInstance_);
}

void IPMIExtendedSELDataEntry::SetGUID(const unsigned char* guid) {
    std::copy_n(guid, guid_.size(), guid_.begin());
    guidText_ = HexNumber(guid_);
}

void IPMIExtendedSELDataEntry::SetExtendedData(std::string text) {
    extendedData_ = std::move(text);
}

void IPMIExtendedSELDataEntry::SetSELRecordId(unsigned char low, unsigned char high) {
    selRecordId_ = {low, high};
}

std::vector<IPMIExtendedSELDataEntry> ParseExtendedSELData(const s_AuxLog_entry* entries,
                                                           unsigned int count) {
    WriteLog(kInfo, "Entering ParseExtendedSELData.");
    std::vector<IPMIExtendedSELDataEntry> parsed;
    IPMIExtendedSELDataEntry working;
    for (const s_AuxLog_entry& raw : std::span(entries, count)) {
        const Bytes bytes(raw.bytes);
        if (!std::equal(kSignature.begin(), kSignature.end(), bytes.begin())) continue;
        const unsigned recordSize = bytes[3] | unsigned{bytes[4]} << 8;
        working.SetSELRecordId(bytes[5], bytes[6]);
        working.SetType(bytes[10]);
        working.SetSeverity(bytes[13]);
        working.SetOperation(&bytes[14]);
        working.SetSubclass(bytes[16]);
        working.SetClass(bytes[17]);
        working.SetFRUInstance(&bytes[18]);
        working.SetGUID(&bytes[22]);
        const Bytes data = ExtendedData(bytes, recordSize);
        const std::string text = DumpBytes(data, Digits::kUpperHex);
        if (LogEnabled(kInfo)) {
            WriteLog(kInfo, DataTrace(recordSize, data));
            WriteLog(kInfo, text);
        }
        working.SetExtendedData(text);
        parsed.push_back(working);
    }
    WriteLog(kInfo, "Leaving ParseExtendedSELData.");
    return parsed;
}

int GetExtendedSELEntry(int recordId, std::vector<IPMIExtendedSELDataEntry>* entries,
                        IPMIExtendedSELDataEntry* entry) {
    const int wanted = recordId & 0xFFFF;
    const auto found = std::find_if(entries->begin(), entries->end(), [&](const auto& held) {
        return held.GetSELRecordId() == wanted;
    });
    if (found == entries->end()) return kFailed;
    *entry = std::move(*found);
    entries->erase(found);
    return kOk;
}
