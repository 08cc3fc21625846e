#include "ipmi/event_data.h"

#include <array>
#include <cstddef>
#include <span>
#include <string_view>

#include "base/hex.h"
#include "ipmi/event_offsets.h"
#include "ipmi/event_types.h"
#include "ipmi/sensor_types.h"

namespace ipmi {

namespace {

constexpr std::uint8_t kUnspecifiedByte = 0xFF;
constexpr std::uint8_t kUnspecifiedNibble = 0x0F;

using Words = std::span<const std::string_view>;

// Sensor type 08h offset 6, event data 3.
constexpr std::array<std::string_view, 5> kSupplyConfigurationErrors{
    "vendor mismatch", "revision mismatch", "processor missing", "power rating mismatch",
    "voltage rating mismatch"};

// Sensor type 0Fh offset 0, event data 2.
constexpr std::array<std::string_view, 14> kFirmwareErrors{
    "",
    "no memory installed",
    "no usable memory, all installed memory failed",
    "unrecoverable hard disk failure",
    "unrecoverable system board failure",
    "unrecoverable diskette subsystem failure",
    "unrecoverable hard disk controller failure",
    "unrecoverable keyboard failure",
    "removable boot medium not found",
    "unrecoverable video controller failure",
    "no video device detected",
    "firmware ROM corrupted",
    "processor voltages do not match",
    "processor speeds do not match",
};

// Sensor type 0Fh offsets 1 and 2, event data 2.
constexpr std::array<std::string_view, 26> kFirmwareStages{
    "",
    "memory initialization",
    "hard disk initialization",
    "secondary processor initialization",
    "user authentication",
    "system setup started by the user",
    "USB resource configuration",
    "PCI resource configuration",
    "option ROM initialization",
    "video initialization",
    "cache initialization",
    "SMBus initialization",
    "keyboard controller initialization",
    "management controller initialization",
    "docking station attachment",
    "enabling the docking station",
    "docking station ejection",
    "disabling the docking station",
    "calling the OS wake-up vector",
    "starting the OS boot process",
    "baseboard initialization",
    "code 15h",  // reserved
    "floppy initialization",
    "keyboard test",
    "pointing device test",
    "primary processor initialization",
};
static_assert(kFirmwareStages[0x13] == "starting the OS boot process");

// Sensor type 12h offset 3, event data 2: bits 7..4 and bits 3..0.
constexpr std::array<std::string_view, 6> kAuxiliaryLogActions{
    "entry added",
    "entry added that has no standard IPMI form",
    "entry added along with event log entries",
    "cleared",
    "disabled",
    "enabled"};
constexpr std::array<std::string_view, 3> kAuxiliaryLogs{"machine check log", "OEM log 1",
                                                         "OEM log 2"};

// Sensor type 12h offset 4, event data 2, from bit 0 up.
constexpr std::array<std::string_view, 6> kPefActions{
    "alert", "power off", "reset", "power cycle", "OEM action", "diagnostic interrupt (NMI)"};

// Sensor type 1Dh offset 7, event data 2 bits 3..0: Get System Restart Cause, table 28-11.
constexpr std::array<std::string_view, 12> kRestartCauses{
    "",
    "by a Chassis Control command",
    "by the reset button",
    "by the power button",
    "by the watchdog",
    "by an OEM cause",
    "power restored, policy: always on",
    "power restored, policy: previous state",
    "reset by PEF",
    "power cycle by PEF",
    "soft reset",
    "power-up by the real time clock",
};

// Sensor type 21h, event data 2 bits 6..0.
constexpr std::array<std::string_view, 13> kSlotTypes{
    "PCI slot",
    "drive array slot",
    "external peripheral connector",
    "docking connector",
    "internal expansion slot",
    "slot of the sensor's entity",
    "AdvancedTCA slot",
    "memory slot",
    "fan slot",
    "PCI Express slot",
    "parallel SCSI connector",
    "SATA/SAS connector",
    "USB connector",
};

// Sensor type 23h, event data 2: bits 7..4 and bits 3..0.
constexpr std::array<std::string_view, 4> kWatchdogInterrupts{"no interrupt", "SMI", "NMI",
                                                              "messaging interrupt"};
constexpr std::array<std::string_view, 6> kTimerUses{"",        "BIOS FRB2", "BIOS/POST",
                                                     "OS load", "SMS/OS",    "OEM"};

// Sensor type 2Ah, event data 3 bits 5..4.
constexpr std::array<std::string_view, 4> kDeactivationCauses{
    "", "by a Close Session command", "by a timeout", "by a configuration change"};

// Sensor type 2Bh, event data 2.
constexpr std::array<std::string_view, 24> kVersionChanges{
    "",
    "management controller device ID",
    "management controller firmware revision",
    "management controller device revision",
    "management controller manufacturer ID",
    "management controller IPMI version",
    "management controller auxiliary firmware ID",
    "management controller boot block",
    "other management controller firmware",
    "system firmware (EFI/BIOS)",
    "SMBIOS",
    "operating system",
    "OS loader",
    "service or diagnostic partition",
    "management software agent",
    "management software application",
    "management software middleware",
    "programmable hardware (FPGA or the like)",
    "FRU module",
    "FRU component",
    "FRU replaced by an equivalent version",
    "FRU replaced by a newer version",
    "FRU replaced by an older version",
    "FRU hardware configuration",
};

// Sensor type 2Ch, event data 2 bits 7..4.
constexpr std::array<std::string_view, 11> kFruStateCauses{
    "normal state change",
    "commanded by external software",
    "operator changed the handle latch",
    "operator pressed the hot swap button",
    "FRU's own action",
    "communication lost",
    "communication lost by a local failure",
    "unexpected extraction",
    "operator intervention or update",
    "IPMB address could not be computed",
    "unexpected deactivation",
};

std::string_view At(Words words, std::size_t index) {
    return index < words.size() ? words[index] : std::string_view();
}

constexpr std::uint8_t High(std::uint8_t byte) { return byte >> 4; }
constexpr std::uint8_t Low(std::uint8_t byte) { return byte & 0x0F; }

constexpr std::uint8_t kSelClock = 0;
constexpr std::uint8_t kSdrClock = 1;
constexpr std::uint8_t kAfterSetting = 0x80;

// Event data 2 of sensor type 12h, offset 5. Many controllers give it without saying so in event
// data 1; it is believed where it is one of the values that the standard has.
std::optional<std::uint8_t> ClockByte(const SelRecord& record) {
    const std::uint8_t byte = record.data[1];
    const DataUse use = UseOfData2(record);
    const bool defined = (byte & ~kAfterSetting) <= kSdrClock;
    if (use == DataUse::kExtension ? byte != kUnspecifiedByte
                                   : use == DataUse::kUnused && defined) {
        return byte;
    }
    return std::nullopt;
}

// One decoding: the record's bytes, and where what they mean goes. Each rule takes the byte that it
// explains, so that a byte which is used and which no rule takes is the vendor's.
class Decoding {
public:
    Decoding(const SelRecord& record, EventData* out) : record_(record), out_(*out) {}

    void Run() {
        const EventClass eventClass = ClassOfEventType(record_.eventType);
        if (eventClass == EventClass::kThreshold) {
            if (UseOfData2(record_) == DataUse::kTrigger) out_.reading = Data2();
            if (UseOfData3(record_) == DataUse::kTrigger) out_.threshold = Data3();
        } else if (UseOfData2(record_) == DataUse::kTrigger) {
            SeverityAndPreviousState();
        }
        if (eventClass == EventClass::kSensorSpecific) SensorSpecific();
        Vendors();
    }

private:
    std::uint8_t Data2() {
        taken2_ = true;
        return record_.data[1];
    }
    std::uint8_t Data3() {
        taken3_ = true;
        return record_.data[2];
    }
    // FFh is unspecified, whatever event data 1 says of the byte (table 29-6).
    bool Extends2() const {
        return UseOfData2(record_) == DataUse::kExtension && record_.data[1] != kUnspecifiedByte;
    }
    bool Extends3() const {
        return UseOfData3(record_) == DataUse::kExtension && record_.data[2] != kUnspecifiedByte;
    }
    void Say(std::string_view words) {
        if (!words.empty()) out_.words.emplace_back(words);
    }
    void Say(std::string_view label, std::string_view words) {
        if (!words.empty()) out_.words.push_back(std::string(label) + std::string(words));
    }
    static std::string CodeText(std::uint8_t code) { return "code " + ipmisel::HexByte(code); }
    // A code that the standard reserves is still told, as a number.
    void SayCode(Words words, std::uint8_t code) {
        Say(code < words.size() ? std::string(words[code]) : CodeText(code));
    }
    void SayNumber(std::string_view label, unsigned number) {
        out_.words.push_back(std::string(label) + std::to_string(number));
    }

    // An offset without words is told as a number.
    void SayOffset(std::string_view label, std::uint8_t eventType, std::uint8_t sensorType,
                   std::uint8_t offset) {
        const std::string_view words = EventOffsetText(eventType, sensorType, offset);
        Say(label, words.empty() ? "offset " + std::to_string(offset) : std::string(words));
    }

    // Bits 7..4 are an offset of type 07h, bits 3..0 one of the event's own type; Fh is none.
    void SeverityAndPreviousState() {
        const std::uint8_t byte = Data2();
        if (High(byte) != kUnspecifiedNibble) {
            SayOffset("severity by the sensor: ", kSeverityEvents, record_.sensorType, High(byte));
        }
        if (Low(byte) != kUnspecifiedNibble) {
            SayOffset("previously: ", record_.eventType, record_.sensorType, Low(byte));
        }
    }

    void MemoryModule(std::uint8_t number) {
        out_.memoryModule = number;
        SayNumber("memory module ", number);
    }

    void LoggingDisabled() {
        switch (record_.offset()) {
            case 0:
                if (Extends2()) MemoryModule(Data2());
                break;
            case 1:
                if (Extends2()) DisabledEventType();
                break;
            case 5:
                if (Extends3()) {
                    const std::uint8_t percent = Data3();
                    Say(percent <= 100 ? std::to_string(percent) + "% full" : CodeText(percent));
                }
                break;
            case 6:
                if (Extends2()) DisabledMachineCheck();
                break;
            default:
                break;
        }
    }

    void DisabledEventType() {
        const std::uint8_t type = Data2();
        const std::string_view name = EventTypeName(type & 0x7F);
        Say("event type ", name.empty() ? ipmisel::HexByte(type) : std::string(name));
        if (!Extends3()) return;
        const std::uint8_t which = Data3();
        if ((which & 0x20) != 0) {
            Say("all its events");
        } else {
            SayNumber("offset ", Low(which));
            Say((which & 0x10) != 0 ? "assertion events" : "deassertion events");
        }
    }

    void DisabledMachineCheck() {
        const std::uint8_t number = Data2();
        const bool vendorNumber = Extends3() && (Data3() & 0x80) != 0;
        if (vendorNumber) {
            SayNumber("processor number ", number);
        } else {
            out_.processorInstance = number;
            SayNumber("processor ", number);
        }
    }

    void SystemEvent() {
        switch (record_.offset()) {
            case 3: {
                if (!Extends2()) break;
                const std::uint8_t byte = Data2();
                SayCode(kAuxiliaryLogs, Low(byte));
                SayCode(kAuxiliaryLogActions, High(byte));
                break;
            }
            case 4: {
                if (!Extends2()) break;
                const std::uint8_t actions = Data2();
                for (std::size_t bit = 0; bit < kPefActions.size(); ++bit) {
                    if ((actions >> bit & 1) != 0) Say(kPefActions[bit]);
                }
                if (const std::uint8_t reserved = actions & 0xC0; reserved != 0) {
                    Say(CodeText(reserved));
                }
                break;
            }
            case 5:
                ClockSetting();
                break;
            default:
                break;
        }
    }

    void ClockSetting() {
        const std::optional<std::uint8_t> byte = ClockByte(record_);
        if (!byte) return;
        taken2_ = true;
        if (Low(*byte) == kSelClock) Say("event log clock");
        if (Low(*byte) == kSdrClock) Say("sensor repository clock");
        Say((*byte & kAfterSetting) != 0 ? "time after the change" : "time before the change");
    }

    void Slot() {
        if (Extends2()) {
            out_.slotType = Data2() & 0x7F;
        }
        if (Extends3()) {
            out_.slotNumber = Data3();
        }
        std::string words(out_.slotType ? At(kSlotTypes, *out_.slotType) : std::string_view());
        if (out_.slotType && words.empty()) Say("slot type " + ipmisel::HexByte(*out_.slotType));
        if (out_.slotNumber) {
            const std::string number = ' ' + std::to_string(*out_.slotNumber);
            if (words.empty()) words = "slot";
            words = out_.slotType == kEntitySlot ? "slot" + number + " of the sensor's entity"
                                                 : words + number;
        }
        Say(words);
    }

    void ManagementHealth() {
        constexpr std::uint8_t kSensorFailed = 4;
        constexpr std::uint8_t kSensorAccess = 0;
        constexpr std::uint8_t kFruFailed = 5;
        const std::uint8_t offset = record_.offset();
        if ((offset == kSensorFailed || offset == kSensorAccess) && Extends2()) {
            const std::uint8_t number = Data2();
            out_.sensorNumber = number;
            Say("sensor " + ipmisel::HexByte(number));
        }
        if (offset != kFruFailed) return;
        if (!Extends2()) {
            if (Extends3()) Say("FRU device ID or address " + ipmisel::HexByte(Data3()));
            return;
        }
        const std::uint8_t access = Data2();
        const bool logical = (access & 0x80) != 0;
        if (!logical) SayNumber("private bus ", access & 0x07);
        SayNumber("LUN ", access >> 3 & 0x03);
        if (!Extends3()) return;
        const std::uint8_t device = Data3();
        if (!logical) {
            Say("device at address " + ipmisel::HexByte(device & 0xFE));
        } else {
            out_.fruDevice = device;
            SayNumber("FRU device ", device);
        }
    }

    void SessionAudit() {
        constexpr std::uint8_t kDeactivated = 1;
        if (Extends2()) {
            const std::uint8_t user = Data2() & 0x3F;
            if (user != 0) SayNumber("user ID ", user);
        }
        if (Extends3()) {
            const std::uint8_t byte = Data3();
            if (record_.offset() == kDeactivated) Say(At(kDeactivationCauses, byte >> 4 & 0x03));
            SayNumber("channel ", Low(byte));
        }
    }

    void FruState() {
        if (!Extends2()) return;
        const std::uint8_t byte = Data2();
        if (High(byte) == kUnspecifiedNibble) {
            Say("cause unknown");
        } else {
            SayCode(kFruStateCauses, High(byte));
        }
        // The present state stands for a previous one that is not known.
        if (Low(byte) != record_.offset()) {
            SayOffset("previously: ", record_.eventType, record_.sensorType, Low(byte));
        }
    }

    void SensorSpecific() {
        const std::uint8_t offset = record_.offset();
        switch (record_.sensorType) {
            case sensor_type::kPhysicalSecurity:
                if (offset == 4 && Extends2()) SayNumber("network controller ", Data2());
                break;
            case sensor_type::kPowerSupply:
                if (offset == 6 && Extends3()) SayCode(kSupplyConfigurationErrors, Low(Data3()));
                break;
            case sensor_type::kMemory:
                if (Extends3()) MemoryModule(Data3());
                break;
            case sensor_type::kSystemFirmwareProgress:
                if (offset == 0 && Extends2()) SayCode(kFirmwareErrors, Data2());
                if ((offset == 1 || offset == 2) && Extends2()) SayCode(kFirmwareStages, Data2());
                break;
            case sensor_type::kEventLoggingDisabled:
                LoggingDisabled();
                break;
            case sensor_type::kSystemEvent:
                SystemEvent();
                break;
            case sensor_type::kChipSet:
                if (offset != 0) break;
                if (Extends2()) PowerState("requested: ", Data2(), false);
                if (Extends3()) PowerState("state at the request: ", Data3(), true);
                break;
            case sensor_type::kSystemBoot:
                if (offset != 7) break;
                if (Extends2()) SayCode(kRestartCauses, Low(Data2()));
                if (Extends3()) SayNumber("channel ", Low(Data3()));
                break;
            case sensor_type::kSlot:
                Slot();
                break;
            case sensor_type::kWatchdog2:
                if (Extends2()) {
                    const std::uint8_t byte = Data2();
                    if (High(byte) != kUnspecifiedNibble) SayCode(kWatchdogInterrupts, High(byte));
                    if (Low(byte) != kUnspecifiedNibble) SayTimerUse(Low(byte));
                }
                break;
            case sensor_type::kManagementSubsystemHealth:
                ManagementHealth();
                break;
            case sensor_type::kSessionAudit:
                SessionAudit();
                break;
            case sensor_type::kVersionChange:
                if (Extends2()) SayCode(kVersionChanges, Data2());
                break;
            case sensor_type::kFruState:
                FruState();
                break;
            default:
                break;
        }
    }

    // The first thirteen are offsets of the ACPI power state sensor; of the state at the request
    // the one after them is "unknown".
    void PowerState(std::string_view label, std::uint8_t state, bool hasUnknown) {
        constexpr std::uint8_t kLegacyOff = 0x0C;
        if (state <= kLegacyOff) {
            SayOffset(label, kSensorSpecificEvents, sensor_type::kAcpiPowerState, state);
        } else {
            Say(label, hasUnknown && state == kLegacyOff + 1 ? "unknown" : CodeText(state));
        }
    }

    void SayTimerUse(std::uint8_t use) {
        const std::string_view words = At(kTimerUses, use);
        Say("timer use ", words.empty() ? CodeText(use) : std::string(words));
    }

    void Vendors() {
        if (!taken2_ && UseOfData2(record_) != DataUse::kUnused) AddVendorByte(record_.data[1]);
        if (!taken3_ && UseOfData3(record_) != DataUse::kUnused) AddVendorByte(record_.data[2]);
    }
    void AddVendorByte(std::uint8_t byte) {
        if (byte != kUnspecifiedByte) out_.oemBytes.push_back(byte);
    }

    const SelRecord& record_;
    EventData& out_;
    bool taken2_ = false;
    bool taken3_ = false;
};

DataUse UseOf(unsigned bits) { return static_cast<DataUse>(bits & 0x03); }

}  // namespace

DataUse UseOfData2(const SelRecord& record) { return UseOf(record.data[0] >> 6); }
DataUse UseOfData3(const SelRecord& record) { return UseOf(record.data[0] >> 4); }

EventData DecodeEventData(const SelRecord& record) {
    EventData data;
    if (record.kind == RecordKind::kSensorEvent) Decoding(record, &data).Run();
    return data;
}

std::optional<ClockSet> ClockSetOf(const SelRecord& record) {
    constexpr std::uint8_t kClockSet = 5;
    if (record.kind != RecordKind::kSensorEvent || record.eventType != kSensorSpecificEvents ||
        record.sensorType != sensor_type::kSystemEvent || record.offset() != kClockSet) {
        return std::nullopt;
    }
    const std::optional<std::uint8_t> byte = ClockByte(record);
    if (!byte) return ClockSet::kUnspecified;
    if (Low(*byte) == kSdrClock) return std::nullopt;
    return (*byte & kAfterSetting) != 0 ? ClockSet::kSecond : ClockSet::kFirst;
}

}  // namespace ipmi
