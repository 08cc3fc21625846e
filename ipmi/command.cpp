#include "ipmi/command.h"

#include <algorithm>
#include <array>
#include <utility>

#include "base/bytes.h"

namespace ipmi {

namespace {

std::uint8_t Low(std::uint16_t value) { return static_cast<std::uint8_t>(value & 0xFF); }
std::uint8_t High(std::uint16_t value) { return static_cast<std::uint8_t>(value >> 8); }

struct KnownCommand {
    CommandCode code;
    std::string_view name;
    std::size_t leastAnswer = 1;
};

constexpr std::array kCommands = std::to_array<KnownCommand>({
    {kGetChassisStatus, "Get Chassis Status", 4},
    {kGetPefConfigurationParameters, "Get PEF Configuration Parameters", 3},
    {kGetDeviceSdrInfo, "Get Device SDR Info"},
    {kGetSensorReadingFactors, "Get Sensor Reading Factors", 8},
    {kGetSensorHysteresis, "Get Sensor Hysteresis"},
    {kGetSensorThresholds, "Get Sensor Thresholds", 8},
    {kGetSensorEventStatus, "Get Sensor Event Status"},
    {kGetSensorReading, "Get Sensor Reading", 3},
    {kGetDeviceId, "Get Device ID", 12},
    {kGetSelfTestResults, "Get Self Test Results", 3},
    {kGetDeviceGuid, "Get Device GUID", 17},
    {kGetMessage, "Get Message"},
    {kSendMessage, "Send Message"},
    {kGetSystemGuid, "Get System GUID", 17},
    {kGetChannelAuthenticationCapabilities, "Get Channel Authentication Capabilities"},
    {kGetSessionChallenge, "Get Session Challenge"},
    {kActivateSession, "Activate Session"},
    {kSetSessionPrivilegeLevel, "Set Session Privilege Level"},
    {kCloseSession, "Close Session"},
    {kGetChannelCipherSuites, "Get Channel Cipher Suites"},
    {kGetFruInventoryAreaInfo, "Get FRU Inventory Area Info", 4},
    {kReadFruData, "Read FRU Data", 2},
    {kGetSdrRepositoryInfo, "Get SDR Repository Info", 4},
    {kReserveSdrRepository, "Reserve SDR Repository", 3},
    {kGetSdr, "Get SDR"},
    {kGetSelInfo, "Get SEL Info", 4},
    {kGetSelAllocationInfo, "Get SEL Allocation Info", 10},
    {kReserveSel, "Reserve SEL"},
    {kGetSelEntry, "Get SEL Entry"},
    {kGetSelTime, "Get SEL Time", 5},
    {kGetAuxiliaryLogStatus, "Get Auxiliary Log Status"},
    {kGetSelTimeUtcOffset, "Get SEL Time UTC Offset", 3},
});

// Generic completion codes C0h to D6h, table 5-2.
constexpr std::array<std::string_view, 23> kGenericCodes{
    "node busy",
    "invalid command",
    "command invalid for the LUN",
    "timeout while processing the command",
    "out of space",
    "reservation canceled or invalid",
    "request data truncated",
    "request data length invalid",
    "request data field length limit exceeded",
    "parameter out of range",
    "cannot return the number of bytes asked for",
    "requested sensor, data, or record not present",
    "invalid data field in the request",
    "command illegal for the sensor or record type",
    "command response could not be provided",
    "cannot execute a duplicated request",
    "SDR repository in update mode",
    "device in firmware update mode",
    "BMC initialization in progress",
    "destination unavailable",
    "insufficient privilege level",
    "command not supported in the present state",
    "command subfunction disabled or unavailable",
};
static_assert(kGenericCodes[kNotPresent - kNodeBusy].ends_with("not present"));
static_assert(kGenericCodes.size() == kSubfunctionDisabled - kNodeBusy + 1);

struct SpecificCode {
    CommandCode command;
    std::uint8_t code;
    std::string_view text;
};

// Codes that mean something for one command only, from the clauses of those commands.
constexpr std::array kSpecificCodes = std::to_array<SpecificCode>({
    {kReadFruData, kFruDeviceBusy, "FRU device busy"},
    {kGetSelInfo, kSelEraseInProgress, "SEL erase in progress"},
    {kGetSelEntry, kSelEraseInProgress, "SEL erase in progress"},
    {kReserveSel, kSelEraseInProgress, "SEL erase in progress"},
    {kGetPefConfigurationParameters, kParameterNotSupported, "parameter not supported"},
    {kSendMessage, 0x80, "invalid session handle"},
    {kSendMessage, 0x81, "lost arbitration"},
    {kSendMessage, 0x82, "bus error"},
    {kSendMessage, 0x83, "no acknowledgment from the target"},
    {kGetMessage, 0x80, "message queue empty"},
    {kGetSessionChallenge, 0x81, "invalid user name"},
    {kGetSessionChallenge, 0x82, "null user name not enabled"},
    {kActivateSession, 0x81, "no session slot available"},
    {kActivateSession, 0x82, "no slot available for the user"},
    {kActivateSession, 0x83, "no slot available for the user at this privilege level"},
    {kActivateSession, 0x84, "session sequence number out of range"},
    {kActivateSession, 0x85, "invalid session ID"},
    {kActivateSession, 0x86, "privilege level exceeds the limit of the user or the channel"},
    {kSetSessionPrivilegeLevel, 0x80, "privilege level not available for the user"},
    {kSetSessionPrivilegeLevel, 0x81,
     "privilege level exceeds the limit of the user or the channel"},
    {kSetSessionPrivilegeLevel, 0x82, "cannot disable user-level authentication"},
    {kCloseSession, 0x87, "invalid session ID"},
    {kCloseSession, 0x88, "invalid session handle"},
});

}  // namespace

std::string_view CommandName(CommandCode code) {
    const auto* const found = std::ranges::find(kCommands, code, &KnownCommand::code);
    return found == kCommands.end() ? std::string_view() : found->name;
}

std::size_t LeastAnswer(CommandCode code) {
    const auto* const found = std::ranges::find(kCommands, code, &KnownCommand::code);
    return found == kCommands.end() ? 1 : found->leastAnswer;
}

Command MakeCommand(CommandCode code, std::vector<std::uint8_t> data, std::uint8_t lun) {
    return {.netFn = code.netFn, .lun = lun, .command = code.number, .data = std::move(data)};
}

Command GetChassisStatus() { return MakeCommand(kGetChassisStatus); }
Command GetDeviceId() { return MakeCommand(kGetDeviceId); }
Command GetSelfTestResults() { return MakeCommand(kGetSelfTestResults); }
Command GetSystemGuid() { return MakeCommand(kGetSystemGuid); }
Command GetDeviceGuid() { return MakeCommand(kGetDeviceGuid); }

Command GetPefConfigurationParameters(std::uint8_t parameter, std::uint8_t set,
                                      std::uint8_t block) {
    return MakeCommand(kGetPefConfigurationParameters, {parameter, set, block});
}

Command GetSelInfo() { return MakeCommand(kGetSelInfo); }
Command GetSelAllocationInfo() { return MakeCommand(kGetSelAllocationInfo); }
Command GetSelTime() { return MakeCommand(kGetSelTime); }
Command GetSelTimeUtcOffset() { return MakeCommand(kGetSelTimeUtcOffset); }
Command GetSdrRepositoryInfo() { return MakeCommand(kGetSdrRepositoryInfo); }
Command ReserveSdrRepository() { return MakeCommand(kReserveSdrRepository); }

// Get SEL Entry and Get SDR lay out their data alike.
Command GetSelEntry(std::uint16_t recordId, std::uint8_t offset, std::uint8_t count,
                    std::uint16_t reservation) {
    return MakeCommand(kGetSelEntry, {Low(reservation), High(reservation), Low(recordId),
                                      High(recordId), offset, count});
}

std::optional<RecordRead> RecordRead::Parse(std::span<const std::uint8_t> data) {
    constexpr std::size_t kLength = 6;
    if (data.size() != kLength) return std::nullopt;
    ipmisel::ByteReader in(data);
    RecordRead read;
    read.reservation = in.U16();
    read.recordId = in.U16();
    read.offset = in.U8();
    read.count = in.U8();
    return read;
}

Command GetSdr(std::uint16_t recordId, std::uint8_t offset, std::uint8_t count,
               std::uint16_t reservation) {
    return MakeCommand(kGetSdr, {Low(reservation), High(reservation), Low(recordId), High(recordId),
                                 offset, count});
}

Command GetSensorReading(std::uint8_t number, std::uint8_t lun) {
    return MakeCommand(kGetSensorReading, {number}, lun);
}
Command GetSensorThresholds(std::uint8_t number, std::uint8_t lun) {
    return MakeCommand(kGetSensorThresholds, {number}, lun);
}
Command GetSensorHysteresis(std::uint8_t number, std::uint8_t lun) {
    // The mask is reserved for later use and always FFh (35.7).
    return MakeCommand(kGetSensorHysteresis, {number, 0xFF}, lun);
}
Command GetSensorEventStatus(std::uint8_t number, std::uint8_t lun) {
    return MakeCommand(kGetSensorEventStatus, {number}, lun);
}
Command GetSensorReadingFactors(std::uint8_t number, std::uint8_t reading, std::uint8_t lun) {
    return MakeCommand(kGetSensorReadingFactors, {number, reading}, lun);
}

Command GetFruInventoryAreaInfo(std::uint8_t device) {
    return MakeCommand(kGetFruInventoryAreaInfo, {device});
}
Command ReadFruData(std::uint8_t device, std::uint16_t offset, std::uint8_t count) {
    return MakeCommand(kReadFruData, {device, Low(offset), High(offset), count});
}

std::string_view CompletionCodeText(CommandCode command, std::uint8_t code) {
    if (code == kCompleted) return "completed";
    if (code >= kNodeBusy && code <= kSubfunctionDisabled) return kGenericCodes[code - kNodeBusy];
    if (code == kUnspecifiedError) return "unspecified error";
    for (const SpecificCode& specific : kSpecificCodes) {
        if (specific.command == command && specific.code == code) return specific.text;
    }
    if (code >= 0x01 && code <= 0x7E) return "device-specific code";
    if (code >= 0x80 && code <= 0xBE) return "command-specific code";
    return "reserved code";
}

}  // namespace ipmi
