#pragma once

#include <array>
#include <compare>
#include <cstdint>
#include <map>
#include <optional>
#include <span>
#include <unordered_map>
#include <utility>
#include <vector>

#include "ipmi/command.h"
#include "ipmi/sel_info.h"

namespace ipmisim {

using Bytes = std::vector<std::uint8_t>;

/// What the call-th use of a command does instead of the normal thing.
struct Fault {
    std::uint8_t netFn = 0;
    std::uint8_t command = 0;
    std::optional<unsigned> call;  ///< from 1; empty means every use
    enum class Kind { kNoResponse, kCompletionCode, kTruncate, kData } kind = Kind::kNoResponse;
    std::uint8_t completionCode = 0;
    unsigned truncate = 0;  ///< response data bytes that are left of the normal answer
    Bytes data;             ///< response data after completion code 0
};

/// A fixed answer to a command that the simulation does not know.
struct FixedReply {
    std::uint8_t netFn = 0;
    std::uint8_t command = 0;
    Bytes request;   ///< leading request data that must match
    Bytes response;  ///< response data after completion code 0
};

/// How a sensor is found: owner and LUN as a sensor record has them, and its number.
struct SensorAddress {
    std::uint8_t owner = ipmi::kBmcAddress;
    std::uint8_t lun = 0;
    std::uint8_t number = 0;
    auto operator<=>(const SensorAddress&) const = default;
};

/// What a sensor answers.
struct SimulatedSensor {
    std::optional<std::uint8_t> reading;  ///< 0 without, where there are states
    std::optional<Bytes> states;          ///< what follows the reading, flags first
    std::optional<Bytes> thresholds;      ///< answer of Get Sensor Thresholds
    std::map<std::uint8_t, std::array<std::uint8_t, 7>> factors;  ///< by the reading asked about
};

/// What one BMC holds and how it misbehaves.
struct BmcDescription {
    std::optional<Bytes> deviceId;  ///< Get Device ID data; completion code 0xC1 without
    unsigned latencyMicroseconds = 0;
    std::uint8_t selVersion = ipmi::kSelVersion;
    std::vector<std::array<std::uint8_t, 16>> selEntries;
    std::optional<std::uint32_t> selTime;       ///< seconds since 1970; the machine's clock without
    std::optional<std::uint16_t> selFreeBytes;  ///< what is left to 65,535 records without
    std::optional<std::uint32_t> selLastAddition;  ///< the newest time in the log without
    std::optional<std::uint32_t> selLastErase;     ///< unspecified without
    bool selOverflow = false;
    std::optional<std::int16_t> utcOffsetMinutes;  ///< 0xC1 without
    std::uint8_t sdrVersion = ipmi::kSelVersion;
    std::vector<Bytes> sdrRecords;
    bool wholeSdr = true;  ///< answers whole records; else 0xCA for more than 22 bytes
    std::map<SensorAddress, SimulatedSensor> sensors;
    // Answers as they stand after the completion code; 0xC1 without.
    std::optional<std::array<std::uint8_t, 16>> guid;
    std::optional<Bytes> chassisStatus;
    std::optional<Bytes> selfTest;
    std::optional<std::vector<std::array<std::uint8_t, 21>>> pefFilters;
    std::map<std::uint8_t, Bytes> fru;
    std::optional<unsigned> auxLogCount;
    std::vector<FixedReply> replies;
    std::vector<Fault> faults;
};

/// A BMC that answers as the IPMI 2.0 standard has it, but for its faults.
class SimulatedBmc {
public:
    explicit SimulatedBmc(BmcDescription description);
    /// Completion code and response data; empty for no response at all.
    std::optional<Bytes> Execute(std::uint8_t netFn, std::uint8_t lun, std::uint8_t command,
                                 std::span<const std::uint8_t> data);

private:
    /// A request in hand: where to, and its data.
    struct Request {
        std::uint8_t lun;
        std::span<const std::uint8_t> data;
    };
    struct Known;
    static const Known kKnown[];

    Bytes Normal(std::uint8_t netFn, std::uint8_t lun, std::uint8_t command,
                 std::span<const std::uint8_t> data);
    std::optional<Bytes> GetChassisStatus(const Request& request);
    std::optional<Bytes> GetPefParameter(const Request& request);
    std::optional<Bytes> GetSensorReadingFactors(const Request& request);
    std::optional<Bytes> GetSensorThresholds(const Request& request);
    std::optional<Bytes> GetSensorReading(const Request& request);
    std::optional<Bytes> GetDeviceId(const Request& request);
    std::optional<Bytes> GetSelfTestResults(const Request& request);
    std::optional<Bytes> GetSystemGuid(const Request& request);
    std::optional<Bytes> GetFruInventoryAreaInfo(const Request& request);
    std::optional<Bytes> ReadFruData(const Request& request);
    std::optional<Bytes> GetSdrRepositoryInfo(const Request& request);
    std::optional<Bytes> ReserveSdrRepository(const Request& request);
    std::optional<Bytes> GetSdr(const Request& request);
    std::optional<Bytes> GetSelInfo(const Request& request);
    std::optional<Bytes> GetSelEntry(const Request& request);
    std::optional<Bytes> GetSelTime(const Request& request);
    std::optional<Bytes> GetAuxLogStatus(const Request& request);
    std::optional<Bytes> GetSelTimeUtcOffset(const Request& request);
    /// The BMC's own sensor of a number at the request's LUN; null where there is none. Sensors of
    /// other owners are described only so that nobody takes them for the BMC's.
    const SimulatedSensor* OwnSensor(const Request& request) const;

    /// Where a record stands, by its ID; of several with one ID the first.
    using RecordIndex = std::unordered_map<std::uint16_t, std::size_t>;

    BmcDescription description_;
    RecordIndex selIndex_;
    RecordIndex sdrIndex_;
    std::map<std::pair<std::uint8_t, std::uint8_t>, unsigned> calls_;
    std::uint16_t sdrReservation_ = 0;  ///< 0 before the first
};

}  // namespace ipmisim
