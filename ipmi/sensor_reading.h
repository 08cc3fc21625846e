#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>

#include "ipmi/reading.h"

// Answers of the sensor commands, after the completion code.

namespace ipmi {

/// Get Sensor Reading (IPMI 2.0, 35.14).
struct SensorReading {
    std::uint8_t raw = 0;
    bool eventMessagesEnabled = false;
    bool scanningEnabled = false;
    bool unavailable = false;
    /// Asserted states 0 to 14, or of a threshold sensor bit n for threshold n; empty where the
    /// controller gave none.
    std::optional<std::uint16_t> states;

    /// Whether reading and states mean anything.
    bool Available() const { return scanningEnabled && !unavailable; }
    bool Asserted(unsigned offset) const { return states && (*states >> offset & 1) != 0; }

    /// Empty when not even the flags are there.
    static std::optional<SensorReading> Parse(std::span<const std::uint8_t> data);
};

/// The six thresholds, in the order of masks and answers: a threshold's number is its bit.
enum class Threshold : std::uint8_t {
    kLowerNonCritical,
    kLowerCritical,
    kLowerNonRecoverable,
    kUpperNonCritical,
    kUpperCritical,
    kUpperNonRecoverable,
};
constexpr std::size_t kThresholdCount = 6;

/// Raw thresholds, those that may be had. Get Sensor Thresholds (35.9), or a full record's own.
struct SensorThresholds {
    std::uint8_t readable = 0;  ///< bit n: threshold n
    std::array<std::uint8_t, kThresholdCount> raw{};

    std::optional<std::uint8_t> Get(Threshold threshold) const;

    /// Empty when a byte is missing.
    static std::optional<SensorThresholds> Parse(std::span<const std::uint8_t> data);
};

/// Get Sensor Reading Factors (35.5): the factors that hold for the reading asked for, and the next
/// reading for which others do.
struct SensorReadingFactors {
    std::uint8_t nextReading = 0;
    ReadingFactors factors;

    static std::optional<SensorReadingFactors> Parse(std::span<const std::uint8_t> data);
};

}  // namespace ipmi
