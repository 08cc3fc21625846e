#include "plugins/standard/event_state.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/plugins/standard/log_builder.h"

namespace standard {

using testing::ElementsAre;

// "open", "resolved by 2", "resolved", "momentary", "-".
std::vector<std::string> States(const LogBuilder& log) {
    std::vector<std::string> states;
    const Events events = log.Derive();
    for (const LoggedEvent& event : events.Logged()) {
        std::string text = event.state ? std::string(EventStateName(*event.state)) : "-";
        if (event.resolvedBy) text += " by " + std::to_string(*event.resolvedBy);
        states.push_back(text);
    }
    return states;
}

constexpr std::array<std::uint8_t, 3> Offset(std::uint8_t offset) { return {offset, 0xFF, 0xFF}; }

TEST(EventState, AFaultIsOpenUntilItsOffsetIsDeasserted) {
    LogBuilder log;
    log.Event(kPowerSupply, 0x71, kAsserted, Offset(3))
        .Event(kPowerSupply, 0x71, kAsserted, Offset(1))
        .Event(kPowerSupply, 0x71, kDeasserted, Offset(3))
        .Event(kPowerSupply, 0x71, kAsserted, Offset(3));
    EXPECT_THAT(States(log), ElementsAre("resolved by 2", "open", "-", "open"));
}

TEST(EventState, AnotherOwnerLunNumberTypeOrModuleResolvesNothing) {
    const auto states = [](auto change) {
        LogBuilder log;
        log.Event(kMemory, 0x80, kAsserted, {0x34, 0xFF, 0x04})
            .Event(kMemory, 0x80, kDeasserted, {0x34, 0xFF, 0x04});
        ipmi::SelBytes bytes = log.node.log[1].bytes;
        change(&bytes);
        log.node.log[1] = *ipmi::ParseSelRecord(bytes);
        return States(log);
    };
    EXPECT_THAT(states([](auto*) {}), ElementsAre("resolved by 1", "-"));
    EXPECT_THAT(states([](auto* b) { (*b)[7] = 0x2C; }), ElementsAre("open", "-"));
    EXPECT_THAT(states([](auto* b) { (*b)[8] = 0x01; }), ElementsAre("open", "-"));
    EXPECT_THAT(states([](auto* b) { (*b)[8] = 0x10; }), ElementsAre("open", "-"));
    EXPECT_THAT(states([](auto* b) { (*b)[10] = 0x08; }), ElementsAre("open", "-"));
    EXPECT_THAT(states([](auto* b) { (*b)[11] = 0x81; }), ElementsAre("open", "-"));
    EXPECT_THAT(states([](auto* b) { (*b)[15] = 0x05; }), ElementsAre("open", "-"));
}

TEST(EventState, AStateThatExcludesItResolvesAFault) {
    LogBuilder log;
    log.Event(0x09, 0x72, 0x0B, Offset(1))
        .Event(0x09, 0x72, 0x0B, Offset(5))
        .Event(0x09, 0x72, 0x0B, Offset(0))
        .Event(0x01, 0x30, 0x01, Offset(7))
        .Event(0x01, 0x30, 0x01, Offset(9))
        .Event(0x01, 0x30, 0x01, Offset(8))
        .Event(0x01, 0x30, 0x01, Offset(6));
    EXPECT_THAT(States(log), ElementsAre("resolved by 2", "resolved by 2", "-", "resolved by 6",
                                         "resolved by 5", "-", "-"));
}

TEST(EventState, ADeassertedGoodStateIsOpenUntilItIsAssertedAgain) {
    LogBuilder log;
    log.Event(0x09, 0x72, 0x8B, Offset(0))
        .Event(0x09, 0x72, 0x0B, Offset(0))
        .Event(kPowerSupply, 0x71, kDeasserted, Offset(0));
    EXPECT_THAT(States(log), ElementsAre("resolved by 1", "-", "open"));
}

TEST(EventState, AReplacedPartResolvesWhatWasOpenBefore) {
    LogBuilder log;
    const ipmi::Entity supply{.id = 0x0A, .instance = 1};
    log.Sensor(0x71, kPowerSupply, 0x6F, "PS1 Status", supply);
    log.Sensor(0x75, 0x08, 0x04, "PS1 Predict", supply);
    log.Sensor(0x76, 0x08, 0x04, "PS2 Predict", {.id = 0x0A, .instance = 2});
    log.Event(kPowerSupply, 0x71, kAsserted, Offset(1))
        .Event(0x08, 0x75, 0x04, Offset(1))
        .Event(0x08, 0x76, 0x04, Offset(1))
        .Event(kPowerSupply, 0x71, kAsserted, Offset(0))    // there, as it was
        .Event(kPowerSupply, 0x71, kDeasserted, Offset(0))  // gone
        .Event(kPowerSupply, 0x71, kAsserted, Offset(2))    // says something while it is gone
        .Event(kPowerSupply, 0x71, kAsserted, Offset(0));   // come
    EXPECT_THAT(States(log), ElementsAre("resolved by 6", "resolved by 6", "open", "-",
                                         "resolved by 6", "open", "-"));
}

TEST(EventState, APartThatCameByAnotherSensorOfItsPlaceIsAbsentNoLonger) {
    LogBuilder log;
    const ipmi::Entity supply{.id = 0x0A, .instance = 1};
    log.Sensor(0x71, kPowerSupply, 0x6F, "PS1 Status", supply);
    log.Sensor(0x75, 0x08, 0x08, "PS1 Presence", supply);
    log.Event(0x08, 0x75, 0x08, Offset(0)).Event(kPowerSupply, 0x71, kAsserted, Offset(0));
    EXPECT_THAT(States(log), ElementsAre("resolved by 1", "-"));
}

TEST(EventState, ACardTakenOutOfABoardsSlotResolvesNothingOfTheBoard) {
    LogBuilder log;
    const ipmi::Entity board{.id = 0x07, .instance = 1};
    log.Sensor(0x0C, 0x21, 0x6F, "Slot 2", board);
    log.Sensor(0x31, 0x02, 0x07, "12V", board);
    log.Event(0x02, 0x31, 0x07, Offset(2))
        .Event(0x21, 0x0C, kAsserted, Offset(0))
        .Event(0x21, 0x0C, kDeasserted, Offset(2))
        .Event(0x21, 0x0C, kAsserted, Offset(2));
    EXPECT_THAT(States(log), ElementsAre("open", "resolved by 3", "resolved by 3", "-"));
}

TEST(EventState, AClearedLogResolvesEverythingBefore) {
    LogBuilder log;
    log.Event(kPowerSupply, 0x71, kAsserted, Offset(1))
        .Cleared()
        .Event(kPowerSupply, 0x71, kAsserted, Offset(1));
    EXPECT_THAT(States(log), ElementsAre("resolved by 1", "momentary", "open"));
}

TEST(EventState, WhatIsOverByItselfIsMomentary) {
    LogBuilder log;
    log.Event(0x0F, 1, kAsserted, {0xC2, 0x01, 0xFF})
        .Event(0x20, 1, kAsserted, Offset(1))
        .Event(0x23, 1, kAsserted, Offset(3))
        .Event(0x1E, 1, kAsserted, Offset(0))
        .Event(0x12, 1, kAsserted, Offset(5))
        .Event(0x2A, 1, kAsserted, Offset(0))
        .Event(0x22, 1, kAsserted, Offset(0))
        .Event(0x01, 1, 0x01, Offset(3))
        .Event(0x03, 1, 0x70, Offset(1));
    EXPECT_THAT(States(log), ElementsAre("momentary", "momentary", "momentary", "momentary",
                                         "momentary", "momentary", "-", "-", "-"));
}

TEST(EventState, ThePresentReadingTellsOfStatesAndNotOfWhatWasLatched) {
    constexpr std::uint16_t kUpperCritical = 1 << 4;
    const struct {
        std::uint8_t sensorType;
        std::uint8_t eventType;
        std::uint8_t offset;
        std::uint16_t states;
        const char* state;
        std::optional<bool> stillPresent;
    } cases[] = {
        {0x01, 0x01, 9, kUpperCritical, "open", true},
        {0x01, 0x01, 9, 0, "resolved", false},
        {kPowerSupply, 0x6F, 1, 1 << 1, "open", true},
        {kPowerSupply, 0x6F, 1, 1 << 3, "resolved", false},
        {kMemory, 0x6F, 1, 0, "open", std::nullopt},
        {kMemory, 0x6F, 1, 1 << 1, "open", true},
    };
    for (const auto& c : cases) {
        LogBuilder log;
        SensorFacts& facts = log.Sensor(0x30, c.sensorType, c.eventType, "S");
        LogBuilder::Reads(&facts, 0, c.states);
        log.Event(c.sensorType, 0x30, c.eventType, Offset(c.offset));
        const Event event = log.Derive()[0];
        EXPECT_EQ(EventStateName(*event.state), c.state);
        EXPECT_EQ(event.stillPresent, c.stillPresent);
        EXPECT_EQ(event.resolvedBy, std::nullopt);
    }
}

TEST(EventState, AReadingThatSaysNothingOfTheOffsetResolvesNothing) {
    const auto state = [](auto change) {
        LogBuilder log;
        SensorFacts& facts = log.Sensor(0x30, kPowerSupply, 0x6F, "S");
        LogBuilder::Reads(&facts, 0, 0);
        change(&facts);
        log.Event(kPowerSupply, 0x30, kAsserted, Offset(1));
        return States(log)[0];
    };
    EXPECT_EQ(state([](auto*) {}), "resolved");
    EXPECT_EQ(state([](auto* f) { f->reading->unavailable = true; }), "open");
    EXPECT_EQ(state([](auto* f) { f->reading->scanningEnabled = false; }), "open");
    EXPECT_EQ(state([](auto* f) { f->reading->states.reset(); }), "open");
    EXPECT_EQ(state([](auto* f) { f->reading.reset(); }), "open");
    EXPECT_EQ(state([](auto* f) { f->sensor.readingMask = 0x7FFD; }), "open");
    EXPECT_EQ(state([](auto* f) { f->sensor.eventType = 0x03; }), "open");
    EXPECT_EQ(state([](auto* f) { f->sensor.sensorType = 0x09; }), "open");
}

TEST(EventState, AThresholdThatTheReadingDoesNotCompareIsNotResolvedByIt) {
    LogBuilder log;
    SensorFacts& facts = log.Temperature(0x30, "T");
    facts.sensor.deassertionMask = 0x5000;  // upper critical is not compared
    LogBuilder::Reads(&facts, 20, 0);
    log.Event(0x01, 0x30, 0x01, Offset(7)).Event(0x01, 0x30, 0x01, Offset(9));
    EXPECT_THAT(States(log), ElementsAre("resolved", "open"));
}

}  // namespace standard
