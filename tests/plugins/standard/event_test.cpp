#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "plugins/standard/event_key.h"
#include "tests/plugins/standard/log_builder.h"

namespace standard {

using testing::EndsWith;
using testing::StartsWith;

TEST(EventKey, IsTheDigestOfTheSystemAndTheRecord) {
    LogBuilder log;
    log.node.log.push_back(
        *ipmi::ParseSelRecord(ipmi::SelBytes{0x01, 0x00, 0x02, 0xDA, 0x3D, 0xAD, 0x69, 0x41, 0x00,
                                             0x04, 0x10, 0x09, 0x6F, 0x02, 0xFF, 0xFF}));
    log.node.systemName = "node1";
    // Each by sha256sum over the identity and the record.
    EXPECT_EQ(log.Derive()[0].key, "0a25d5b3490137c98877a3b3f4f6de68");
    log.node.serialNumber = "SN1";
    EXPECT_EQ(log.Derive()[0].key, "87b00141c664637ba39cd4b82815dd17");
    log.node.guid = ipmi::Guid{0, 1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11, 12, 13, 14, 15};
    EXPECT_EQ(log.Derive()[0].key, "c3a6cf98116ac3da61989c6d9be33915");
}

TEST(EventText, IsOneForEveryKindOfRecord) {
    LogBuilder log;
    log.Event(kMemory, 0x80, kAsserted, {0x30, 0xFF, 0x04})
        .Event(kPowerSupply, 0x71, kDeasserted, {0x03, 0xFF, 0xFF})
        .Event(0x07, 0x91, 0x70, {0xA3, 0x12, 0x34})
        .Event(0xC1, 0x91, kAsserted, {0x03, 0xFF, 0xFF})
        .Event(0x01, 0x30, kAsserted, {0x03, 0xFF, 0xFF})
        .Event(0x01, 0x30, 0x0D, {0x03, 0xFF, 0xFF})
        .Event(0x01, 0x30, 0x00, {0x03, 0xFF, 0xFF})
        .Record(0xC1, {1, 2, 3, 0x69, 0x57, 0x01, 0x00, 7, 8, 9, 10, 11, 12})
        .Record(0xE1, {1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11, 12, 13})
        .Record(0x03, {1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11, 12, 13})
        .Record(0xC0, {1, 2, 3, 0x69, 0x3A, 0xCD, 0x00, 0xC0, 0xBF, 0x00, 0x3B, 0xFD, 0x00});
    const struct {
        const char *sentence, *vendorData;
    } expected[] = {
        {"Memory sensor 80h: correctable memory error (ECC or other), memory module 4", ""},
        {"Power Supply sensor 71h: no longer: power supply input lost (AC/DC)", ""},
        {"Processor sensor 91h: vendor-specific event, type 70h, offset 3", "1234"},
        {"OEM sensor 91h: vendor-specific event, sensor type C1h, offset 3", ""},
        {"Temperature sensor 30h: event of sensor type 01h, offset 3, not defined by IPMI", ""},
        {"Temperature sensor 30h: event of type 0Dh, offset 3, not defined by IPMI", ""},
        {"Temperature sensor 30h: unspecified event, offset 3", ""},
        {"vendor-specific record, type C1h, manufacturer 343", "0708090a0b0c"},
        {"vendor-specific record, type E1h", "0102030405060708090a0b0c0d"},
        {"record of type 03h, not defined by IPMI", "0102030405060708090a0b0c0d"},
        {"correctable PCI Express error of device 0000:3b:1f.5", ""},
    };
    const auto events = log.Derive();
    ASSERT_EQ(events.size(), std::size(expected));
    for (std::size_t i = 0; i < events.size(); ++i) {
        EXPECT_EQ(events[i].sentence, expected[i].sentence);
        EXPECT_EQ(events[i].vendorData, expected[i].vendorData) << expected[i].sentence;
    }
}

TEST(EventText, NamesPartSensorReadingAndThreshold) {
    LogBuilder log;
    log.Temperature(0x30, "CPU1 Temp", {.id = 0x03, .instance = 1});
    log.Event(0x01, 0x30, 0x01, {0x59, 96, 95}).Event(0x01, 0x30, 0x81, {0x49, 93, 95});
    const auto events = log.Derive();
    EXPECT_EQ(events[0].sentence,
              "Processor 1, CPU1 Temp: above the upper critical threshold (reading 96 degrees C, "
              "threshold 95 degrees C)");
    EXPECT_EQ(events[0].reading, 96.0);
    EXPECT_EQ(events[0].threshold, 95.0);
    EXPECT_EQ(events[0].unit, "degrees C");
    EXPECT_EQ(events[1].sentence,
              "Processor 1, CPU1 Temp: no longer: above the upper critical threshold (reading 93 "
              "degrees C)");
    EXPECT_EQ(events[1].threshold, std::nullopt);
}

TEST(EventText, AReadingThatNobodyCanConvertIsToldRaw) {
    LogBuilder log;
    log.Temperature(0x31, "Fan 1").sensor.sensorType = 0x04;  // of another type than the events
    log.Event(0x02, 0xDD, 0x01, {0x52, 0x13, 0xBA})
        .Event(0x02, 0xDD, 0x01, {0x42, 0x13, 0xBA})
        .Event(0x01, 0x31, 0x01, {0x52, 0x13, 0xBA});
    const auto events = log.Derive();
    EXPECT_EQ(events[0].sentence,
              "Voltage sensor DDh: below the lower critical threshold (raw reading 13h, raw "
              "threshold BAh)");
    EXPECT_EQ(events[0].reading, std::nullopt);
    EXPECT_THAT(events[1].sentence, EndsWith("(raw reading 13h)"));
    EXPECT_EQ(events[2].sentence,
              "Fan 1: below the lower critical threshold (raw reading 13h, raw threshold BAh)");
}

TEST(EventText, NamesAPartThatIsCalledAsItsSensorOnceAndNoneOfASoftwareEvent) {
    LogBuilder log;
    log.Sensor(0x53, 0x04, 0x04, "Fan 3", {.id = 0x1D, .instance = 3});
    log.Sensor(0x03, 0x23, 0x6F, "Watchdog", {.id = 0x06, .instance = 1});
    log.Event(0x04, 0x53, 0x04, {0x01, 0xFF, 0xFF})
        .Event(0x23, 0x03, kAsserted, {0x01, 0xFF, 0xFF});
    const auto events = log.Derive();
    EXPECT_EQ(events[0].sentence, "Fan 3: failure predicted");
    EXPECT_EQ(events[0].part.parts.size(), 1u);
    EXPECT_EQ(events[1].sentence, "Watchdog: hard reset by the watchdog");
    EXPECT_TRUE(events[1].part.parts.empty());
}

TEST(EventText, NamesASensorWithoutANameOnlyWhereThereIsNoPart) {
    LogBuilder log;
    log.Event(kMemory, 0x80, kAsserted, {0x30, 0xFF, 0x04});
    Event event = log.Derive()[0];
    EXPECT_EQ(SubjectText(event), "Memory sensor 80h");
    event.part.parts.push_back({.name = "DIMM 4", .partNumber = {}, .serialNumber = {}});
    EXPECT_EQ(SubjectText(event), "DIMM 4");
    event.part.parts.push_back({.name = "DIMM 5", .partNumber = {}, .serialNumber = {}});
    EXPECT_EQ(SubjectText(event), "one of DIMM 4, DIMM 5");
    SensorFacts named;
    named.sensor.name = "Mem";
    event.sensor = &named;
    EXPECT_EQ(SubjectText(event), "Mem (one of DIMM 4, DIMM 5)");
}

TEST(EventText, TakesASensorByOwnerLunAndNumberNeverByItsNumberAlone) {
    for (const bool otherLun : {false, true}) {
        LogBuilder log;
        SensorFacts& facts = log.Sensor(0x30, 0x08, 0x6F, "PS1 Status");
        (otherLun ? facts.sensor.key.lun : facts.sensor.key.owner) = otherLun ? 1 : 0x2C;
        log.Event(0x08, 0x30, kAsserted, {0x01, 0xFF, 0xFF});
        EXPECT_EQ(log.Derive()[0].sensor, nullptr);
    }
}

TEST(EventText, OfASensorWhoseRecordSensesSomethingElseHasTheNameAtMost) {
    LogBuilder log;
    log.Temperature(0x30, "CPU1 Temp", {.id = 0x03, .instance = 1});
    log.Event(0x02, 0x30, 0x01, {0x59, 96, 95});
    const Event event = log.Derive()[0];
    EXPECT_EQ(event.sentence,
              "CPU1 Temp: above the upper critical threshold (raw reading 60h, raw threshold 5Fh)");
    EXPECT_TRUE(event.part.parts.empty());
    EXPECT_EQ(event.reading, std::nullopt);
}

TEST(EventText, NamesTheSensorThatFailed) {
    LogBuilder log;
    log.Sensor(0x74, 0x01, 0x01, "PCH Temp");
    log.Event(0x28, 0x10, kAsserted, {0xC4, 0x74, 0xFF});
    EXPECT_EQ(log.Derive()[0].text, "sensor failed, sensor 74h, PCH Temp");
}

TEST(EventText, NumbersHaveAtMostThreeDecimals) {
    const struct {
        double value;
        const char* text;
    } cases[] = {{96, "96"},   {12.0960, "12.096"},    {-40, "-40"},
                 {0.5, "0.5"}, {11250, "11250"},       {1.23456, "1.235"},
                 {-0.0, "0"},  {0.000125, "0.000125"}, {-0.0001, "-0.0001"}};
    for (const auto& c : cases) EXPECT_EQ(NumberText(c.value), c.text);
}

TEST(Panic, PiecesOfOneWriterInSequenceAreJoined) {
    const auto piece = [](std::uint8_t writer, std::uint8_t sequence, const char* text) {
        std::array<std::uint8_t, 13> rest{writer, sequence};
        for (std::size_t i = 0; i < 11 && text[i] != 0; ++i) rest[2 + i] = text[i];
        return rest;
    };
    LogBuilder log;
    log.Record(0xF0, piece(0x20, 0, "Fatal excep"))
        .Record(0xF0, piece(0x20, 1, "tion in int"))
        .Event(0x20, 0x01, kAsserted, {0x01, 0xFF, 0xFF})
        .Record(0xF0, piece(0x20, 2, "errupt\x7F\n"))
        .Record(0xF0, piece(0x20, 0, "Oops"))
        .Record(0xF0, piece(0x20, 2, "missing"))
        .Record(0xF0, piece(0x40, 3, "elsewhere"));
    const auto events = log.Derive();
    EXPECT_EQ(events[0].text, "Linux panic: Fatal exception in interrupt");
    EXPECT_EQ(events[0].continuationOf, std::nullopt);
    EXPECT_EQ(events[0].severity, ipmi::Severity::kCritical);
    EXPECT_EQ(events[1].text, "Linux panic, continued: tion in int");
    EXPECT_EQ(events[1].continuationOf, 0u);
    EXPECT_EQ(events[3].continuationOf, 0u);
    for (const std::size_t alone : {4, 5, 6}) EXPECT_EQ(events[alone].continuationOf, std::nullopt);
    EXPECT_EQ(events[5].text, "Linux panic: missing");
}

TEST(EventTime, IsLessTheUtcOffsetAndNoneWithoutAClock) {
    LogBuilder log;
    log.node.utcOffsetMinutes = 60;
    log.Event(kMemory, 1, kAsserted, {0, 0, 0})
        .At(0x20000000)
        .Event(kMemory, 1, kAsserted, {0, 0, 0})
        .At(0xFFFFFFFF)
        .Event(kMemory, 1, kAsserted, {0, 0, 0});
    const auto events = log.Derive();
    EXPECT_EQ(events[0].time, kNoon - 3600);
    EXPECT_EQ(events[1].time, std::nullopt);
    EXPECT_EQ(events[2].time, std::nullopt);
}

TEST(EventTime, IsCorrectedAfterTheLastPlaceWhereTheClockWasSet) {
    constexpr std::array<std::uint8_t, 3> kFirst{0xC5, 0x00, 0xFF};
    constexpr std::array<std::uint8_t, 3> kSecond{0xC5, 0x80, 0xFF};
    constexpr std::array<std::uint8_t, 3> kSet{0x85, 0xFF, 0xFF};
    LogBuilder log;
    log.node.clock = ClockFacts{.offset = 120.4, .uncertainty = 1};
    const auto boot = [&log](std::uint32_t time, std::array<std::uint8_t, 3> data) {
        log.At(time).Event(0x12, 0x0B, kAsserted, data);
    };
    boot(kNoon, kFirst);
    boot(kNoon + 1, kSecond);  // not set
    boot(kNoon + 2, kFirst);
    boot(kNoon + 3600, kSecond);    // an hour ahead
    boot(kNoon + 3500, {0, 0, 0});  // back without a word
    boot(kNoon + 3600, kSet);       // nobody knows how far
    boot(kNoon + 3601, kFirst);
    boot(kNoon + 3602, {0, 0, 0});  // the second of the pair is missing
    boot(kNoon + 3603, {0, 0, 0});
    const auto events = log.Derive();
    const struct {
        bool changed;
        std::optional<std::int64_t> step;
    } expected[] = {{false, {}}, {false, {}}, {false, {}}, {true, 3598}, {true, -100},
                    {true, {}},  {false, {}}, {true, {}},  {false, {}}};
    for (std::size_t i = 0; i < events.size(); ++i) {
        EXPECT_EQ(events[i].clockChanged, expected[i].changed) << i;
        EXPECT_EQ(events[i].clockStep, expected[i].step) << i;
        EXPECT_EQ(events[i].correctedTime.has_value(), i >= 7) << i;
    }
    EXPECT_EQ(events[8].correctedTime, kNoon + 3603 - 120);
}

TEST(EventTime, IsNotCorrectedFromBeforeTheControllerLostItsClock) {
    const struct {
        std::vector<std::uint32_t> times;
        std::vector<bool> corrected;
    } cases[] = {{{kNoon, 100, kNoon + 60, kNoon + 61}, {false, false, true, true}},
                 {{kNoon, 100, 0xFFFFFFFF}, {false, false, false}},
                 {{100, kNoon, 0xFFFFFFFF, kNoon + 1}, {false, true, false, true}}};
    for (const auto& c : cases) {
        LogBuilder log;
        log.node.clock = ClockFacts{.offset = 120, .uncertainty = 1};
        for (const std::uint32_t time : c.times) {
            log.At(time).Event(0x14, 0x01, kAsserted, {0x00, 0xFF, 0xFF});
        }
        std::vector<bool> corrected;
        const auto events = log.Derive();
        for (const LoggedEvent& event : events.Logged()) {
            corrected.push_back(event.correctedTime.has_value());
            EXPECT_EQ(event.clockStep, std::nullopt);
        }
        EXPECT_EQ(corrected, c.corrected);
    }
}

TEST(EventTime, AStepOfOneSecondIsTheClocksResolutionAndOneOfTwoIsNot) {
    for (const std::uint32_t step : {1U, 2U}) {
        LogBuilder log;
        log.Event(0x12, 0x0B, kAsserted, {0xC5, 0x00, 0xFF})
            .At(kNoon + step)
            .Event(0x12, 0x0B, kAsserted, {0xC5, 0x80, 0xFF})
            .At(kNoon)
            .Event(0x14, 0x01, kAsserted, {0x00, 0xFF, 0xFF});
        const auto events = log.Derive();
        EXPECT_EQ(events[1].clockChanged, step == 2);
        EXPECT_EQ(events[2].clockChanged, step == 2);
    }
}

TEST(EventTime, IsNotCorrectedByLessThanIsUncertain) {
    LogBuilder log;
    log.node.clock = ClockFacts{.offset = -0.9, .uncertainty = 1};
    log.Event(kMemory, 1, kAsserted, {0, 0, 0});
    EXPECT_EQ(log.Derive()[0].correctedTime, std::nullopt);
}

TEST(EventSeverity, IsTheUsersElseThePlatformsElseTheTables) {
    LogBuilder log;
    log.Event(kPowerSupply, 0x71, kAsserted, {0x01, 0xFF, 0xFF});
    EXPECT_EQ(log.Derive()[0].severity, ipmi::Severity::kCritical);
    EXPECT_EQ(log.Derive()[0].severityFrom, SeverityOrigin::kStandard);

    ipmi::EventFilter filter;
    filter.enabled = true;
    filter.severity = ipmi::PefSeverity::kNonRecoverable;
    filter.generator = {0x20, 0x00};
    filter.sensorType = filter.sensorNumber = filter.directionAndType = 0xFF;
    filter.offsets = 0x0002;
    log.node.filters.push_back(filter);
    EXPECT_EQ(log.Derive()[0].severity, ipmi::Severity::kFatal);
    EXPECT_EQ(log.Derive()[0].severityFrom, SeverityOrigin::kPlatform);

    ASSERT_EQ(SeverityRules::Parse("none number=0x71", &log.rules), std::nullopt);
    EXPECT_EQ(log.Derive()[0].severity, std::nullopt);
    EXPECT_EQ(log.Derive()[0].severityFrom, SeverityOrigin::kUser);
}

}  // namespace standard
