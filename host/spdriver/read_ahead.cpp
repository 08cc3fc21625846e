#include "host/spdriver/read_ahead.h"

#include "host/spdriver/commands.h"

namespace tqrhost {
namespace {

constexpr std::uint16_t kFirstRecord = 0x0000;
constexpr std::uint16_t kNoNextRecord = 0xFFFF;

// Parts of a sensor data record that the sensor walk and the locator walk take.
constexpr std::uint8_t kSensorHeaderLength = 10;
constexpr std::uint8_t kLocatorHeaderLength = 15;
constexpr std::uint8_t kUnitsOffset = 20;
constexpr std::uint8_t kUnitsLength = 10;
constexpr std::uint8_t kFullSensorStringOffset = 47;
constexpr std::uint8_t kCompactSensorStringOffset = 31;
constexpr std::uint8_t kLocatorStringOffset = 15;
constexpr std::uint8_t kToTheEnd = 0xFF;

constexpr std::uint8_t kFullSensor = 0x01;
constexpr std::uint8_t kCompactSensor = 0x02;
constexpr std::uint8_t kFruDeviceLocator = 0x11;

constexpr unsigned kFruChunk = 16;
constexpr unsigned kLastFruOffset = 0xF0;

std::uint16_t Word(std::uint8_t low, std::uint8_t high) {
    return static_cast<std::uint16_t>(low | high << 8);
}
std::uint8_t Low(std::uint16_t word) { return static_cast<std::uint8_t>(word & 0xFF); }
std::uint8_t High(std::uint16_t word) { return static_cast<std::uint8_t>(word >> 8); }

// Get SEL Entry and Get SDR share their request data: reservation, record, offset, count.
bool IsRecordRead(const Ask& ask) {
    return ask.netFn == kNetFnStorage && ask.data.size() == 6 &&
           (ask.command == kGetSelEntry || ask.command == kGetSdr);
}
std::uint16_t RecordOf(const Ask& ask) { return Word(ask.data[2], ask.data[3]); }
std::uint8_t OffsetOf(const Ask& ask) { return ask.data[4]; }

/// With it a walk through the event log begins.
bool IsSelInfo(const Ask& ask) {
    return ask.netFn == kNetFnStorage && ask.command == kGetSelInfo && ask.data.empty();
}
Ask FirstSelEntry() {
    return {kNetFnStorage,
            0,
            kGetSelEntry,
            {0, 0, Low(kFirstRecord), High(kFirstRecord), 0, kToTheEnd}};
}

bool IsFruChunk(const Ask& ask) {
    return ask.netFn == kNetFnStorage && ask.command == kReadFruData && ask.data.size() == 4 &&
           ask.data[2] == 0 && ask.data[3] == kFruChunk;
}

}  // namespace

Ask Ask::Of(const RequestFrame& frame) {
    return {frame.netFn(), frame.lun(), frame.command(),
            std::vector<std::uint8_t>(frame.data().begin(), frame.data().end())};
}

void ReadAhead::Chain::Restart() {
    next_.clear();
    stride_ = 1;
}

void ReadAhead::Chain::LearnNext(std::uint16_t record, std::uint16_t next) {
    next_[record] = next;
    if (record != kFirstRecord && next > record && next != kNoNextRecord) stride_ = next - record;
}

std::optional<std::uint16_t> ReadAhead::Chain::After(std::uint16_t record) const {
    const auto known = next_.find(record);
    if (known != next_.end()) {
        if (known->second == kNoNextRecord) return std::nullopt;
        return known->second;
    }
    const int tried = record + stride_;
    if (tried >= kNoNextRecord) return std::nullopt;
    return static_cast<std::uint16_t>(tried);
}

void ReadAhead::Chain::Passed(std::uint16_t record) {
    // The reader goes forward; a record that it goes back to is simply not known any more.
    next_.erase(next_.begin(), next_.lower_bound(record));
}

void ReadAhead::Asked(const Ask& ask) {
    const bool walkHasBegun = now_ && IsSelInfo(*now_);
    now_ = ask;
    if (IsSelInfo(ask)) eventLog_.Restart();
    if (!IsRecordRead(ask)) return;
    const std::uint16_t record = RecordOf(ask);
    if (ask.command == kGetSelEntry) {
        if (record == kFirstRecord && !walkHasBegun) eventLog_.Restart();
        eventLog_.Passed(record);
        return;
    }
    if (record == kFirstRecord && OffsetOf(ask) == 0) {
        sensorRepository_.Restart();
        kinds_.clear();
    }
    sensorRepository_.Passed(record);
    kinds_.erase(kinds_.begin(), kinds_.lower_bound(record));
    if (OffsetOf(ask) == 0) reader_.headerLength = ask.data[5];
    reservationLow_ = ask.data[0];
    reservationHigh_ = ask.data[1];
}

void ReadAhead::Answered(const Ask& ask, const Response& response) {
    if (!IsRecordRead(ask) || response.size() < 3 || response[0] != 0) return;
    const std::uint16_t record = RecordOf(ask);
    const std::uint16_t next = Word(response[1], response[2]);
    if (ask.command == kGetSelEntry) {
        eventLog_.LearnNext(record, next);
        return;
    }
    if (OffsetOf(ask) != 0) return;
    sensorRepository_.LearnNext(record, next);
    // Response: completion code, next record ID, record; type in record byte 3, device ID in 6.
    if (response.size() > 3 + 3) {
        RecordKind kind{response[3 + 3], 0};
        if (response.size() > 3 + 6) kind.deviceId = response[3 + 6];
        kinds_[record] = kind;
    }
}

Ask ReadAhead::SdrAsk(std::uint16_t record, std::uint8_t offset, std::uint8_t count) const {
    return {kNetFnStorage,
            0,
            kGetSdr,
            {reservationLow_, reservationHigh_, Low(record), High(record), offset, count}};
}

void ReadAhead::AppendRestOfRecord(std::uint16_t record, std::uint8_t afterOffset,
                                   std::vector<Ask>* asks) const {
    // Which parts there are, the header says; until it is there, later headers are worth more than
    // a try.
    const auto known = kinds_.find(record);
    if (known == kinds_.end()) return;
    const RecordKind kind = known->second;
    if (reader_.headerLength == kLocatorHeaderLength) {
        if (afterOffset == 0 && kind.type == kFruDeviceLocator && kind.deviceId != 0) {
            asks->push_back(SdrAsk(record, kLocatorStringOffset, kToTheEnd));
        }
        return;
    }
    if (reader_.headerLength != kSensorHeaderLength) return;
    if (kind.type != kFullSensor && kind.type != kCompactSensor) return;
    const std::uint8_t stringOffset =
        kind.type == kFullSensor ? kFullSensorStringOffset : kCompactSensorStringOffset;
    if (afterOffset < kUnitsOffset) asks->push_back(SdrAsk(record, kUnitsOffset, kUnitsLength));
    if (afterOffset < stringOffset) asks->push_back(SdrAsk(record, stringOffset, kToTheEnd));
}

std::vector<Ask> ReadAhead::Next(std::size_t count) const {
    std::vector<Ask> asks;
    if (!now_) return asks;
    if (IsFruChunk(*now_)) {
        for (unsigned offset = now_->data[1] + kFruChunk;
             offset <= kLastFruOffset && asks.size() < count; offset += kFruChunk) {
            Ask ask = *now_;
            ask.data[1] = static_cast<std::uint8_t>(offset);
            asks.push_back(std::move(ask));
        }
        return asks;
    }
    if (IsSelInfo(*now_) && count > 0) asks.push_back(FirstSelEntry());
    if (!IsRecordRead(*now_)) return asks;

    std::uint16_t record = RecordOf(*now_);
    if (now_->command == kGetSelEntry) {
        while (asks.size() < count) {
            const auto next = eventLog_.After(record);
            if (!next) break;
            record = *next;
            Ask ask = *now_;
            ask.data[2] = Low(record);
            ask.data[3] = High(record);
            asks.push_back(std::move(ask));
        }
        return asks;
    }
    AppendRestOfRecord(record, OffsetOf(*now_), &asks);
    while (asks.size() < count && reader_.headerLength != 0) {
        const auto next = sensorRepository_.After(record);
        if (!next) break;
        record = *next;
        asks.push_back(SdrAsk(record, 0, reader_.headerLength));
        AppendRestOfRecord(record, 0, &asks);
    }
    if (asks.size() > count) asks.resize(count);
    return asks;
}

}  // namespace tqrhost
