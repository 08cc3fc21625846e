#include "ipmi/sensor_reading.h"

#include <algorithm>

#include "base/bytes.h"

namespace ipmi {

std::optional<SensorReading> SensorReading::Parse(std::span<const std::uint8_t> data) {
    ipmisel::ByteReader in(data);
    SensorReading reading;
    reading.raw = in.U8();
    const std::uint8_t flags = in.U8();
    if (!in.ok()) return std::nullopt;
    reading.eventMessagesEnabled = (flags & 0x80) != 0;
    reading.scanningEnabled = (flags & 0x40) != 0;
    reading.unavailable = (flags & 0x20) != 0;
    const std::uint8_t low = in.U8();
    if (in.ok()) reading.states = low;
    const std::uint8_t high = in.U8();
    if (in.ok()) reading.states = static_cast<std::uint16_t>(low | (high & 0x7F) << 8);
    return reading;
}

std::optional<std::uint8_t> SensorThresholds::Get(Threshold threshold) const {
    const auto number = static_cast<unsigned>(threshold);
    if ((readable >> number & 1) == 0) return std::nullopt;
    return raw[number];
}

std::optional<SensorThresholds> SensorThresholds::Parse(std::span<const std::uint8_t> data) {
    ipmisel::ByteReader in(data);
    SensorThresholds thresholds;
    thresholds.readable = in.U8() & 0x3F;
    for (std::uint8_t& raw : thresholds.raw) raw = in.U8();
    if (!in.ok()) return std::nullopt;
    return thresholds;
}

std::optional<SensorReadingFactors> SensorReadingFactors::Parse(
    std::span<const std::uint8_t> data) {
    if (data.empty()) return std::nullopt;
    const auto factors = ReadingFactors::Parse(data.subspan(1));
    if (!factors) return std::nullopt;
    return SensorReadingFactors{data[0], *factors};
}

}  // namespace ipmi
