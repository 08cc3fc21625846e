#include "plugins/standard/finding.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/plugins/standard/log_builder.h"

namespace standard {

using testing::ElementsAre;
using testing::IsEmpty;

std::vector<Finding> Findings(const LogBuilder& log) {
    return DeriveFindings(log.node, log.Derive(), log.tools);
}
std::vector<std::string> Titles(const LogBuilder& log) {
    std::vector<std::string> titles;
    for (const Finding& finding : Findings(log)) titles.push_back(finding.title);
    return titles;
}

constexpr std::array<std::uint8_t, 3> Offset(std::uint8_t offset) { return {offset, 0xFF, 0xFF}; }

TEST(Finding, TenCorrectedErrorsOfOneModuleAreOneWithACount) {
    LogBuilder log;
    for (unsigned i = 0; i < 10; ++i) {
        log.At(kNoon + i).Event(kMemory, 0x80, kAsserted, {0x30, 0xFF, 0x04});
    }
    log.At(kNoon + 20).Event(kMemory, 0x80, kAsserted, {0x30, 0xFF, 0x05});
    log.At(kNoon + 25).Event(kMemory, 0x80, kAsserted, {0x34, 0xFF, 0x04});  // disabled
    log.At(kNoon + 30).Event(kMemory, 0x82, kAsserted, {0x31, 0xFF, 0x04});  // another sensor
    const auto findings = Findings(log);
    ASSERT_EQ(findings.size(), 2u);
    EXPECT_EQ(findings[0].severity, ipmi::Severity::kCritical);
    EXPECT_EQ(findings[0].title,
              "Memory sensor 82h: uncorrectable memory error (ECC or other), memory "
              "module 4 (and 11 other events)");
    EXPECT_EQ(findings[0].events.size(), 12u);
    EXPECT_THAT(findings[0].evidence,
                ElementsAre("2026-03-09T12:00:00Z: Memory sensor 80h: correctable memory error "
                            "(ECC or other), memory module 4",
                            "2026-03-09T12:00:30Z: Memory sensor 82h: uncorrectable memory error "
                            "(ECC or other), memory module 4",
                            "9 more: correctable memory error (ECC or other), memory module 4",
                            "1 more: memory device disabled, memory module 4"));
    EXPECT_THAT(findings[1].events, ElementsAre(10));
}

TEST(Finding, EventsOfOneSensorAreOneAndAThermalTripIsOneOfItsOwn) {
    LogBuilder log;
    log.Event(0x01, 0x30, 0x01, Offset(7))
        .Event(0x01, 0x30, 0x01, Offset(9))
        .Event(0x07, 0x91, kAsserted, Offset(0))
        .Event(0x07, 0x91, kAsserted, Offset(1));
    EXPECT_THAT(
        Titles(log),
        ElementsAre("Temperature sensor 30h: above the upper critical threshold (and 1 other "
                    "event)",
                    "Processor sensor 91h: internal error (IERR)",
                    "Processor sensor 91h: thermal trip"));
}

TEST(Finding, ItsTitleCountsWhatSaysTheSameApartFromTheOthers) {
    LogBuilder log;
    for (const std::uint8_t sensor : {0x30, 0x31, 0x31, 0x32, 0x33, 0x34, 0x35, 0x31}) {
        log.Event(0x28, 0x70, kAsserted, {0xC4, sensor, 0xFF});  // a sensor that failed
    }
    const auto findings = Findings(log);
    ASSERT_EQ(findings.size(), 1u);
    const std::string subject = "Management Subsystem Health sensor 70h: ";
    EXPECT_EQ(findings[0].title,
              subject + "sensor failed, sensor 31h (3 times, and 5 other events)");
    EXPECT_THAT(
        findings[0].evidence,
        ElementsAre("2026-03-09T12:00:00Z: " + subject + "sensor failed, sensor 30h",
                    "2026-03-09T12:00:00Z: " + subject + "sensor failed, sensor 31h",
                    "2 more: sensor failed, sensor 31h", "1 more: sensor failed, sensor 32h",
                    "1 more: sensor failed, sensor 33h", "1 more: sensor failed, sensor 34h",
                    "1 more event"));
}

TEST(Finding, ASlotThatFirmwareAndItsOwnSensorTellOfIsOne) {
    const ipmi::Entity board{.id = 0x10, .instance = 1};
    const struct {
        const char *what, *name;
        std::uint8_t entity, slotType, slotNumber;
        bool twice;  // another sensor of that number
        std::size_t findings;
    } cases[] = {
        {"the same slot", "Slot 2", 0x10, 9, 2, false, 1},
        {"another slot", "Slot 3", 0x10, 9, 2, false, 2},
        {"a name without a number", "Slots", 0x10, 9, 2, false, 2},
        {"two slots of that number", "Slot 2", 0x10, 9, 2, true, 2},
        {"a slot of a drive array", "Slot 2", 0x10, 1, 2, false, 2},
        {"a drive bay", "Slot 2", 0x1A, 9, 2, false, 2},
        {"a slot without a number", "Slot 2", 0x10, 9, 0xFF, false, 2},
    };
    for (const auto& c : cases) {
        for (const bool hasEvent : {false, true}) {
            LogBuilder log;
            SensorFacts& slot =
                log.Sensor(0x0C, 0x21, 0x6F, c.name, {.id = c.entity, .instance = 1});
            LogBuilder::Reads(&slot, 0, 0b101);
            if (c.twice) log.Sensor(0x0D, 0x21, 0x6F, "Riser Slot 2", board);
            log.Event(0x21, 0x80, kAsserted, {0xF0, c.slotType, c.slotNumber});
            if (hasEvent) log.Event(0x21, 0x0C, kAsserted, Offset(0));
            const auto findings = Findings(log);
            EXPECT_EQ(findings.size(), c.findings) << c.what;
            EXPECT_EQ(findings[0].stillPresent.has_value(), c.findings == 1) << c.what;
        }
    }
}

TEST(Finding, WhatIsTakenBackIsNone) {
    LogBuilder log;
    log.Event(kPowerSupply, 0x71, kAsserted, Offset(1))
        .Event(kPowerSupply, 0x71, kDeasserted, Offset(1))
        .Event(0x23, 0x03, kAsserted, Offset(1))
        .Cleared();
    EXPECT_THAT(Findings(log), IsEmpty());
}

TEST(Finding, StopsOfOneBurstAreOneAndComeAfterOpenProblemsOfTheirSeverity) {
    LogBuilder log;
    log.Event(0x23, 0x03, kAsserted, Offset(8))
        .At(kNoon + 10)
        .Event(0x20, 0x01, kAsserted, Offset(1))
        .At(kNoon + 300)
        .Event(0x23, 0x03, kAsserted, Offset(1))
        .At(kNoon + 601)
        .Event(0x23, 0x03, kAsserted, Offset(2))
        .At(kNoon + 2000)
        .Event(kPowerSupply, 0x71, kAsserted, Offset(1));
    const auto findings = Findings(log);
    ASSERT_EQ(findings.size(), 3u);
    EXPECT_TRUE(findings[0].isOpen);
    EXPECT_FALSE(findings[1].isOpen);
    EXPECT_THAT(findings[1].events, ElementsAre(0, 1, 2));
    EXPECT_EQ(findings[1].title,
              "Watchdog 2 sensor 03h: hard reset by the watchdog (and 2 other events)");
    EXPECT_THAT(findings[2].events, ElementsAre(3));
}

TEST(Finding, AMomentaryFaultIsOneForSevenDaysOfTheLogsOwnTime) {
    constexpr std::uint32_t kWeek = 7 * 24 * 3600;
    for (const std::uint32_t age : {kWeek, kWeek + 1}) {
        LogBuilder log;
        log.Event(0x23, 0x03, kAsserted, Offset(1))
            .At(kNoon + age)
            .Event(0x14, 1, kAsserted, Offset(0));
        EXPECT_EQ(Findings(log).size(), age == kWeek ? 1u : 0u);
    }
}

TEST(Finding, AMomentaryFaultWithoutATimeOrOfAClockSetBackIsOneAmongTheLastRecords) {
    for (const std::uint32_t time : {0xFFFFFFFFU, kNoon + 1}) {
        for (const unsigned later : {63U, 64U}) {
            LogBuilder log;
            log.At(time).Event(0x23, 0x03, kAsserted, Offset(1)).At(kNoon);
            for (unsigned i = 0; i < later; ++i) log.Event(0x14, 1, kAsserted, Offset(0));
            EXPECT_EQ(Findings(log).size(), later == 63 ? 1u : 0u) << time;
        }
    }
}

TEST(Finding, NamesTheEventThatBeganItsBurst) {
    LogBuilder log;
    log.Event(0x14, 1, kAsserted, Offset(0))
        .Event(0x04, 0x52, 0x01, Offset(2))  // a fan stops
        .At(kNoon + 200)
        .Event(0x01, 0x33, 0x01, Offset(9))
        .At(kNoon + 501)
        .Event(0x01, 0x34, 0x01, Offset(9));
    const auto findings = Findings(log);
    ASSERT_EQ(findings.size(), 3u);
    EXPECT_EQ(findings[0].firstCause, 1u);
    EXPECT_EQ(findings[1].firstCause, 1u);
    EXPECT_EQ(findings[2].firstCause, 3u);
}

TEST(Finding, ASensorThatIsBadNowIsOneWithoutAnEvent) {
    LogBuilder log;
    SensorFacts& temperature = log.Temperature(0x30, "CPU1 Temp", {.id = 0x03, .instance = 1});
    LogBuilder::Reads(&temperature, 96, 0b011000);
    temperature.thresholds.emplace();
    temperature.thresholds->readable = 0b010000;
    temperature.thresholds->raw[4] = 95;
    SensorFacts& absent = log.Sensor(0x40, 0x0D, 0x08, "Bay 1");
    LogBuilder::Reads(&absent, 0, 0b01);
    SensorFacts& off = log.Sensor(0x41, kPowerSupply, 0x6F, "PS1 Status");
    LogBuilder::Reads(&off, 0, 0b10);
    off.reading->unavailable = true;
    SensorFacts& latched = log.Sensor(0x42, kMemory, 0x6F, "Mem");
    LogBuilder::Reads(&latched, 0, 0b10);
    const auto findings = Findings(log);
    ASSERT_EQ(findings.size(), 1u);
    EXPECT_EQ(findings[0].severity, ipmi::Severity::kCritical);
    EXPECT_EQ(findings[0].title, "Processor 1, CPU1 Temp: above the upper critical threshold");
    EXPECT_EQ(findings[0].stillPresent, true);
    EXPECT_THAT(findings[0].events, IsEmpty());
    EXPECT_THAT(findings[0].evidence,
                ElementsAre("now: Processor 1, CPU1 Temp: above the upper critical threshold "
                            "(reading 96 degrees C, threshold 95 degrees C)",
                            "no open event of it in the log"));
}

TEST(Finding, OfAnOpenEventSaysWhatTheSensorReadsNow) {
    LogBuilder log;
    SensorFacts& temperature = log.Temperature(0x30, "CPU1 Temp");
    LogBuilder::Reads(&temperature, 97, 0b010000);
    log.Event(0x01, 0x30, 0x01, Offset(9));
    const auto findings = Findings(log);
    ASSERT_EQ(findings.size(), 1u);
    EXPECT_EQ(findings[0].evidence.back(), "CPU1 Temp reads 97 degrees C now");
    EXPECT_EQ(findings[0].stillPresent, true);
}

TEST(Finding, IsAsBadAsItsSensorIsNowWhateverTheLogHasOfIt) {
    const struct {
        std::uint8_t offset;  // of the only event
        std::uint8_t present;
        ipmi::Severity severity;
        const char* title;
    } cases[] = {
        {7, 0b011000, ipmi::Severity::kCritical, "CPU1 Temp: above the upper critical threshold"},
        {11, 0b111000, ipmi::Severity::kFatal,
         "CPU1 Temp: above the upper non-recoverable threshold"}};
    for (const auto& c : cases) {
        LogBuilder log;
        SensorFacts& temperature = log.Temperature(0x30, "CPU1 Temp");
        LogBuilder::Reads(&temperature, 97, c.present);
        log.Event(0x01, 0x30, 0x01, Offset(c.offset));
        const auto findings = Findings(log);
        ASSERT_EQ(findings.size(), 1u) << c.title;
        EXPECT_EQ(findings[0].title, c.title);
        EXPECT_EQ(findings[0].severity, c.severity) << c.title;
        EXPECT_EQ(findings[0].stillPresent, true) << c.title;
        EXPECT_EQ(findings[0].events.size(), 1u) << c.title;
    }
}

TEST(Finding, AnEventOfNoDateSaysHowLongAfterTheStartItWas) {
    LogBuilder log;
    log.At(93).Event(kPowerSupply, 0x71, kAsserted, Offset(1));
    log.At(0xFFFFFFFF).Event(kPowerSupply, 0x72, kAsserted, Offset(1));
    const auto findings = Findings(log);
    ASSERT_EQ(findings.size(), 2u);
    EXPECT_THAT(findings[0].evidence,
                ElementsAre("93 s after the controller's start: Power Supply sensor 71h: power "
                            "supply failed"));
    EXPECT_THAT(findings[1].evidence, ElementsAre("Power Supply sensor 72h: power supply failed"));
}

TEST(Burst, EndsWithAGapASetClockAnotherKindOfTimeAndAClearedLog) {
    LogBuilder log;
    const auto press = [&log](std::uint32_t time) {
        log.At(time).Event(0x14, 1, kAsserted, Offset(0));
    };
    press(10);
    press(kNoon);
    press(kNoon + 300);
    log.Record(0xE0, {});
    press(kNoon + 601);
    press(kNoon + 500);  // the clock went back
    log.Cleared();
    press(kNoon + 500);
    EXPECT_THAT(BurstsOf(log.Derive().Logged()), ElementsAre(0, 1, 1, 1, 2, 3, 4, 4));
}

}  // namespace standard
