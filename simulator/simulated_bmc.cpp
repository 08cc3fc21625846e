#include "simulator/simulated_bmc.h"

#include <algorithm>
#include <chrono>
#include <ctime>
#include <thread>

namespace ipmisim {
namespace {

constexpr std::uint8_t kNetFnApp = 0x06;
constexpr std::uint8_t kNetFnStorage = 0x0A;

// Completion codes, IPMI 2.0 table 5-2.
constexpr std::uint8_t kSuccess = 0x00;
constexpr std::uint8_t kInvalidCommand = 0xC1;
constexpr std::uint8_t kReservationCancelled = 0xC5;
constexpr std::uint8_t kRequestLengthInvalid = 0xC7;
constexpr std::uint8_t kParameterOutOfRange = 0xC9;
constexpr std::uint8_t kNotPresent = 0xCB;

constexpr std::uint16_t kFirstRecord = 0x0000;
constexpr std::uint16_t kLastRecord = 0xFFFF;     // and, as the next record ID, the end
constexpr std::uint8_t kWholeRecord = 0xFF;       // count of a record read
constexpr std::uint32_t kNoTime = 0xFFFFFFFF;     // IPMI 2.0, clause 37: unspecified
constexpr std::uint8_t kFirstUntimedType = 0xE0;  // OEM records without a time stamp

void AppendU16(Bytes* bytes, std::size_t value) {
    bytes->push_back(static_cast<std::uint8_t>(value));
    bytes->push_back(static_cast<std::uint8_t>(value >> 8));
}

void AppendU32(Bytes* bytes, std::uint32_t value) {
    AppendU16(bytes, value & 0xFFFF);
    AppendU16(bytes, value >> 16);
}

std::uint16_t U16At(std::span<const std::uint8_t> bytes, std::size_t at) {
    const auto byte = [&](std::size_t i) { return i < bytes.size() ? bytes[i] : 0; };
    return static_cast<std::uint16_t>(byte(at) | byte(at + 1) << 8);
}

/// A count that the answer has 16 bits for.
std::size_t Count16(std::size_t count) { return std::min<std::size_t>(count, 0xFFFF); }

template <typename Records>
auto IndexById(const Records& records) {
    std::unordered_map<std::uint16_t, std::size_t> index;
    index.reserve(records.size());
    for (std::size_t i = 0; i < records.size(); ++i) index.emplace(U16At(records[i], 0), i);
    return index;
}

/// Answer of Get SEL Entry and Get SDR: next record ID, then the part of the record asked for.
template <typename Records, typename Index>
Bytes ReadRecord(const Records& records, const Index& index, std::uint16_t id, std::uint8_t offset,
                 std::uint8_t count) {
    if (records.empty()) return {kNotPresent};
    std::size_t position = 0;
    if (id == kLastRecord) {
        position = records.size() - 1;
    } else if (id != kFirstRecord) {
        const auto found = index.find(id);
        if (found == index.end()) return {kNotPresent};
        position = found->second;
    }
    const std::span<const std::uint8_t> record(records[position]);
    if (offset >= record.size()) return {kParameterOutOfRange};
    const auto rest = record.subspan(offset);
    const auto part =
        count == kWholeRecord ? rest : rest.first(std::min<std::size_t>(count, rest.size()));
    Bytes answer{kSuccess};
    answer.reserve(3 + part.size());
    AppendU16(&answer,
              position + 1 < records.size() ? U16At(records[position + 1], 0) : kLastRecord);
    answer.insert(answer.end(), part.begin(), part.end());
    return answer;
}

/// Answer of Get SEL Info and Get SDR Repository Info.
Bytes RepositoryInfo(std::uint8_t version, std::size_t count, std::size_t freeBytes,
                     std::uint32_t lastAddition, std::uint8_t operations) {
    Bytes answer{kSuccess, version};
    AppendU16(&answer, Count16(count));
    AppendU16(&answer, Count16(freeBytes));
    AppendU32(&answer, lastAddition);
    AppendU32(&answer, kNoTime);  // last erase
    answer.push_back(operations);
    return answer;
}

}  // namespace

/// A command that the BMC knows. Its operation answers completion code and data; empty where the
/// description leaves the command out.
struct SimulatedBmc::Command {
    std::uint8_t netFn;
    std::uint8_t command;
    std::size_t requestLength;
    std::optional<Bytes> (SimulatedBmc::*answer)(std::span<const std::uint8_t> data);
};

const SimulatedBmc::Command SimulatedBmc::kCommands[] = {
    {kNetFnApp, 0x01, 0, &SimulatedBmc::GetDeviceId},
    {kNetFnStorage, 0x10, 1, &SimulatedBmc::GetFruInventoryAreaInfo},
    {kNetFnStorage, 0x11, 4, &SimulatedBmc::ReadFruData},
    {kNetFnStorage, 0x20, 0, &SimulatedBmc::GetSdrRepositoryInfo},
    {kNetFnStorage, 0x22, 0, &SimulatedBmc::ReserveSdrRepository},
    {kNetFnStorage, 0x23, 6, &SimulatedBmc::GetSdr},
    {kNetFnStorage, 0x40, 0, &SimulatedBmc::GetSelInfo},
    {kNetFnStorage, 0x43, 6, &SimulatedBmc::GetSelEntry},
    {kNetFnStorage, 0x48, 0, &SimulatedBmc::GetSelTime},
    {kNetFnStorage, 0x5A, 1, &SimulatedBmc::GetAuxLogStatus},
};

SimulatedBmc::SimulatedBmc(BmcDescription description)
    : description_(std::move(description)),
      selIndex_(IndexById(description_.selEntries)),
      sdrIndex_(IndexById(description_.sdrRecords)) {}

std::optional<Bytes> SimulatedBmc::Execute(std::uint8_t netFn, std::uint8_t /*lun*/,
                                           std::uint8_t command,
                                           std::span<const std::uint8_t> data) {
    if (description_.latencyMicroseconds != 0) {
        std::this_thread::sleep_for(std::chrono::microseconds(description_.latencyMicroseconds));
    }
    const unsigned call = ++calls_[{netFn, command}];
    const auto fault =
        std::find_if(description_.faults.begin(), description_.faults.end(), [&](const Fault& f) {
            return f.netFn == netFn && f.command == command && f.call.value_or(call) == call;
        });
    if (fault == description_.faults.end()) return Normal(netFn, command, data);
    Bytes answer;
    switch (fault->kind) {
        case Fault::Kind::kNoResponse:
            return std::nullopt;
        case Fault::Kind::kCompletionCode:
            return Bytes{fault->completionCode};
        case Fault::Kind::kTruncate:
            answer = Normal(netFn, command, data);
            if (answer.size() - 1 > fault->truncate) answer.resize(1 + fault->truncate);
            return answer;
        case Fault::Kind::kData:
            answer.push_back(kSuccess);
            answer.insert(answer.end(), fault->data.begin(), fault->data.end());
            return answer;
    }
    return std::nullopt;
}

/// What the BMC answers when nothing is wrong with it; never empty.
Bytes SimulatedBmc::Normal(std::uint8_t netFn, std::uint8_t command,
                           std::span<const std::uint8_t> data) {
    for (const Command& known : kCommands) {
        if (known.netFn != netFn || known.command != command) continue;
        if (data.size() != known.requestLength) return {kRequestLengthInvalid};
        if (auto answer = (this->*known.answer)(data)) return *std::move(answer);
    }
    for (const FixedReply& reply : description_.replies) {
        if (reply.netFn != netFn || reply.command != command) continue;
        if (data.size() < reply.request.size() ||
            !std::equal(reply.request.begin(), reply.request.end(), data.begin())) {
            continue;
        }
        Bytes answer{kSuccess};
        answer.insert(answer.end(), reply.response.begin(), reply.response.end());
        return answer;
    }
    return {kInvalidCommand};
}

std::optional<Bytes> SimulatedBmc::GetDeviceId(std::span<const std::uint8_t>) {
    if (!description_.deviceId) return std::nullopt;
    Bytes answer{kSuccess};
    answer.insert(answer.end(), description_.deviceId->begin(), description_.deviceId->end());
    return answer;
}

std::optional<Bytes> SimulatedBmc::GetFruInventoryAreaInfo(std::span<const std::uint8_t> data) {
    const auto device = description_.fru.find(data[0]);
    if (device == description_.fru.end()) return Bytes{kNotPresent};
    Bytes answer{kSuccess};
    AppendU16(&answer, Count16(device->second.size()));
    answer.push_back(0x00);  // accessed by bytes
    return answer;
}

std::optional<Bytes> SimulatedBmc::ReadFruData(std::span<const std::uint8_t> data) {
    const auto device = description_.fru.find(data[0]);
    if (device == description_.fru.end()) return Bytes{kNotPresent};
    const std::span<const std::uint8_t> inventory(device->second);
    const std::size_t offset = U16At(data, 1);
    if (offset >= inventory.size()) return Bytes{kParameterOutOfRange};
    const auto part =
        inventory.subspan(offset, std::min<std::size_t>(data[3], inventory.size() - offset));
    Bytes answer{kSuccess, static_cast<std::uint8_t>(part.size())};
    answer.insert(answer.end(), part.begin(), part.end());
    return answer;
}

std::optional<Bytes> SimulatedBmc::GetSdrRepositoryInfo(std::span<const std::uint8_t>) {
    std::size_t used = 0;
    for (const Bytes& record : description_.sdrRecords) used += record.size();
    constexpr std::uint8_t kReserveSupported = 0x02;
    return RepositoryInfo(description_.sdrVersion, description_.sdrRecords.size(),
                          0xFFFF - Count16(used), kNoTime, kReserveSupported);
}

std::optional<Bytes> SimulatedBmc::ReserveSdrRepository(std::span<const std::uint8_t>) {
    if (++sdrReservation_ == 0) ++sdrReservation_;
    Bytes answer{kSuccess};
    AppendU16(&answer, sdrReservation_);
    return answer;
}

std::optional<Bytes> SimulatedBmc::GetSdr(std::span<const std::uint8_t> data) {
    const std::uint8_t offset = data[4];
    if (offset != 0 && (sdrReservation_ == 0 || U16At(data, 0) != sdrReservation_)) {
        return Bytes{kReservationCancelled};
    }
    return ReadRecord(description_.sdrRecords, sdrIndex_, U16At(data, 2), offset, data[5]);
}

std::optional<Bytes> SimulatedBmc::GetSelInfo(std::span<const std::uint8_t>) {
    const auto& entries = description_.selEntries;
    const auto newest = std::find_if(entries.rbegin(), entries.rend(), [](const auto& entry) {
        return entry[2] < kFirstUntimedType;
    });
    const std::uint32_t lastAddition =
        newest == entries.rend()
            ? kNoTime
            : U16At(*newest, 3) | static_cast<std::uint32_t>(U16At(*newest, 5)) << 16;
    constexpr std::size_t kEntrySize = 16;
    return RepositoryInfo(description_.selVersion, entries.size(),
                          (0xFFFF - Count16(entries.size())) * kEntrySize, lastAddition, 0x00);
}

std::optional<Bytes> SimulatedBmc::GetSelEntry(std::span<const std::uint8_t> data) {
    return ReadRecord(description_.selEntries, selIndex_, U16At(data, 2), data[4], data[5]);
}

std::optional<Bytes> SimulatedBmc::GetSelTime(std::span<const std::uint8_t>) {
    Bytes answer{kSuccess};
    AppendU32(&answer,
              description_.selTime.value_or(static_cast<std::uint32_t>(std::time(nullptr))));
    return answer;
}

std::optional<Bytes> SimulatedBmc::GetAuxLogStatus(std::span<const std::uint8_t>) {
    if (!description_.auxLogCount) return std::nullopt;
    // The count stands in bytes 16 and 17 of the reply frame, whose byte 8 is the completion code.
    Bytes answer(8, 0x00);
    AppendU16(&answer, Count16(*description_.auxLogCount));
    return answer;
}

}  // namespace ipmisim
