#pragma once

#include <array>
#include <cstdint>
#include <map>
#include <optional>
#include <span>
#include <unordered_map>
#include <utility>
#include <vector>

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

/// What one BMC holds and how it misbehaves.
struct BmcDescription {
    std::optional<Bytes> deviceId;  ///< Get Device ID data; completion code 0xC1 without
    unsigned latencyMicroseconds = 0;
    std::uint8_t selVersion = 0x51;
    std::vector<std::array<std::uint8_t, 16>> selEntries;
    std::optional<std::uint32_t> selTime;  ///< seconds since 1970; the machine's clock without
    std::uint8_t sdrVersion = 0x51;
    std::vector<Bytes> sdrRecords;
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
    struct Command;
    static const Command kCommands[];

    Bytes Normal(std::uint8_t netFn, std::uint8_t command, std::span<const std::uint8_t> data);
    std::optional<Bytes> GetDeviceId(std::span<const std::uint8_t> data);
    std::optional<Bytes> GetFruInventoryAreaInfo(std::span<const std::uint8_t> data);
    std::optional<Bytes> ReadFruData(std::span<const std::uint8_t> data);
    std::optional<Bytes> GetSdrRepositoryInfo(std::span<const std::uint8_t> data);
    std::optional<Bytes> ReserveSdrRepository(std::span<const std::uint8_t> data);
    std::optional<Bytes> GetSdr(std::span<const std::uint8_t> data);
    std::optional<Bytes> GetSelInfo(std::span<const std::uint8_t> data);
    std::optional<Bytes> GetSelEntry(std::span<const std::uint8_t> data);
    std::optional<Bytes> GetSelTime(std::span<const std::uint8_t> data);
    std::optional<Bytes> GetAuxLogStatus(std::span<const std::uint8_t> data);

    /// Where a record stands, by its ID; of several with one ID the first.
    using RecordIndex = std::unordered_map<std::uint16_t, std::size_t>;

    BmcDescription description_;
    RecordIndex selIndex_;
    RecordIndex sdrIndex_;
    std::map<std::pair<std::uint8_t, std::uint8_t>, unsigned> calls_;
    std::uint16_t sdrReservation_ = 0;  ///< 0 before the first
};

}  // namespace ipmisim
