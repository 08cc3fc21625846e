#include "host/spdriver/command_predictor.h"

#include <algorithm>
#include <span>

#include "base/bytes.h"
#include "ipmi/sdr_record.h"

namespace tqrhost {
namespace {

constexpr std::size_t kChunkRead = 4;         // device, offset, count
constexpr std::size_t kUnknownFruSize = 256;  // tried that far when nobody has asked for the size
constexpr std::size_t kFarthest = 32;         // requests ahead of the last one asked
constexpr unsigned kMaxJumps = 4;             // then the reader has an order of its own

bool IsFruChunk(const ipmi::Command& command) {
    return command.code() == ipmi::kReadFruData && command.data.size() == kChunkRead;
}

std::size_t OffsetOf(const ipmi::Command& chunk) {
    ipmisel::ByteReader in(chunk.data);
    in.U8();
    return in.U16();
}

bool IsOfSensor(const ipmi::Command& command) {
    return command.data.size() == 1 && (command.code() == ipmi::kGetSensorReading ||
                                        command.code() == ipmi::kGetSensorThresholds);
}

}  // namespace

void CommandPredictor::FindSensors() {
    if (std::exchange(foundSensors_, true) || records_ == nullptr) return;
    for (std::size_t i = 0; i < records_->size(); ++i) {
        const auto record = ipmi::SdrRecord::Parse(records_->At(i).bytes);
        if (!record || record->header.type == ipmi::SdrType::kEventOnly) continue;
        for (const ipmi::Sensor& sensor : record->Sensors()) {
            if (sensor.key.owner != ipmi::kBmcAddress) continue;
            const bool readable = sensor.thresholdAccess == ipmi::LimitAccess::kReadable ||
                                  sensor.thresholdAccess == ipmi::LimitAccess::kSettable;
            const auto position = sensors_.size();
            if (positions_.emplace(std::pair(sensor.key.lun, sensor.key.number), position).second) {
                sensors_.push_back(
                    {sensor.key.lun, sensor.key.number, sensor.IsThreshold() && readable});
            }
        }
    }
}

void CommandPredictor::RequestedOfSensor(const ipmi::Command& command) {
    FindSensors();
    const auto found = positions_.find({command.lun, command.data[0]});
    if (found == positions_.end()) return;
    const std::size_t position = found->second;
    if (sensor_ != position) {
        inOrder_ = position == (sensor_ ? *sensor_ + 1 : 0);
        if (!inOrder_) ++jumps_;
        ofLastSensor_ = std::exchange(ofThisSensor_, {});
        sensor_ = position;
    }
    ofThisSensor_.push_back(command.code());
}

void CommandPredictor::Announced(const ipmi::Command& command) {
    if (command.code() != ipmi::kGetFruInventoryAreaInfo || command.data.size() != 1) return;
    fruToCome_.push_back({command.data[0], command.lun});
}

void CommandPredictor::Requested(const ipmi::Command& command) {
    now_ = command;
    if (IsOfSensor(command)) RequestedOfSensor(command);
    if (IsFruChunk(command)) RequestedOfFru(command);
}

void CommandPredictor::RequestedOfFru(const ipmi::Command& command) {
    const FruPlace place{command.data[0], command.lun};
    const std::uint8_t chunk = command.data[3];
    std::erase(fruToCome_, place);
    const auto known = fruAreas_.find(place);
    if (OffsetOf(command) != 0 || known == fruAreas_.end()) return;
    // Asked for less the second time: the controller does not give so much.
    if (std::exchange(fruBegun_, place) == place && chunk < fruChunk_) {
        fruChunk_ = 0;
    } else if (chunk < known->second.size && !known->second.byWords) {
        fruChunk_ = chunk;
    }
}

void CommandPredictor::Answered(const ipmi::Command& command, const Response& response) {
    if (command.code() != ipmi::kGetFruInventoryAreaInfo || command.data.size() != 1) return;
    const FruPlace place{command.data[0], command.lun};
    const bool completed = !response.empty() && response.front() == ipmi::kCompleted;
    const auto area = completed ? ipmi::ParseFruAreaInfo(std::span(response).subspan(1))
                                : std::optional<ipmi::FruAreaInfo>();
    if (area) {
        fruAreas_[place] = *area;
    } else {
        std::erase(fruToCome_, place);
    }
}

std::vector<ipmi::Command> CommandPredictor::Next(std::size_t count,
                                                  const IsRequested& isRequested) const {
    std::vector<ipmi::Command> commands;
    if (!now_ || count == 0) return commands;
    std::size_t seen = 0;
    const Add add = [&](ipmi::Command command) {
        if (!isRequested(command)) commands.push_back(std::move(command));
        return commands.size() < count && ++seen < kFarthest;
    };
    if (IsFruChunk(*now_)) AddFruChunks(add);
    if (IsOfSensor(*now_)) AddSensors(add);
    if (commands.size() < count) AddFruToCome(add);
    return commands;
}

void CommandPredictor::AddFruChunks(const Add& add) const {
    const FruPlace now{now_->data[0], now_->lun};
    const std::uint8_t chunk = now_->data[3];
    if (chunk != 0) AddFruChunksFrom(OffsetOf(*now_) + chunk, chunk, now, add);
}

void CommandPredictor::AddFruToCome(const Add& add) const {
    if (fruChunk_ == 0) return;
    for (const FruPlace& next : fruToCome_) {
        // How a device by words is read shows when it is.
        const auto known = fruAreas_.find(next);
        if (known == fruAreas_.end() || known->second.byWords) continue;
        if (!AddFruChunksFrom(0, fruChunk_, next, add)) return;
    }
}

/// The chunks of a device from an offset on, as many as are wanted; false when no more are.
bool CommandPredictor::AddFruChunksFrom(std::size_t offset, std::uint8_t chunk, FruPlace place,
                                        const Add& add) const {
    const auto known = fruAreas_.find(place);
    std::size_t size = kUnknownFruSize;
    if (known != fruAreas_.end()) {
        // Offsets and counts are in words then, too.
        size = known->second.byWords ? known->second.size / 2 : known->second.size;
    }
    for (; offset < size; offset += chunk) {
        // A reader that knows the size asks for no more than is left.
        const std::size_t rest = known != fruAreas_.end() ? size - offset : chunk;
        ipmi::Command next =
            ipmi::ReadFruData(place.device, static_cast<std::uint16_t>(offset),
                              static_cast<std::uint8_t>(std::min<std::size_t>(rest, chunk)));
        next.lun = place.lun;
        if (!add(std::move(next))) return false;
    }
    return true;
}

void CommandPredictor::AddSensors(const Add& add) const {
    if (!sensor_ || !inOrder_ || jumps_ > kMaxJumps) return;
    const auto addOne = [&](const Sensor& sensor, ipmi::CommandCode code) {
        if (code == ipmi::kGetSensorThresholds && !sensor.hasThresholds) return true;
        return add(ipmi::MakeCommand(code, {sensor.number}, sensor.lun));
    };
    // A sensor without thresholds shows nothing of what the reader asks of one that has them.
    const auto& pattern =
        ofThisSensor_.size() < ofLastSensor_.size() ? ofLastSensor_ : ofThisSensor_;
    for (std::size_t i = ofThisSensor_.size(); i < pattern.size(); ++i) {
        if (!addOne(sensors_[*sensor_], pattern[i])) return;
    }
    for (std::size_t i = *sensor_ + 1; i < sensors_.size(); ++i) {
        for (const ipmi::CommandCode code : pattern) {
            if (!addOne(sensors_[i], code)) return;
        }
    }
}

}  // namespace tqrhost
