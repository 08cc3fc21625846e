#include "ipmi/reading.h"

#include <algorithm>
#include <cmath>

#include "base/bytes.h"

namespace ipmi {
namespace {

/// Two's complement of so many bits.
int Signed(unsigned value, unsigned bits) {
    const unsigned sign = 1U << (bits - 1);
    return static_cast<int>(value ^ sign) - static_cast<int>(sign);
}

std::int64_t PowerOfTen(int exponent) {
    std::int64_t power = 1;
    for (; exponent > 0; --exponent) power *= 10;
    return power;
}

/// numerator * 10^exponent as the nearest double: one rounding, so that 1.1979 is 1.1979.
double Scaled(std::int64_t numerator, int exponent) {
    const auto power = static_cast<double>(PowerOfTen(std::abs(exponent)));
    const auto number = static_cast<double>(numerator);
    return exponent < 0 ? number / power : number * power;
}

double Linear(int count, const ReadingFactors& f) {
    // Over a common power of ten all is whole: at most 2^17 * 10^8 + 2^9 * 10^7.
    const std::int64_t numerator =
        std::int64_t{f.m} * count * PowerOfTen(std::max(0, -f.bExponent)) +
        f.b * PowerOfTen(std::max(0, f.bExponent));
    return Scaled(numerator, f.resultExponent + std::min(0, f.bExponent));
}

/// Table 43-1, byte 24.
double Linearized(std::uint8_t function, double x) {
    switch (function) {
        case 0x00:
            return x;
        case 0x01:
            return std::log(x);
        case 0x02:
            return std::log10(x);
        case 0x03:
            return std::log2(x);
        case 0x04:
            return std::exp(x);
        case 0x05:
            return std::pow(10.0, x);
        case 0x06:
            return std::exp2(x);
        case 0x07:
            return 1.0 / x;
        case 0x08:
            return x * x;
        case 0x09:
            return x * x * x;
        case 0x0A:
            return std::sqrt(x);
        case kCubeRoot:
            return std::cbrt(x);
        default:
            return std::nan("");
    }
}

std::optional<double> Finite(double value) {
    if (!std::isfinite(value)) return std::nullopt;
    return value;
}

}  // namespace

std::optional<ReadingFactors> ReadingFactors::Parse(std::span<const std::uint8_t> bytes) {
    ipmisel::ByteReader in(bytes);
    const unsigned mLow = in.U8();
    const unsigned mHigh = in.U8();
    const unsigned bLow = in.U8();
    const unsigned bHigh = in.U8();
    const unsigned accuracyHigh = in.U8();
    const unsigned exponents = in.U8();
    if (!in.ok()) return std::nullopt;
    return ReadingFactors{
        .m = Signed(mLow | (mHigh & 0xC0) << 2, 10),
        .b = Signed(bLow | (bHigh & 0xC0) << 2, 10),
        .bExponent = Signed(exponents & 0x0F, 4),
        .resultExponent = Signed(exponents >> 4, 4),
        .toleranceHalfCounts = mHigh & 0x3F,
        .accuracy = (bHigh & 0x3F) | (accuracyHigh & 0xF0) << 2,
        .accuracyExponent = accuracyHigh >> 2 & 0x03,
    };
}

std::optional<int> SignedCount(std::uint8_t raw, NumberFormat format) {
    switch (format) {
        case NumberFormat::kUnsigned:
            return raw;
        case NumberFormat::kOnesComplement:
            return raw < 0x80 ? raw : raw - 0xFF;
        case NumberFormat::kTwosComplement:
            return Signed(raw, 8);
        case NumberFormat::kNone:
            break;
    }
    return std::nullopt;
}

std::optional<double> Conversion::Value(std::uint8_t raw) const {
    const auto count = SignedCount(raw, format);
    // M = 0 would make every reading the same: such a record gives no factors.
    if (!count || factors.m == 0 || linearization > kCubeRoot) return std::nullopt;
    return Finite(Linearized(linearization, Linear(*count, factors)));
}

std::optional<double> Conversion::ValueByFactors(std::uint8_t raw,
                                                 const ReadingFactors& asked) const {
    const auto count = SignedCount(raw, format);
    // Zeros are no answer; a constant other than 0 is one.
    if (!count || !IsNonLinear() || (asked.m == 0 && asked.b == 0)) return std::nullopt;
    return Finite(Linear(*count, asked));
}

std::optional<double> Conversion::Difference(unsigned counts) const {
    if (format == NumberFormat::kNone || linearization != kLinear || factors.m == 0) {
        return std::nullopt;
    }
    return Scaled(std::int64_t{std::abs(factors.m)} * counts, factors.resultExponent);
}

std::optional<double> Conversion::Tolerance() const {
    const auto twice = Difference(factors.toleranceHalfCounts);
    if (!twice) return std::nullopt;
    return *twice / 2;
}

double Conversion::AccuracyPercent() const {
    return Scaled(factors.accuracy, static_cast<int>(factors.accuracyExponent) - 2);
}

}  // namespace ipmi
