#include "host/spdriver/command_predictor.h"

#include <algorithm>

#include "base/bytes.h"
#include "ipmi/sdr_record.h"

namespace tqrhost {
namespace {

constexpr std::size_t kChunkRead = 4;         // device, offset, count
constexpr std::size_t kUnknownFruSize = 256;  // tried that far when nobody has asked for the size
constexpr unsigned kMaxJumps = 4;             // then the reader has an order of its own

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

void CommandPredictor::AskedOfSensor(const ipmi::Command& command) {
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

void CommandPredictor::Asked(const ipmi::Command& command) {
    now_ = command;
    if (IsOfSensor(command)) AskedOfSensor(command);
}

void CommandPredictor::Answered(const ipmi::Command& command, const Response& response) {
    if (command.code() != ipmi::kGetFruInventoryAreaInfo || command.data.size() != 1) return;
    ipmisel::ByteReader in(response);
    if (in.U8() != ipmi::kCompleted) return;
    std::size_t size = in.U16();
    constexpr std::uint8_t kByWords = 0x01;  // then offsets and counts are in words, too
    if ((in.U8() & kByWords) != 0) size /= 2;
    if (in.ok()) fruSizes_[command.data[0]] = size;
}

std::vector<ipmi::Command> CommandPredictor::Next(std::size_t count) const {
    std::vector<ipmi::Command> commands;
    if (!now_ || count == 0) return commands;
    if (now_->code() == ipmi::kReadFruData && now_->data.size() == kChunkRead) {
        AppendFruChunks(count, &commands);
    } else if (IsOfSensor(*now_)) {
        AppendSensors(count, &commands);
    }
    return commands;
}

void CommandPredictor::AppendFruChunks(std::size_t count,
                                       std::vector<ipmi::Command>* commands) const {
    const std::uint8_t device = now_->data[0];
    const std::uint8_t chunk = now_->data[3];
    if (chunk == 0) return;
    const auto known = fruSizes_.find(device);
    const std::size_t size = known != fruSizes_.end() ? known->second : kUnknownFruSize;
    for (std::size_t offset = OffsetOf(*now_) + chunk; offset < size && commands->size() < count;
         offset += chunk) {
        // A reader that knows the size asks for no more than is left.
        const std::size_t rest = known != fruSizes_.end() ? size - offset : chunk;
        ipmi::Command next =
            ipmi::ReadFruData(device, static_cast<std::uint16_t>(offset),
                              static_cast<std::uint8_t>(std::min<std::size_t>(rest, chunk)));
        next.lun = now_->lun;
        commands->push_back(std::move(next));
    }
}

void CommandPredictor::AppendSensors(std::size_t count,
                                     std::vector<ipmi::Command>* commands) const {
    if (!sensor_ || !inOrder_ || jumps_ > kMaxJumps) return;
    const auto append = [&](const Sensor& sensor, ipmi::CommandCode code) {
        if (code == ipmi::kGetSensorThresholds && !sensor.hasThresholds) return;
        commands->push_back(ipmi::MakeCommand(code, {sensor.number}, sensor.lun));
    };
    // A sensor without thresholds shows nothing of what the reader asks of one that has them.
    const auto& pattern =
        ofThisSensor_.size() < ofLastSensor_.size() ? ofLastSensor_ : ofThisSensor_;
    for (std::size_t i = ofThisSensor_.size(); i < pattern.size(); ++i) {
        append(sensors_[*sensor_], pattern[i]);
    }
    for (std::size_t i = *sensor_ + 1; i < sensors_.size() && commands->size() < count; ++i) {
        for (const ipmi::CommandCode code : pattern) append(sensors_[i], code);
    }
    if (commands->size() > count) commands->resize(count);
}

}  // namespace tqrhost
