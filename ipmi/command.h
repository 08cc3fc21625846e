#pragma once

#include <algorithm>
#include <compare>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string_view>
#include <vector>

// Requests to a management controller as values, and the completion codes of the answers. Numbers
// of IPMI 2.0, tables 5-1 (network functions), G-1 (commands) and 5-2 (completion codes).

namespace ipmi {

/// Network functions of requests; the answer's is one greater.
constexpr std::uint8_t kNetFnChassis = 0x00;
constexpr std::uint8_t kNetFnBridge = 0x02;
constexpr std::uint8_t kNetFnSensorEvent = 0x04;
constexpr std::uint8_t kNetFnApplication = 0x06;
constexpr std::uint8_t kNetFnFirmware = 0x08;
constexpr std::uint8_t kNetFnStorage = 0x0A;
constexpr std::uint8_t kNetFnTransport = 0x0C;
/// From here on network functions are for groups and vendors to define.
constexpr std::uint8_t kFirstOemNetFn = 0x2E;

/// The controller itself: its slave address on the IPMB and the LUN of its standard commands.
constexpr std::uint8_t kBmcAddress = 0x20;
constexpr std::uint8_t kBmcLun = 0;

/// Record IDs of the event log and the sensor repository (31.5, 33.12): what asks for the first
/// record, and what stands as "next" after the last one.
constexpr std::uint16_t kFirstRecordId = 0x0000;
constexpr std::uint16_t kLastRecordId = 0xFFFF;
/// The count that asks for all of a record from the offset on.
constexpr std::uint8_t kWholeRecord = 0xFF;
/// The reservation that stands where none is needed.
constexpr std::uint16_t kNoReservation = 0x0000;

/// Which command, without its data: what a table of commands is keyed by.
struct CommandCode {
    std::uint8_t netFn = 0;
    std::uint8_t number = 0;
    auto operator<=>(const CommandCode&) const = default;
};

constexpr CommandCode kGetChassisStatus{kNetFnChassis, 0x01};
constexpr CommandCode kGetPefConfigurationParameters{kNetFnSensorEvent, 0x13};
constexpr CommandCode kGetDeviceSdrInfo{kNetFnSensorEvent, 0x20};
constexpr CommandCode kGetSensorReadingFactors{kNetFnSensorEvent, 0x23};
constexpr CommandCode kGetSensorHysteresis{kNetFnSensorEvent, 0x25};
constexpr CommandCode kGetSensorThresholds{kNetFnSensorEvent, 0x27};
constexpr CommandCode kGetSensorEventStatus{kNetFnSensorEvent, 0x2B};
constexpr CommandCode kGetSensorReading{kNetFnSensorEvent, 0x2D};
constexpr CommandCode kGetDeviceId{kNetFnApplication, 0x01};
constexpr CommandCode kGetSelfTestResults{kNetFnApplication, 0x04};
constexpr CommandCode kGetDeviceGuid{kNetFnApplication, 0x08};
constexpr CommandCode kGetMessage{kNetFnApplication, 0x33};
constexpr CommandCode kSendMessage{kNetFnApplication, 0x34};
constexpr CommandCode kGetSystemGuid{kNetFnApplication, 0x37};
constexpr CommandCode kGetChannelAuthenticationCapabilities{kNetFnApplication, 0x38};
constexpr CommandCode kGetSessionChallenge{kNetFnApplication, 0x39};
constexpr CommandCode kActivateSession{kNetFnApplication, 0x3A};
constexpr CommandCode kSetSessionPrivilegeLevel{kNetFnApplication, 0x3B};
constexpr CommandCode kCloseSession{kNetFnApplication, 0x3C};
constexpr CommandCode kGetChannelCipherSuites{kNetFnApplication, 0x54};
constexpr CommandCode kGetFruInventoryAreaInfo{kNetFnStorage, 0x10};
constexpr CommandCode kReadFruData{kNetFnStorage, 0x11};
constexpr CommandCode kGetSdrRepositoryInfo{kNetFnStorage, 0x20};
constexpr CommandCode kReserveSdrRepository{kNetFnStorage, 0x22};
constexpr CommandCode kGetSdr{kNetFnStorage, 0x23};
constexpr CommandCode kGetSelInfo{kNetFnStorage, 0x40};
constexpr CommandCode kGetSelAllocationInfo{kNetFnStorage, 0x41};
constexpr CommandCode kReserveSel{kNetFnStorage, 0x42};
constexpr CommandCode kGetSelEntry{kNetFnStorage, 0x43};
constexpr CommandCode kGetSelTime{kNetFnStorage, 0x48};
constexpr CommandCode kGetAuxiliaryLogStatus{kNetFnStorage, 0x5A};
constexpr CommandCode kGetSelTimeUtcOffset{kNetFnStorage, 0x5C};

/// The command's name in the standard; empty for one that is not listed above.
std::string_view CommandName(CommandCode code);
/// Bytes that an answer without error has at least, the completion code included, to hold what is
/// mandatory (for the information about log and repository: up to the count of the records); 1 for
/// a command whose answer may be empty or is not listed above.
std::size_t LeastAnswer(CommandCode code);
/// Where that count stands, in the data after the completion code (tables 31-2 and 33-3).
inline constexpr std::size_t kRecordCountAt = 1;

/// A request: where to, which command, and its data as they stand on the wire.
struct Command {
    std::uint8_t netFn = 0;
    std::uint8_t lun = kBmcLun;
    std::uint8_t command = 0;
    std::vector<std::uint8_t> data;

    CommandCode code() const { return {netFn, command}; }
    auto operator<=>(const Command&) const = default;
};

Command MakeCommand(CommandCode code, std::vector<std::uint8_t> data = {},
                    std::uint8_t lun = kBmcLun);

Command GetChassisStatus();
Command GetDeviceId();
Command GetSelfTestResults();
Command GetSystemGuid();
Command GetDeviceGuid();

/// Parameter selectors of Get PEF Configuration Parameters, table 30-5.
constexpr std::uint8_t kPefEventFilterCount = 5;
constexpr std::uint8_t kPefEventFilter = 6;
/// `set` is the number of the table's entry, from 1; 0 for a parameter without sets.
Command GetPefConfigurationParameters(std::uint8_t parameter, std::uint8_t set = 0,
                                      std::uint8_t block = 0);

Command GetSelInfo();
Command GetSelAllocationInfo();
/// A reservation is needed for reads with an offset other than 0 only (31.5).
Command GetSelEntry(std::uint16_t recordId, std::uint8_t offset = 0,
                    std::uint8_t count = kWholeRecord, std::uint16_t reservation = kNoReservation);
Command GetSelTime();
Command GetSelTimeUtcOffset();

Command GetSdrRepositoryInfo();
Command ReserveSdrRepository();
/// A reservation is needed for reads with an offset other than 0 only (33.12).
Command GetSdr(std::uint16_t recordId, std::uint8_t offset = 0, std::uint8_t count = kWholeRecord,
               std::uint16_t reservation = kNoReservation);

/// What Get SEL Entry and Get SDR ask for.
struct RecordRead {
    std::uint16_t reservation = kNoReservation;
    std::uint16_t recordId = kFirstRecordId;
    std::uint8_t offset = 0;
    std::uint8_t count = 0;

    /// From the data of the request; empty when there are more or fewer than it has.
    static std::optional<RecordRead> Parse(std::span<const std::uint8_t> data);
    bool IsOfFirst() const { return recordId == kFirstRecordId; }
    bool IsOfWhole() const { return offset == 0 && count == kWholeRecord; }
};
/// Where the record stands in the answer to them: behind completion code and next record ID.
constexpr std::size_t kRecordAt = 3;
/// What such an answer, from the completion code on, has of the record.
inline std::span<const std::uint8_t> RecordIn(std::span<const std::uint8_t> answer) {
    return answer.subspan(std::min(kRecordAt, answer.size()));
}

/// Sensors stand at the LUN that their record gives.
Command GetSensorReading(std::uint8_t number, std::uint8_t lun = kBmcLun);
Command GetSensorThresholds(std::uint8_t number, std::uint8_t lun = kBmcLun);
Command GetSensorHysteresis(std::uint8_t number, std::uint8_t lun = kBmcLun);
Command GetSensorEventStatus(std::uint8_t number, std::uint8_t lun = kBmcLun);
/// The factors that hold at one raw reading of a sensor that is not linear.
Command GetSensorReadingFactors(std::uint8_t number, std::uint8_t reading,
                                std::uint8_t lun = kBmcLun);

Command GetFruInventoryAreaInfo(std::uint8_t device);
/// Offset and count in bytes or words, as Get FRU Inventory Area Info tells.
Command ReadFruData(std::uint8_t device, std::uint16_t offset, std::uint8_t count);

/// Completion codes, table 5-2.
constexpr std::uint8_t kCompleted = 0x00;
constexpr std::uint8_t kParameterNotSupported = 0x80;  ///< of the PEF parameters (30.4)
constexpr std::uint8_t kSelEraseInProgress = 0x81;     ///< of the commands of the log (31.2)
constexpr std::uint8_t kFruDeviceBusy = 0x81;          ///< of the FRU commands (34.2)
constexpr std::uint8_t kNodeBusy = 0xC0;
constexpr std::uint8_t kInvalidCommand = 0xC1;
constexpr std::uint8_t kInvalidForLun = 0xC2;
constexpr std::uint8_t kCommandTimeout = 0xC3;
constexpr std::uint8_t kOutOfSpace = 0xC4;
constexpr std::uint8_t kReservationCanceled = 0xC5;
constexpr std::uint8_t kRequestTruncated = 0xC6;
constexpr std::uint8_t kRequestLengthInvalid = 0xC7;
constexpr std::uint8_t kRequestLengthExceeded = 0xC8;
constexpr std::uint8_t kParameterOutOfRange = 0xC9;
constexpr std::uint8_t kCannotReturnBytes = 0xCA;
constexpr std::uint8_t kNotPresent = 0xCB;
constexpr std::uint8_t kInvalidDataField = 0xCC;
constexpr std::uint8_t kIllegalForTarget = 0xCD;
constexpr std::uint8_t kNoResponseProvided = 0xCE;
constexpr std::uint8_t kDuplicateRequest = 0xCF;
constexpr std::uint8_t kSdrRepositoryInUpdate = 0xD0;
constexpr std::uint8_t kFirmwareInUpdate = 0xD1;
constexpr std::uint8_t kInitializing = 0xD2;
constexpr std::uint8_t kDestinationUnavailable = 0xD3;
constexpr std::uint8_t kInsufficientPrivilege = 0xD4;
constexpr std::uint8_t kNotSupportedInState = 0xD5;
constexpr std::uint8_t kSubfunctionDisabled = 0xD6;
constexpr std::uint8_t kUnspecifiedError = 0xFF;

/// Whether a read was refused for its length: the controller may well give less at a time.
constexpr bool RefusesSoManyBytes(std::uint8_t code) {
    return code == kCannotReturnBytes || code == kRequestLengthInvalid ||
           code == kRequestLengthExceeded;
}

/// A completion code in words, without a final full stop: those of the command where it has codes
/// of its own (80h to BEh), else the generic ones; "device-specific code" and "command-specific
/// code" for the ranges that neither gives a meaning, "reserved code" for the rest.
std::string_view CompletionCodeText(CommandCode command, std::uint8_t code);

}  // namespace ipmi
