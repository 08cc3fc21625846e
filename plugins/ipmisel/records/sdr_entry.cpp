#include "plugins/ipmisel/records/sdr_entry.h"

#include <algorithm>
#include <cstring>
#include <optional>
#include <string>
#include <string_view>

#include "base/bytes.h"
#include "base/text.h"
#include "ipmi/sel_info.h"
#include "plugins/ipmisel/log.h"
#include "plugins/ipmisel/records/sdr_text.h"
#include "plugins/ipmisel/texts/entity_names.h"
#include "plugins/ipmisel/texts/numbered_texts.h"

using namespace ipmisel;
using NQORTQR20::TCPluginCallbacks;

namespace {

constexpr unsigned kSdrVersion = ipmi::kSelVersion;
constexpr std::size_t kIdLength = 16;
constexpr std::size_t kEntityNameCapacity = 128;

constexpr int kEmptyText = 1;
constexpr int kWrongVersion = 3;

// Numbers of the texts. Each starts with the completion code and the next record ID.
constexpr std::size_t kInfoNumbers = 15;
constexpr std::size_t kHeaderNumbers = 13;
constexpr std::size_t kUnitsNumbers = 13;
constexpr std::size_t kStringHead = 4;

/// The numbers of one text, always `count` of them: those that it lacks are zero.
struct Numbers {
    std::vector<unsigned> values;
    bool any;

    Numbers(std::string_view text, std::size_t count)
        : values(ScanHexRow(text, count).value_or(std::vector<unsigned>{})), any(!values.empty()) {
        values.resize(count);
    }
    std::uint8_t operator[](std::size_t index) const {
        return static_cast<std::uint8_t>(values[index]);
    }
};

std::string_view View(const unsigned char* text, std::size_t capacity) {
    return BoundedView(reinterpret_cast<const char*>(text), capacity);
}

constexpr bool IsAllowed(char c) {
    return c == ' ' || c == '.' || (c >= '0' && c <= '9') || (c >= 'A' && c <= 'Z') ||
           (c >= 'a' && c <= 'z');
}

/// Fields of the header, record bytes 2 to 9, whatever the version.
bool StoreHeader(const Numbers& numbers, IPMISDREntry* entry) {
    entry->sdrVersion = numbers[5];
    entry->recordType = numbers[6];
    entry->recordLength = numbers[7];
    entry->sensorNumber = numbers[10];  // 8 and 9: owner ID and LUN
    entry->entityId = numbers[11];
    entry->entityInstance = numbers[12];
    return numbers.any;
}

/// Fields of record bytes 20 to 29. The signs of M, B and the exponents are applied where a reading
/// is converted (IPMI 2.0, 36.3).
void StoreUnits(const Numbers& numbers, IPMISDREntry* entry) {
    const auto tenBits = [&](std::size_t index) {
        return static_cast<std::uint16_t>(numbers[index] + (numbers[index + 1] & 0xC0) * 4);
    };
    entry->sensorUnits1 = numbers[3];
    entry->baseUnit = numbers[4];
    entry->modifierUnit = numbers[5];
    entry->linearization = numbers[6];
    entry->m = tenBits(7);
    entry->b = tenBits(9);
    entry->rExponent = static_cast<signed char>(numbers[12] >> 4);
    entry->bExponent = static_cast<signed char>(numbers[12] & 0x0F);
}

std::string EntityName(TCPluginCallbacks* context, std::uint8_t entityId) {
    if (entityId > kLastNumberedEntity) return std::string(HeldEntityName(entityId));
    return FetchText(context, kEntityTextBase + entityId, kEntityNameCapacity);
}

}  // namespace

namespace ipmisel {

std::string SdrFieldsText(const IPMISDREntry& entry) {
    return Format("%x %x %x %x %x %x %x %x %x %x %x %x %s\n", entry.recordIdLs, entry.recordIdMs,
                  entry.sdrVersion, entry.recordType, entry.recordLength, entry.sensorNumber,
                  entry.entityId, entry.entityInstance, entry.sensorUnits1, entry.baseUnit,
                  entry.modifierUnit, entry.idStringTypeLength, entry.IDString.get());
}

}  // namespace ipmisel

IPMISDREntry::IPMISDREntry() : IDString(std::make_unique<char[]>(kIdLength + 1)) {}
IPMISDREntry::~IPMISDREntry() = default;

int IPMISDREntry::ScanSDRInfoDataFile(TCPluginCallbacks* /*context*/, std::FILE* /*unused*/,
                                      const unsigned char* infoText) {
    const Numbers numbers(View(infoText, kSdrInfoTextLength), kInfoNumbers);
    if (!numbers.any) {
        WriteLog(kError, "Error in reading data file for SDRInfostring");
        return kFailed;
    }
    const unsigned version = numbers.values[1];
    if (version != kSdrVersion) {
        WriteLog(kWarning, Format("This SDR Version (0x%x) does not match the current IPMI "
                                  "Version (0x%x).\n",
                                  version, kSdrVersion));
        return kFailed;
    }
    return kOk;
}

int IPMISDREntry::ScanSDRDataFile(TCPluginCallbacks* /*context*/, std::FILE* /*unused*/,
                                  const unsigned char* headerText, const unsigned char* unitsText,
                                  const unsigned char* stringText) {
    std::fill_n(IDString.get(), 4, '\0');
    const Numbers header(View(headerText, sizeof s_SDR_entry::SDRHeaderData), kHeaderNumbers);
    if (!StoreHeader(header, this)) {
        WriteLog(kError, "Error in reading data file for SDRHeaderData.");
        return kEmptyText;
    }
    if (sdrVersion != kSdrVersion) {
        WriteLog(kWarning, Format("This SDR entry (ID %d, vers 0x%x) does not match the current "
                                  "IPMI Version (0x%x).\n",
                                  header[4] * 256 + header[3], int{sdrVersion}, kSdrVersion));
        return kWrongVersion;
    }
    recordIdLs = header[3];
    recordIdMs = header[4];

    // Compact records hold other fields there; whoever converts a reading looks at the record type.
    const std::string_view units = View(unitsText, sizeof s_SDR_entry::SDRUnitsData);
    const Numbers unitNumbers(units, kUnitsNumbers);
    StoreUnits(unitNumbers, this);
    if (LogEnabled(kInfo)) {
        WriteLog(kInfo, std::string("SDRUnitsData=").append(units) +
                            Format(". M = %d. B = %d. Rexp = %d. Bexp = %d. Lin = %d", int{m},
                                   int{b}, int{rExponent}, int{bExponent}, int{linearization}));
    }
    if (!unitNumbers.any) {
        WriteLog(kError, "Error reading data file for SDRUnitsData.");
        return kEmptyText;
    }

    const std::string_view string = View(stringText, sizeof s_SDR_entry::SDRStringData);
    const Numbers stringNumbers(string, kStringHead + kIdLength);
    if (!stringNumbers.any) {
        WriteLog(kError, "Error reading data file for SDRIDStringData.");
        return kEmptyText;
    }
    idStringTypeLength = stringNumbers[3];
    char id[kIdLength];
    for (std::size_t i = 0; i < kIdLength; ++i) {
        id[i] = static_cast<char>(stringNumbers[kStringHead + i]);
    }
    if (LogEnabled(kTrace)) {
        WriteLog(kTrace, std::string("tempIDString=").append(BoundedView(id, kIdLength)));
        WriteLog(kTrace, "strlen(SDRstring) = " + std::to_string(string.size()));
    }
    CopyOut(IDString.get(), kIdLength, BoundedView(id, kIdLength));
    RemoveInvalidChars();
    if (LogEnabled(kInfo)) {
        WriteLog(kInfo, std::string("this->IDString=") + IDString.get());
        WriteLog(kInfo, "Results of ScanSDRDataFile: " + SdrFieldsText(*this));
    }
    return kOk;
}

int IPMISDREntry::ScanSDRDataFile_Test(TCPluginCallbacks* /*context*/, std::FILE* file) {
    char line[128] = {};
    if (file != nullptr && std::fgets(line, sizeof line, file) == nullptr) line[0] = '\0';
    if (!StoreHeader(Numbers(line, kHeaderNumbers), this)) {
        WriteLog(kError, "Error in reading data file for SDRHeaderData.");
        return kEmptyText;
    }
    return kOk;
}

int IPMISDREntry::GetSensorSDREntities(const IPMISDREntry* entry, TCPluginCallbacks* context,
                                       IPMIMapping* /*mapping*/, char* idString, char* entityName,
                                       char* entityInstance, unsigned idLen, unsigned entityLen,
                                       unsigned instanceLen) {
    const TraceScope trace("IPMISDREntry::GetSensorSDREntities()", TraceScope::kFunction);
    if (entry == nullptr) {
        CopyOut(entityName, entityLen, "");
        CopyOut(entityInstance, instanceLen, "");
        CopyOut(idString, idLen, "");
        return kOk;
    }
    CopyOut(entityName, entityLen, EntityName(context, entry->entityId));
    CopyOut(entityInstance, instanceLen, std::to_string(entry->entityInstance));
    CopyOut(idString, idLen, entry->IDString.get());
    return kOk;
}

char* IPMISDREntry::RemoveInvalidChars() {
    char* const text = IDString.get();
    *std::find_if_not(text, text + kIdLength, IsAllowed) = '\0';
    return text;
}
