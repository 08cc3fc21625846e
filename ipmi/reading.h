#pragma once

#include <cstdint>
#include <optional>
#include <span>

// From raw sensor readings to values: y = L[(M * x + B * 10^K1) * 10^K2], IPMI 2.0, 36.3.

namespace ipmi {

/// How a raw reading counts: bits 7..6 of sensor units 1 (table 43-1).
enum class NumberFormat : std::uint8_t {
    kUnsigned = 0,
    kOnesComplement = 1,
    kTwosComplement = 2,
    kNone = 3,  ///< the sensor has no analog reading
};

/// The factors of the formula; six bytes of a full record or of Get Sensor Reading Factors.
struct ReadingFactors {
    int m = 0;                         ///< 10 bits, signed
    int b = 0;                         ///< 10 bits, signed
    int bExponent = 0;                 ///< K1
    int resultExponent = 0;            ///< K2
    unsigned toleranceHalfCounts = 0;  ///< plus and minus so many half raw counts
    unsigned accuracy = 0;             ///< in 1/100 percent, times 10^accuracyExponent
    unsigned accuracyExponent = 0;

    bool operator==(const ReadingFactors&) const = default;

    /// The first six bytes; empty when there are fewer.
    static std::optional<ReadingFactors> Parse(std::span<const std::uint8_t> bytes);
};

// Linearizations (table 43-1, byte 24). Reserved codes stand between the named ones.
constexpr std::uint8_t kLinear = 0x00;
constexpr std::uint8_t kCubeRoot = 0x0B;        ///< the last of the named functions
constexpr std::uint8_t kFirstNonLinear = 0x70;  ///< to 7Fh: factors by Get Sensor Reading Factors

/// What turns a sensor's raw counts into its unit.
struct Conversion {
    NumberFormat format = NumberFormat::kNone;
    std::uint8_t linearization = kLinear;
    ReadingFactors factors;

    /// Whether the factors hold for one raw reading only and must be asked for.
    bool IsNonLinear() const { return linearization >= kFirstNonLinear; }
    /// The value of a raw reading or threshold. Empty where there is none: no analog reading, a
    /// reserved linearization, M = 0, a function that is not defined there or overflows, or a
    /// non-linear sensor.
    std::optional<double> Value(std::uint8_t raw) const;
    /// The value of a non-linear sensor's reading, by the factors asked for with that reading.
    std::optional<double> ValueByFactors(std::uint8_t raw, const ReadingFactors& asked) const;
    /// Plus or minus so much of the unit. Only for linear sensors: elsewhere it varies.
    std::optional<double> Tolerance() const;
    /// In percent.
    double AccuracyPercent() const;
    /// So many raw counts as a difference in the unit; as Tolerance.
    std::optional<double> Difference(unsigned counts) const;
};

/// A raw count by its format; empty for a format without numbers.
std::optional<int> SignedCount(std::uint8_t raw, NumberFormat format);

}  // namespace ipmi
