#include "plugins/ipmisel/texts/event_offsets.h"

#include <algorithm>
#include <array>
#include <initializer_list>
#include <optional>
#include <span>
#include <string_view>

#include "base/text.h"
#include "plugins/ipmisel/log.h"
#include "plugins/ipmisel/texts/machine_families.h"
#include "plugins/ipmisel/texts/numbered_texts.h"
#include "plugins/ipmisel/texts/oem_detail.h"
#include "plugins/ipmisel/texts/sensor_units.h"
#include "tqr/datetime.h"

namespace ipmisel {
namespace {

using std::string_view;
using Context = NQORTQR20::TCPluginCallbacks*;

constexpr string_view kIndent = "               ";
constexpr std::size_t kReadingCapacity = 128;

// ---- Vocabulary ---------------------------------------------------------------------------------

/// Offsets 0 to lastOffset of a reading type or sensor type are texts firstText and up.
struct TextRange {
    std::uint8_t type;
    std::uint8_t lastOffset;
    int firstText;
};

constexpr TextRange kThresholdTexts{0x01, 11, 100};

// Generic reading types, IPMI 2.0 table 42-2.
constexpr std::array<TextRange, 11> kGenericTexts{{
    {0x02, 2, 120},
    {0x03, 1, 130},
    {0x04, 1, 140},
    {0x05, 1, 150},
    {0x06, 1, 160},
    {0x07, 8, 170},
    {0x08, 1, 180},
    {0x09, 1, 190},
    {0x0A, 8, 200},
    {0x0B, 7, 210},
    {0x0C, 3, 220},
}};

// Sensor-specific offsets, IPMI 2.0 table 42-3; 0xC1 is an OEM type.
constexpr std::array<TextRange, 25> kSensorTexts{{
    {0x05, 6, 230}, {0x06, 5, 240}, {0x07, 9, 250},  {0x08, 5, 260}, {0x09, 7, 270},
    {0x0C, 5, 280}, {0x0F, 2, 290}, {0x10, 3, 346},  {0x11, 7, 350}, {0x12, 5, 373},
    {0x13, 9, 360}, {0x14, 2, 370}, {0x1D, 4, 380},  {0x1E, 4, 390}, {0x1F, 6, 400},
    {0x20, 1, 410}, {0x21, 8, 420}, {0x22, 14, 430}, {0x23, 8, 450}, {0x24, 3, 460},
    {0x25, 2, 477}, {0x27, 1, 480}, {0x28, 3, 490},  {0x29, 3, 500}, {0xC1, 9, 856},
}};

/// Texts of offsets firstOffset and up that are held here, as they stand.
struct BuiltInTexts {
    std::uint8_t type;
    std::uint8_t firstOffset;
    std::span<const string_view> texts;
};

constexpr std::array<string_view, 1> kProcessorTexts{"Processor Automatically Throttled. "};
constexpr std::array<string_view, 5> kMemoryTexts{"Presence detected.", "Configuration error.",
                                                  "Spare.", "Memory Automatically Throttled.",
                                                  "Critical Overtemperature."};
constexpr std::array<string_view, 9> kDriveTexts{"Drive Presence",
                                                 "Drive Fault",
                                                 "Predictive Failure",
                                                 "Hot Spare",
                                                 "Consistency Check / Parity Check in progress",
                                                 "In Critical Array",
                                                 "In Failed Array",
                                                 "Rebuild/Remap in progress",
                                                 "Rebuild/Remap Aborted (was not completed "
                                                 "normally)"};
constexpr std::array<string_view, 2> kLoggingTexts{"SEL Full. ", "SEL Almost Full. "};
// Compatibility: the cable text stands at a microcontroller's offset as well
// (SensorOffset.BuiltInTexts).
constexpr std::array<string_view, 1> kMicrocontrollerTexts{"Cable is connected"};
constexpr std::array<string_view, 2> kCableTexts{
    "Cable/Interconnect is connected",
    "Configuration Error - Incorrect cable connected / Incorrect interconnection"};
constexpr std::array<string_view, 2> kSessionTexts{"Session Activated", "Session Deactivated"};
constexpr std::array<string_view, 8> kVersionTexts{
    "Hardware change detected with associated Entity",
    "Firmware or software change detected with associated Entity",
    "Hardware incompatibility detected with associated Entity",
    "Firmware or software incompatibility detected with associated Entity",
    "Entity is of an invalid or unsupported hardware version",
    "Entity contains an invalid or unsupported firmware or software version",
    "Hardware Change detected with associated Entity was successful",
    "Software or Firmware Change detected with associated Entity was successful"};
constexpr std::array<string_view, 8> kFruStateTexts{"FRU Not Installed",
                                                    "FRU Inactive",
                                                    "FRU Activation Requested",
                                                    "FRU Activation In Progress",
                                                    "FRU Active",
                                                    "FRU Deactivation Requested",
                                                    "FRU Deactivation In Progress",
                                                    "FRU Communication Lost"};
constexpr std::array<string_view, 7> kOemCpuTexts{
    "Vtt Enable Check", "CPU Cache Size", "Old VRM",  "Cache VID mismatch",
    "CPU Mismatch",     "CPU Speed",      "CPU Cores"};

constexpr std::array<BuiltInTexts, 10> kBuiltInTexts{{
    {0x07, 10, kProcessorTexts},
    {0x0C, 6, kMemoryTexts},
    {0x0D, 0, kDriveTexts},
    {0x10, 4, kLoggingTexts},
    {0x16, 0, kMicrocontrollerTexts},
    {0x1B, 0, kCableTexts},
    {0x2A, 0, kSessionTexts},
    {0x2B, 0, kVersionTexts},
    {0x2C, 0, kFruStateTexts},
    {0xD2, 0, kOemCpuTexts},
}};
constexpr std::uint8_t kSelFullnessType = 0xD0;  // one text whatever the offset

/// A list of further texts, by a code from 0 to lastCode.
struct CodeTexts {
    int lastCode;
    int firstText;
};
constexpr CodeTexts kFirmwareErrors{13, 300};
// Compatibility: the stage is cut to four bits, so stages 0x10 and up read as 0x00 and up
// (SensorOffset.SecondTexts).
constexpr CodeTexts kFirmwareStages{15, 320};
constexpr CodeTexts kAuxiliaryLogTypes{2, 385};
constexpr CodeTexts kAuxiliaryLogActions{5, 412};
constexpr CodeTexts kSlotTypes{12, 464};
constexpr CodeTexts kWatchdogInterrupts{3, 510};
constexpr CodeTexts kWatchdogUses{5, 515};
constexpr CodeTexts kReadingTypes{12, 650};

constexpr int kMemoryModule = 286;        // format of one number
constexpr int kSeverityLabel = 525;       // lead-in
constexpr int kPreviousStateLabel = 526;  // lead-in
constexpr int kOemCode = 527;
constexpr int kOemDetailLabel = 531;  // lead-in
constexpr int kNotGiven = 0x0F;       // of severity and previous state
constexpr std::uint8_t kThresholdReadings = 0x01;
constexpr std::uint8_t kSeverityReadings = 0x07;
constexpr std::uint8_t kSensorSpecificReadings = 0x6F;

/// PEF actions, event data 2 of a system event, from the highest bit down. Both reserved bits
/// share a row, so that their word stands once.
struct PefAction {
    std::uint8_t bits;
    string_view text;
};
constexpr std::array<PefAction, 7> kPefActions{{
    {0xC0, "Reserved  "},
    {0x20, "Diagnostic Interrupt (NMI).  "},
    {0x10, "OEM action.  "},
    {0x08, "power cycle.  "},
    {0x04, "reset.  "},
    {0x02, "power off.  "},
    {0x01, "Alert.  "},
}};

struct MemorySlot {
    std::uint8_t code;
    string_view name;
};
constexpr std::array<MemorySlot, 8> kMemorySlots{{
    {0, "DIMM_00."},
    {1, "DIMM_01."},
    {4, "DIMM_10."},
    {5, "DIMM_11."},
    {8, "DIMM_20."},
    {9, "DIMM_21."},
    {12, "DIMM_30."},
    {13, "DIMM_31."},
}};

// ---- Pieces -------------------------------------------------------------------------------------

std::string Sentence(std::string text) { return text.empty() ? text : std::move(text) + ". "; }

std::string OffsetSentence(Context context, const TextRange& range, int offset) {
    if (offset > range.lastOffset) return {};
    return Sentence(FetchText(context, range.firstText + offset));
}

std::string FetchCode(Context context, const CodeTexts& list, int code) {
    return code > list.lastCode ? std::string() : FetchText(context, list.firstText + code);
}

std::string CodeSentence(Context context, const CodeTexts& list, int code) {
    return Sentence(FetchCode(context, list, code));
}

/// A numbered text that is a format for integers.
std::string FormattedSentence(Context context, int number, std::initializer_list<int> values) {
    return Sentence(FormatIntegers(FetchText(context, number), values.begin(), values.size()));
}

std::string MemorySlotText(std::uint8_t code) {
    const auto* const slot =
        std::find_if(kMemorySlots.begin(), kMemorySlots.end(),
                     [code](const MemorySlot& row) { return row.code == code; });
    const string_view name = slot == kMemorySlots.end() ? string_view() : slot->name;
    return " " + std::string(name) + "\n";
}

std::string ExtensionText(std::uint8_t data3) {
    return "\n" + std::string(kIndent) +
           Format("Sensor-specific event extension code %02x. \n", data3);
}

/// Event data 3, for uses that all classes of events share.
std::string SharedData3Text(const EventData& event) {
    switch (event.Use3()) {
        case DataUse::kOem:
            return MemorySlotText(event.data3);
        case DataUse::kSensorSpecific:
            return ExtensionText(event.data3);
        default:
            return {};
    }
}

const TextRange* FindRange(std::span<const TextRange> ranges, int type) {
    const auto found = std::find_if(ranges.begin(), ranges.end(),
                                    [type](const TextRange& row) { return row.type == type; });
    return found == ranges.end() ? nullptr : &*found;
}

/// Severities and states are event data 1 of an event of their own: an offset, and nothing else.
EventData OffsetOnly(int offset) { return {static_cast<std::uint8_t>(offset), 0, 0}; }

// ---- Sensor-specific events ---------------------------------------------------------------------

std::string HeldOffsetText(std::uint8_t sensorType, int offset) {
    if (sensorType == kSelFullnessType) return "SEL Fullness";
    for (const BuiltInTexts& row : kBuiltInTexts) {
        const int index = offset - row.firstOffset;
        if (row.type == sensorType && index >= 0 && index < static_cast<int>(row.texts.size())) {
            return std::string(row.texts[static_cast<std::size_t>(index)]);
        }
    }
    return {};
}

std::string FirmwareProgressDetail(Context context, const EventData& event) {
    if (event.Use2() != DataUse::kSensorSpecific) return {};
    if (event.Offset() == 0) {
        return event.Low2() <= kFirmwareErrors.lastCode
                   ? CodeSentence(context, kFirmwareErrors, event.Low2())
                   : "Reserved";
    }
    if (event.Offset() <= 2) return CodeSentence(context, kFirmwareStages, event.Low2());
    return {};
}

/// Which event type's logging is disabled; event data 1 is not asked whether data 2 and 3 are used.
std::string LoggingDisabledDetail(Context context, const EventData& event) {
    if (event.Offset() != 1) return {};
    const std::uint8_t readingType = event.data2;
    std::string text(kIndent);
    text += (event.data3 & 0x10) != 0 ? "Assertion event. " : "Deassertion event. ";
    if ((event.data3 & 0x20) != 0) {
        text += "Logging has been disabled for all events of " +
                CodeSentence(context, kReadingTypes, readingType);
    }
    if (readingType == kSensorSpecificReadings) {
        text += "Sensor-specific Type. ";
    } else if (readingType == kThresholdReadings) {
        text += "Threshold Type. ";
    } else if (readingType > kThresholdReadings) {
        const std::string name = FetchCode(context, kReadingTypes, readingType);
        if (!name.empty()) text += name + " - ";
    }
    return text;
}

std::string SystemEventDetail(Context context, const EventData& event) {
    std::string text;
    switch (event.Offset()) {
        case 3:
            text = CodeSentence(context, kAuxiliaryLogTypes, event.Low2());
            return text + CodeSentence(context, kAuxiliaryLogActions, event.High2());
        case 4:
            for (const PefAction& action : kPefActions) {
                if ((event.data2 & action.bits) != 0) text += action.text;
            }
            return text;
        case 5:
            text = (event.data2 & 0x80) != 0 ? "event is second of pair. "
                                             : "event is first of pair. ";
            return text + (event.Low2() == 1 ? "SDR Timestamp Clock updated."
                                             : "SEL Timestamp Clock updated.");
        default:
            return {};
    }
}

std::string SlotDetail(Context context, const EventData& event) {
    std::string text;
    if (event.Use2() == DataUse::kSensorSpecific) {
        text += CodeSentence(context, kSlotTypes, event.Low2());
    }
    if (event.Use3() == DataUse::kSensorSpecific) text += Format("#%d ", event.data3);
    return text;
}

std::string WatchdogDetail(Context context, const EventData& event) {
    if (event.Offset() != 8 || event.Use2() != DataUse::kSensorSpecific) return {};
    std::string text = CodeSentence(context, kWatchdogInterrupts, event.High2());
    return text + CodeSentence(context, kWatchdogUses, event.Low2());
}

/// What event data 2 and 3 add for the sensor types that define them.
std::string SensorTypeDetail(Context context, std::uint8_t sensorType, const EventData& event) {
    switch (sensorType) {
        case 0x0C:
            return event.Use3() == DataUse::kSensorSpecific
                       ? FormattedSentence(context, kMemoryModule, {event.data3})
                       : std::string();
        case 0x0F:
            return FirmwareProgressDetail(context, event);
        case 0x10:
            return LoggingDisabledDetail(context, event);
        case 0x12:
            return SystemEventDetail(context, event);
        case 0x21:
            return SlotDetail(context, event);
        case 0x23:
            return WatchdogDetail(context, event);
        default:
            return {};
    }
}

std::string SensorOffsetName(Context context, std::uint8_t sensorType, const EventData& event) {
    const TextRange* const range = FindRange(kSensorTexts, sensorType);
    if (range == nullptr || event.Offset() > range->lastOffset) {
        return HeldOffsetText(sensorType, event.Offset());
    }
    if (sensorType == 0x10 && event.Offset() == 1) {
        return FormattedSentence(context, range->firstText + 1, {event.data2, event.data3 & 0x0F});
    }
    return OffsetSentence(context, *range, event.Offset());
}

}  // namespace

// ---- The three classes --------------------------------------------------------------------------

std::string ThresholdOffsetText(Context context, const EventData& event,
                                const s_SDR_Mod_Units& units) {
    TraceScope trace("IPMIMapping::GetThresholdOffset()", TraceScope::kFunction);
    const auto reading = [&](std::uint8_t raw) {
        return SensorUnitsText(context, units, raw).substr(0, kReadingCapacity - 1);
    };
    std::string text = OffsetSentence(context, kThresholdTexts, event.Offset());
    if (event.Use3() == DataUse::kStandard) {
        text += "\n" + std::string(kIndent) + "Trigger threshold value: " + reading(event.data3) +
                ". \n";
    } else {
        text += SharedData3Text(event);
    }
    text += kIndent;
    switch (event.Use2()) {
        case DataUse::kNone:
            break;
        case DataUse::kStandard:
            text += "Trigger reading: " + reading(event.data2) + ".";
            break;
        case DataUse::kOem:
            text += Format("OEM code %02x.", event.data2);
            break;
        case DataUse::kSensorSpecific:
            text += Format("Sensor-specific event extension code %02x.", event.data2);
            break;
    }
    return text;
}

std::string GenericOffsetText(Context context, const EventData& event, int readingType,
                              std::uint8_t sensorType, std::uint8_t sensorNumber) {
    TraceScope trace("IPMIMapping::GetGenericOffset()", TraceScope::kFunction);
    std::string text;
    if (const TextRange* const range = FindRange(kGenericTexts, readingType); range != nullptr) {
        text = OffsetSentence(context, *range, event.Offset());
    }
    if (event.Use2() == DataUse::kStandard) {
        if (event.High2() != kNotGiven) {
            text += FetchText(context, kSeverityLabel);
            text += GenericOffsetText(context, OffsetOnly(event.High2()), kSeverityReadings,
                                      sensorType, sensorNumber);
        }
        if (event.Low2() != kNotGiven) {
            text += FetchText(context, kPreviousStateLabel);
            text += GenericOffsetText(context, OffsetOnly(event.Low2()), readingType, sensorType,
                                      sensorNumber);
        }
    } else if (event.Use2() == DataUse::kOem) {
        const MachineFamily* const family =
            FindMachineFamily(NQORTQR20::TOSSpecific::GetMachineTypeFromID());
        if (family == nullptr) return text;
        const std::string detail =
            OemDetailText(family->oemDetails, sensorType, sensorNumber, event);
        if (!detail.empty()) text += FetchText(context, kOemDetailLabel) + detail;
    }
    return text;
}

std::string SensorOffsetText(Context context, std::uint8_t sensorType, const EventData& event,
                             int readingType) {
    TraceScope trace("IPMIMapping::GetSensorOffset()", TraceScope::kFunction);
    std::string text = SensorOffsetName(context, sensorType, event);
    text += SensorTypeDetail(context, sensorType, event);
    if (event.Use2() == DataUse::kStandard) {
        // Compatibility: the severity is introduced even when it is not given, other than in
        // generic events (SensorOffset.SeverityAndPreviousState).
        text += FetchText(context, kSeverityLabel);
        text +=
            GenericOffsetText(context, OffsetOnly(event.High2()), kSeverityReadings, sensorType, 0);
        if (event.Low2() != kNotGiven) {
            text += FetchText(context, kPreviousStateLabel);
            text += SensorOffsetText(context, sensorType, OffsetOnly(event.Low2()), readingType);
        }
    } else if (event.Use2() == DataUse::kOem) {
        text += Sentence(FetchText(context, kOemCode));
    }
    return text + SharedData3Text(event);
}

}  // namespace ipmisel
