#include "ipmi/sensor_reading.h"

#include <gtest/gtest.h>

#include <vector>

namespace ipmi {
namespace {

using Bytes = std::vector<std::uint8_t>;

TEST(SensorReading, FlagsTellWhetherAnythingIsMeant) {
    const auto reading = SensorReading::Parse(Bytes{0x59, 0xC0, 0x81, 0xFF}).value();
    EXPECT_EQ(reading.raw, 0x59);
    EXPECT_TRUE(reading.eventMessagesEnabled && reading.Available());
    EXPECT_EQ(reading.states, 0x7F81);  // the top bit is reserved
    EXPECT_TRUE(reading.Asserted(7) && !reading.Asserted(1) && !reading.Asserted(15));
    EXPECT_FALSE(SensorReading::Parse(Bytes{0x59, 0xE0, 0, 0})->Available());
    EXPECT_FALSE(SensorReading::Parse(Bytes{0x59, 0x80, 0, 0})->Available());
    EXPECT_FALSE(SensorReading::Parse(Bytes{0x59, 0x40, 0, 0})->eventMessagesEnabled);
}

TEST(SensorReading, ShortAnswersGiveWhatTheyHold) {
    EXPECT_EQ(SensorReading::Parse(Bytes{0x59, 0xC0, 0x81})->states, 0x81);
    EXPECT_EQ(SensorReading::Parse(Bytes{0x59, 0xC0})->states, std::nullopt);
    EXPECT_FALSE(SensorReading::Parse(Bytes{0x59, 0xC0})->Asserted(0));
    EXPECT_FALSE(SensorReading::Parse(Bytes{0x59}).has_value());
    EXPECT_FALSE(SensorReading::Parse({}).has_value());
}

TEST(SensorThresholds, OnlyReadableOnesAreGiven) {
    const Bytes answer{0xD2, 1, 2, 3, 4, 5, 6};
    const auto thresholds = SensorThresholds::Parse(answer).value();
    EXPECT_EQ(thresholds.Get(Threshold::kLowerNonCritical), std::nullopt);
    EXPECT_EQ(thresholds.Get(Threshold::kLowerCritical), 2);
    EXPECT_EQ(thresholds.Get(Threshold::kUpperCritical), 5);
    EXPECT_EQ(thresholds.Get(Threshold::kUpperNonRecoverable), std::nullopt);
    EXPECT_FALSE(SensorThresholds::Parse(std::span(answer).first(6)).has_value());
}

TEST(SensorReadingFactors, TheNextReadingStandsBeforeTheFactors) {
    const Bytes answer{0x60, 7, 0, 9, 0, 0, 0x21};
    const auto asked = SensorReadingFactors::Parse(answer).value();
    EXPECT_EQ(asked.nextReading, 0x60);
    EXPECT_EQ(asked.factors.m, 7);
    EXPECT_EQ(asked.factors.resultExponent, 2);
    EXPECT_FALSE(SensorReadingFactors::Parse(std::span(answer).first(6)).has_value());
    EXPECT_FALSE(SensorReadingFactors::Parse({}).has_value());
}

}  // namespace
}  // namespace ipmi
