#include "simulator/simulated_bmc.h"

#include <algorithm>
#include <chrono>
#include <ctime>
#include <thread>

#include "ipmi/command.h"
#include "ipmi/sel_record.h"

namespace ipmisim {
namespace {

using ipmi::kCompleted;
using ipmi::kNotPresent;

constexpr std::uint32_t kNoTime = ipmi::kUnspecifiedTime;

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

/// An answer that stands in the description as a whole.
template <typename Data>
std::optional<Bytes> Completed(const std::optional<Data>& data) {
    if (!data) return std::nullopt;
    Bytes answer{kCompleted};
    answer.insert(answer.end(), data->begin(), data->end());
    return answer;
}

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
    if (id == ipmi::kLastRecordId) {
        position = records.size() - 1;
    } else if (id != ipmi::kFirstRecordId) {
        const auto found = index.find(id);
        if (found == index.end()) return {kNotPresent};
        position = found->second;
    }
    const std::span<const std::uint8_t> record(records[position]);
    if (offset >= record.size()) return {ipmi::kParameterOutOfRange};
    const auto rest = record.subspan(offset);
    const auto part =
        count == ipmi::kWholeRecord ? rest : rest.first(std::min<std::size_t>(count, rest.size()));
    Bytes answer{kCompleted};
    answer.reserve(ipmi::kRecordAt + part.size());
    AppendU16(&answer, position + 1 < records.size() ? U16At(records[position + 1], 0)
                                                     : ipmi::kLastRecordId);
    answer.insert(answer.end(), part.begin(), part.end());
    return answer;
}

/// Answer of Get SEL Info and Get SDR Repository Info.
Bytes RepositoryInfo(std::uint8_t version, std::size_t count, std::size_t freeBytes,
                     std::uint32_t lastAddition, std::uint32_t lastErase, std::uint8_t operations) {
    Bytes answer{kCompleted, version};
    AppendU16(&answer, Count16(count));
    AppendU16(&answer, Count16(freeBytes));
    AppendU32(&answer, lastAddition);
    AppendU32(&answer, lastErase);
    answer.push_back(operations);
    return answer;
}

}  // namespace

/// A command that the BMC knows. Its operation answers completion code and data; empty where the
/// description leaves the command out.
struct SimulatedBmc::Known {
    ipmi::CommandCode code;
    std::size_t requestLength;
    std::optional<Bytes> (SimulatedBmc::*answer)(const Request& request);
};

const SimulatedBmc::Known SimulatedBmc::kKnown[] = {
    {ipmi::kGetChassisStatus, 0, &SimulatedBmc::GetChassisStatus},
    {ipmi::kGetPefConfigurationParameters, 3, &SimulatedBmc::GetPefParameter},
    {ipmi::kGetSensorReadingFactors, 2, &SimulatedBmc::GetSensorReadingFactors},
    {ipmi::kGetSensorThresholds, 1, &SimulatedBmc::GetSensorThresholds},
    {ipmi::kGetSensorReading, 1, &SimulatedBmc::GetSensorReading},
    {ipmi::kGetDeviceId, 0, &SimulatedBmc::GetDeviceId},
    {ipmi::kGetSelfTestResults, 0, &SimulatedBmc::GetSelfTestResults},
    {ipmi::kGetSystemGuid, 0, &SimulatedBmc::GetSystemGuid},
    {ipmi::kGetFruInventoryAreaInfo, 1, &SimulatedBmc::GetFruInventoryAreaInfo},
    {ipmi::kReadFruData, 4, &SimulatedBmc::ReadFruData},
    {ipmi::kGetSdrRepositoryInfo, 0, &SimulatedBmc::GetSdrRepositoryInfo},
    {ipmi::kReserveSdrRepository, 0, &SimulatedBmc::ReserveSdrRepository},
    {ipmi::kGetSdr, 6, &SimulatedBmc::GetSdr},
    {ipmi::kGetSelInfo, 0, &SimulatedBmc::GetSelInfo},
    {ipmi::kGetSelEntry, 6, &SimulatedBmc::GetSelEntry},
    {ipmi::kGetSelTime, 0, &SimulatedBmc::GetSelTime},
    {ipmi::kGetAuxiliaryLogStatus, 1, &SimulatedBmc::GetAuxLogStatus},
    {ipmi::kGetSelTimeUtcOffset, 0, &SimulatedBmc::GetSelTimeUtcOffset},
};

SimulatedBmc::SimulatedBmc(BmcDescription description)
    : description_(std::move(description)),
      selIndex_(IndexById(description_.selEntries)),
      sdrIndex_(IndexById(description_.sdrRecords)) {}

std::optional<Bytes> SimulatedBmc::Execute(std::uint8_t netFn, std::uint8_t lun,
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
    if (fault == description_.faults.end()) return Normal(netFn, lun, command, data);
    Bytes answer;
    switch (fault->kind) {
        case Fault::Kind::kNoResponse:
            return std::nullopt;
        case Fault::Kind::kCompletionCode:
            return Bytes{fault->completionCode};
        case Fault::Kind::kTruncate:
            answer = Normal(netFn, lun, command, data);
            if (answer.size() - 1 > fault->truncate) answer.resize(1 + fault->truncate);
            return answer;
        case Fault::Kind::kData:
            answer.push_back(kCompleted);
            answer.insert(answer.end(), fault->data.begin(), fault->data.end());
            return answer;
    }
    return std::nullopt;
}

/// What the BMC answers when nothing is wrong with it; never empty.
Bytes SimulatedBmc::Normal(std::uint8_t netFn, std::uint8_t lun, std::uint8_t command,
                           std::span<const std::uint8_t> data) {
    for (const Known& known : kKnown) {
        if (known.code != ipmi::CommandCode{netFn, command}) continue;
        if (data.size() != known.requestLength) return {ipmi::kRequestLengthInvalid};
        if (auto answer = (this->*known.answer)({lun, data})) return *std::move(answer);
    }
    for (const FixedReply& reply : description_.replies) {
        if (reply.netFn != netFn || reply.command != command) continue;
        if (data.size() < reply.request.size() ||
            !std::equal(reply.request.begin(), reply.request.end(), data.begin())) {
            continue;
        }
        Bytes answer{kCompleted};
        answer.insert(answer.end(), reply.response.begin(), reply.response.end());
        return answer;
    }
    return {ipmi::kInvalidCommand};
}

std::optional<Bytes> SimulatedBmc::GetDeviceId(const Request&) {
    return Completed(description_.deviceId);
}

std::optional<Bytes> SimulatedBmc::GetSelfTestResults(const Request&) {
    return Completed(description_.selfTest);
}

std::optional<Bytes> SimulatedBmc::GetSystemGuid(const Request&) {
    return Completed(description_.guid);
}

std::optional<Bytes> SimulatedBmc::GetChassisStatus(const Request&) {
    return Completed(description_.chassisStatus);
}

std::optional<Bytes> SimulatedBmc::GetPefParameter(const Request& request) {
    if (!description_.pefFilters) return std::nullopt;
    constexpr std::uint8_t kRevision = 0x11;
    constexpr std::uint8_t kRevisionOnly = 0x80;
    const auto& filters = *description_.pefFilters;
    Bytes answer{kCompleted, kRevision};
    const std::uint8_t parameter = request.data[0] & 0x7F;
    const std::size_t entry = request.data[1] & 0x7F;  // from 1
    if (parameter != ipmi::kPefEventFilterCount && parameter != ipmi::kPefEventFilter) {
        return Bytes{ipmi::kParameterNotSupported};
    }
    if ((request.data[0] & kRevisionOnly) != 0) return answer;
    if (parameter == ipmi::kPefEventFilterCount) {
        answer.push_back(static_cast<std::uint8_t>(filters.size()));
        return answer;
    }
    if (entry == 0 || entry > filters.size()) return Bytes{ipmi::kParameterOutOfRange};
    answer.insert(answer.end(), filters[entry - 1].begin(), filters[entry - 1].end());
    return answer;
}

const SimulatedSensor* SimulatedBmc::OwnSensor(const Request& request) const {
    const auto sensor =
        description_.sensors.find({ipmi::kBmcAddress, request.lun, request.data[0]});
    return sensor == description_.sensors.end() ? nullptr : &sensor->second;
}

std::optional<Bytes> SimulatedBmc::GetSensorReading(const Request& request) {
    const SimulatedSensor* sensor = OwnSensor(request);
    if (sensor == nullptr || (!sensor->reading && !sensor->states)) return Bytes{kNotPresent};
    // Events and scanning enabled, no state asserted.
    static const Bytes kWell{0xC0, 0x00, 0x80};
    const Bytes& states = sensor->states ? *sensor->states : kWell;
    Bytes answer{kCompleted, sensor->reading.value_or(0)};
    answer.insert(answer.end(), states.begin(), states.end());
    return answer;
}

std::optional<Bytes> SimulatedBmc::GetSensorThresholds(const Request& request) {
    const SimulatedSensor* sensor = OwnSensor(request);
    if (sensor == nullptr || !sensor->thresholds) return Bytes{kNotPresent};
    return Completed(sensor->thresholds);
}

std::optional<Bytes> SimulatedBmc::GetSensorReadingFactors(const Request& request) {
    const SimulatedSensor* sensor = OwnSensor(request);
    if (sensor == nullptr) return Bytes{kNotPresent};
    const auto factors = sensor->factors.find(request.data[1]);
    if (factors == sensor->factors.end()) return Bytes{kNotPresent};
    return Completed(std::optional(factors->second));
}

std::optional<Bytes> SimulatedBmc::GetFruInventoryAreaInfo(const Request& request) {
    const auto data = request.data;
    const auto device = description_.fru.find(data[0]);
    if (device == description_.fru.end()) return Bytes{kNotPresent};
    Bytes answer{kCompleted};
    AppendU16(&answer, Count16(device->second.size()));
    answer.push_back(0x00);  // accessed by bytes
    return answer;
}

std::optional<Bytes> SimulatedBmc::ReadFruData(const Request& request) {
    const auto data = request.data;
    const auto device = description_.fru.find(data[0]);
    if (device == description_.fru.end()) return Bytes{kNotPresent};
    const std::span<const std::uint8_t> inventory(device->second);
    const std::size_t offset = U16At(data, 1);
    if (offset >= inventory.size()) return Bytes{ipmi::kParameterOutOfRange};
    const auto part =
        inventory.subspan(offset, std::min<std::size_t>(data[3], inventory.size() - offset));
    Bytes answer{kCompleted, static_cast<std::uint8_t>(part.size())};
    answer.insert(answer.end(), part.begin(), part.end());
    return answer;
}

std::optional<Bytes> SimulatedBmc::GetSdrRepositoryInfo(const Request&) {
    std::size_t used = 0;
    for (const Bytes& record : description_.sdrRecords) used += record.size();
    constexpr std::uint8_t kReserveSupported = 0x02;
    return RepositoryInfo(description_.sdrVersion, description_.sdrRecords.size(),
                          0xFFFF - Count16(used), kNoTime, kNoTime, kReserveSupported);
}

std::optional<Bytes> SimulatedBmc::ReserveSdrRepository(const Request&) {
    if (++sdrReservation_ == 0) ++sdrReservation_;
    Bytes answer{kCompleted};
    AppendU16(&answer, sdrReservation_);
    return answer;
}

std::optional<Bytes> SimulatedBmc::GetSdr(const Request& request) {
    constexpr std::size_t kMaxPart = 22;  // of a controller that gives no whole records
    const auto data = request.data;
    const std::uint8_t offset = data[4];
    if (offset != 0 && (sdrReservation_ == 0 || U16At(data, 0) != sdrReservation_)) {
        return Bytes{ipmi::kReservationCanceled};
    }
    Bytes answer = ReadRecord(description_.sdrRecords, sdrIndex_, U16At(data, 2), offset, data[5]);
    if (!description_.wholeSdr && ipmi::RecordIn(answer).size() > kMaxPart) {
        return Bytes{ipmi::kCannotReturnBytes};
    }
    return answer;
}

std::optional<Bytes> SimulatedBmc::GetSelInfo(const Request&) {
    const auto& entries = description_.selEntries;
    std::uint32_t newestTime = kNoTime;
    for (auto entry = entries.rbegin(); entry != entries.rend(); ++entry) {
        const auto record = ipmi::ParseSelRecord(*entry);
        if (record && (record->kind == ipmi::RecordKind::kSensorEvent ||
                       record->kind == ipmi::RecordKind::kOemTimestamped)) {
            newestTime = record->time;
            break;
        }
    }
    constexpr std::uint8_t kOverflow = 0x80;
    const std::size_t left = (0xFFFF - Count16(entries.size())) * ipmi::kSelRecordSize;
    return RepositoryInfo(
        description_.selVersion, entries.size(), description_.selFreeBytes.value_or(Count16(left)),
        description_.selLastAddition.value_or(newestTime),
        description_.selLastErase.value_or(kNoTime), description_.selOverflow ? kOverflow : 0x00);
}

std::optional<Bytes> SimulatedBmc::GetSelEntry(const Request& request) {
    const auto data = request.data;
    return ReadRecord(description_.selEntries, selIndex_, U16At(data, 2), data[4], data[5]);
}

std::optional<Bytes> SimulatedBmc::GetSelTime(const Request&) {
    Bytes answer{kCompleted};
    AppendU32(&answer,
              description_.selTime.value_or(static_cast<std::uint32_t>(std::time(nullptr))));
    return answer;
}

std::optional<Bytes> SimulatedBmc::GetSelTimeUtcOffset(const Request&) {
    if (!description_.utcOffsetMinutes) return std::nullopt;
    Bytes answer{kCompleted};
    AppendU16(&answer, static_cast<std::uint16_t>(*description_.utcOffsetMinutes));
    return answer;
}

std::optional<Bytes> SimulatedBmc::GetAuxLogStatus(const Request&) {
    if (!description_.auxLogCount) return std::nullopt;
    // The count stands in bytes 16 and 17 of the reply frame, whose byte 8 is the completion code.
    Bytes answer(8, 0x00);
    AppendU16(&answer, Count16(*description_.auxLogCount));
    return answer;
}

}  // namespace ipmisim
