#include "ipmi/reading.h"

#include <gtest/gtest.h>

#include <vector>

namespace ipmi {
namespace {

Conversion Linear(NumberFormat format, int m, int b, int bExponent, int resultExponent) {
    return {format,
            kLinear,
            {.m = m, .b = b, .bExponent = bExponent, .resultExponent = resultExponent}};
}

// y = (M * x + B * 10^K1) * 10^K2, worked by hand.
TEST(Reading, LinearSensorsInEveryNumberFormat) {
    const struct {
        Conversion conversion;
        std::uint8_t raw;
        double value;
    } cases[] = {
        {Linear(NumberFormat::kUnsigned, 1, 0, 0, 0), 0x59, 89},
        {Linear(NumberFormat::kUnsigned, 1, 0, 0, 0), 0xFF, 255},
        {Linear(NumberFormat::kUnsigned, 60, 0, 0, 0), 0x7F, 7620},
        {Linear(NumberFormat::kUnsigned, 99, 0, 0, -4), 121, 1.1979},
        {Linear(NumberFormat::kUnsigned, 7, 0, 0, -2), 3, 0.21},
        {Linear(NumberFormat::kUnsigned, 5, 8, 2, 1), 2, 8100},
        {Linear(NumberFormat::kUnsigned, 5, 8, -2, -1), 2, 1.008},
        {Linear(NumberFormat::kUnsigned, -3, 100, 0, 0), 10, 70},
        {Linear(NumberFormat::kUnsigned, -512, -512, 7, 7), 0xFF, -5.12e16 - 1.3056e12},
        {Linear(NumberFormat::kUnsigned, 1, 1, -8, -8), 0, 1e-16},
        {Linear(NumberFormat::kTwosComplement, 1, 0, 0, 0), 0xFF, -1},
        {Linear(NumberFormat::kTwosComplement, 1, 0, 0, 0), 0x80, -128},
        {Linear(NumberFormat::kTwosComplement, 2, 10, 0, -1), 0x7F, 26.4},
        {Linear(NumberFormat::kOnesComplement, 1, 0, 0, 0), 0xFE, -1},
        {Linear(NumberFormat::kOnesComplement, 1, 0, 0, 0), 0x80, -127},
        {Linear(NumberFormat::kOnesComplement, 1, 0, 0, 0), 0xFF, 0},
        {Linear(NumberFormat::kOnesComplement, 1, 0, 0, 0), 0x7F, 127},
    };
    for (const auto& c : cases) {
        const auto value = c.conversion.Value(c.raw);
        ASSERT_TRUE(value.has_value()) << int{c.raw};
        EXPECT_EQ(*value, c.value) << int{c.raw};  // to the last bit
    }
}

TEST(Reading, EveryLinearizationIsAppliedToTheScaledValue) {
    // M = 1, K2 = -1: raw 20 is 2, raw 5 is 0.5.
    const struct {
        std::uint8_t function;
        std::uint8_t raw;
        double value;
    } cases[] = {
        {0x00, 20, 2},
        {0x01, 20, 0.693147180559945309},
        {0x02, 20, 0.301029995663981195},
        {0x03, 5, -1},
        {0x04, 20, 7.38905609893065023},
        {0x05, 20, 100},
        {0x06, 20, 4},
        {0x07, 5, 2},
        {0x08, 5, 0.25},
        {0x09, 20, 8},
        {0x0A, 20, 1.41421356237309505},
        {0x0B, 80, 2},
        {0x0B, 0xB0, -2},  // -80: a cube root has a sign
    };
    for (const auto& c : cases) {
        Conversion conversion = Linear(NumberFormat::kTwosComplement, 1, 0, 0, -1);
        conversion.linearization = c.function;
        const auto value = conversion.Value(c.raw);
        ASSERT_TRUE(value.has_value()) << int{c.function};
        EXPECT_NEAR(*value, c.value, 1e-12) << int{c.function};
    }
}

TEST(Reading, WhatIsNoNumberHasNoValue) {
    const struct {
        std::uint8_t function;
        int m, resultExponent;
        std::uint8_t raw;
    } cases[] = {
        {0x01, 1, 0, 0},    {0x02, 1, 0, 0xFF}, {0x03, 1, 0, 0}, {0x04, 500, 2, 100},
        {0x05, 500, 0, 99}, {0x06, 500, 0, 99}, {0x07, 1, 0, 0}, {0x0A, 1, 0, 0xFF},
        {0x0C, 1, 0, 1},    {0x0F, 1, 0, 1},    {0x6F, 1, 0, 1}, {0x70, 1, 0, 1},
        {0x7F, 1, 0, 1},    {0x00, 0, 0, 1},
    };
    for (const auto& c : cases) {
        Conversion conversion = Linear(NumberFormat::kTwosComplement, c.m, 0, 0, c.resultExponent);
        conversion.linearization = c.function;
        EXPECT_EQ(conversion.Value(c.raw), std::nullopt) << int{c.function} << " " << int{c.raw};
    }
    EXPECT_EQ(Linear(NumberFormat::kNone, 1, 0, 0, 0).Value(1), std::nullopt);
}

TEST(Reading, ANonLinearSensorIsConvertedByTheFactorsAskedFor) {
    Conversion conversion = Linear(NumberFormat::kUnsigned, 1, 0, 0, 0);
    const ReadingFactors asked{.m = 3, .b = 5, .bExponent = 1, .resultExponent = -1};
    EXPECT_EQ(conversion.ValueByFactors(10, asked), std::nullopt);  // linear
    conversion.linearization = 0x70;
    EXPECT_EQ(conversion.ValueByFactors(10, asked), 8.0);
    conversion.linearization = 0x7F;
    EXPECT_EQ(conversion.ValueByFactors(10, {.b = 7}), 7.0);  // a constant is what was answered
    EXPECT_EQ(conversion.ValueByFactors(10, {.resultExponent = 1}), std::nullopt);
}

TEST(Reading, FactorsAreSignedAndSplitOverTheirBytes) {
    // M = -2 (3FEh), tolerance 21; B = 341 (155h), accuracy 2B5h = 693 with exponent 3; K2 -3,
    // K1 5.
    const std::vector<std::uint8_t> bytes{0xFE, 0xD5, 0x55, 0x75, 0xAC, 0xD5};
    EXPECT_EQ(ReadingFactors::Parse(bytes), (ReadingFactors{.m = -2,
                                                            .b = 341,
                                                            .bExponent = 5,
                                                            .resultExponent = -3,
                                                            .toleranceHalfCounts = 21,
                                                            .accuracy = 693,
                                                            .accuracyExponent = 3}));
    EXPECT_EQ(ReadingFactors::Parse(std::span(bytes).first(5)), std::nullopt);
}

TEST(Reading, ToleranceAccuracyAndHysteresis) {
    Conversion conversion = Linear(NumberFormat::kUnsigned, -4, 7, 1, -1);
    conversion.factors.toleranceHalfCounts = 3;
    conversion.factors.accuracy = 250;
    EXPECT_EQ(conversion.Tolerance(), 0.6);  // 3 halves of 0.4, and no B in a difference
    EXPECT_EQ(conversion.Difference(2), 0.8);
    EXPECT_EQ(conversion.AccuracyPercent(), 2.5);
    conversion.factors.accuracyExponent = 3;
    EXPECT_EQ(conversion.AccuracyPercent(), 2500);
    conversion.linearization = 0x01;  // along a logarithm a count is not always worth the same
    EXPECT_EQ(conversion.Tolerance(), std::nullopt);
    EXPECT_EQ(conversion.Difference(2), std::nullopt);
}

}  // namespace
}  // namespace ipmi
