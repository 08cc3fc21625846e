#pragma once

#include <array>
#include <cstdint>
#include <string>
#include <vector>

#include "plugins/standard/event_state.h"
#include "plugins/standard/events.h"

namespace standard {

constexpr std::uint32_t kNoon = 1773057600;  // 2026-03-09T12:00:00Z

/// A node whose event log is put together record by record.
class LogBuilder {
public:
    /// The time of the records that follow.
    LogBuilder& At(std::uint32_t time) {
        time_ = time;
        return *this;
    }
    /// A sensor event of the controller itself.
    LogBuilder& Event(std::uint8_t sensorType, std::uint8_t number, std::uint8_t directionAndType,
                      std::array<std::uint8_t, 3> data) {
        return Record(
            0x02, {Byte(time_, 0), Byte(time_, 1), Byte(time_, 2), Byte(time_, 3), 0x20, 0x00, 0x04,
                   sensorType, number, directionAndType, data[0], data[1], data[2]});
    }
    LogBuilder& Record(std::uint8_t type, std::array<std::uint8_t, 13> rest) {
        const auto id = static_cast<std::uint32_t>(node.log.size() + 1);
        ipmi::SelBytes bytes{Byte(id, 0), Byte(id, 1), type};
        std::copy(rest.begin(), rest.end(), bytes.begin() + 3);
        node.log.push_back(*ipmi::ParseSelRecord(bytes));
        return *this;
    }
    LogBuilder& Cleared() { return Event(0x10, 0x01, 0x6F, {0x02, 0xFF, 0xFF}); }

    /// A sensor of the controller itself that reports every state.
    SensorFacts& Sensor(std::uint8_t number, std::uint8_t sensorType, std::uint8_t eventType,
                        const std::string& name, ipmi::Entity entity = {}) {
        SensorFacts& facts = node.sensors.emplace_back();
        facts.sensor.key = {.owner = 0x20, .lun = 0, .number = number};
        facts.sensor.sensorType = sensorType;
        facts.sensor.eventType = eventType;
        facts.sensor.name = name;
        facts.sensor.entity = entity;
        facts.sensor.readingMask = 0x7FFF;
        facts.sensor.assertionMask = facts.sensor.deassertionMask = 0x7000;
        return facts;
    }
    /// As Sensor, in degrees C, a degree per count.
    SensorFacts& Temperature(std::uint8_t number, const std::string& name,
                             ipmi::Entity entity = {}) {
        SensorFacts& facts = Sensor(number, 0x01, 0x01, name, entity);
        facts.sensor.units.base = 1;
        facts.sensor.analog.emplace();
        facts.sensor.analog->conversion.format = ipmi::NumberFormat::kUnsigned;
        facts.sensor.analog->conversion.factors.m = 1;
        return facts;
    }
    static void Reads(SensorFacts* facts, std::uint8_t raw, std::uint16_t states) {
        facts->reading.emplace();
        facts->reading->raw = raw;
        facts->reading->scanningEnabled = true;
        facts->reading->states = states;
    }

    /// The events, with the sensors' present readings.
    Events Derive() const {
        Events events(node, tools);
        SetPresentStates(events.Logged());
        return events;
    }

    NodeFacts node;
    SeverityRules rules;
    EntityParts parts;
    DerivationTools tools{.rules = rules, .parts = parts};

private:
    static std::uint8_t Byte(std::uint32_t value, unsigned index) {
        return static_cast<std::uint8_t>(value >> index * 8);
    }
    std::uint32_t time_ = kNoon;
};

constexpr std::uint8_t kPowerSupply = 0x08;
constexpr std::uint8_t kMemory = 0x0C;
constexpr std::uint8_t kAsserted = 0x6F;    // sensor-specific
constexpr std::uint8_t kDeasserted = 0xEF;  // sensor-specific

}  // namespace standard
