#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <set>

#include "ipmi/entities.h"
#include "ipmi/event_offsets.h"
#include "ipmi/event_types.h"
#include "ipmi/sensor_types.h"

namespace ipmi {

std::set<int> OffsetsWithWords(std::uint8_t eventType, std::uint8_t sensorType) {
    std::set<int> offsets;
    for (int offset = 0; offset < 16; ++offset) {
        if (!EventOffsetText(eventType, sensorType, static_cast<std::uint8_t>(offset)).empty()) {
            offsets.insert(offset);
        }
    }
    return offsets;
}

std::set<int> FirstOffsets(int count) {
    std::set<int> offsets;
    for (int offset = 0; offset < count; ++offset) offsets.insert(offset);
    return offsets;
}

TEST(EventOffset, HasWordsForEveryOffsetOfTheStandardAndForNoOther) {
    // Numbers of offsets of table 42-2, then of table 42-3; sensor types that are not listed have
    // none.
    constexpr int kGeneric[] = {0, 12, 3, 2, 2, 2, 2, 9, 2, 2, 9, 8, 4};
    for (int type = 0; type < 0x80; ++type) {
        if (type == kSensorSpecificEvents) continue;
        EXPECT_EQ(OffsetsWithWords(static_cast<std::uint8_t>(type), 0x07),
                  FirstOffsets(type < 13 ? kGeneric[type] : 0))
            << type;
    }
    const std::map<int, int> specific{
        {0x05, 7}, {0x06, 6}, {0x07, 13}, {0x08, 8},  {0x09, 8},  {0x0C, 11}, {0x0D, 9},
        {0x0F, 3}, {0x10, 7}, {0x11, 8},  {0x12, 6},  {0x13, 12}, {0x14, 5},  {0x19, 2},
        {0x1B, 2}, {0x1D, 8}, {0x1E, 5},  {0x1F, 11}, {0x20, 6},  {0x21, 10}, {0x24, 4},
        {0x25, 3}, {0x27, 2}, {0x28, 6},  {0x29, 3},  {0x2A, 4},  {0x2B, 8},  {0x2C, 8}};
    for (int type = 0; type < 0x100; ++type) {
        std::set<int> expected = FirstOffsets(specific.contains(type) ? specific.at(type) : 0);
        if (type == 0x22) expected = {0, 1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11, 12, 14};
        if (type == 0x23) expected = {0, 1, 2, 3, 8};
        EXPECT_EQ(OffsetsWithWords(0x6F, static_cast<std::uint8_t>(type)), expected) << type;
    }
}

TEST(EventOffset, SaysWhatTheStandardSays) {
    const struct {
        std::uint8_t eventType;
        std::uint8_t sensorType;
        std::uint8_t offset;
        const char* text;
    } cases[] = {
        {0x01, 0x01, 0x00, "below the lower non-critical threshold"},
        {0x01, 0x01, 0x03, "risen above the lower critical threshold"},
        {0x01, 0x01, 0x09, "above the upper critical threshold"},
        {0x01, 0x01, 0x0A, "fallen below the upper non-recoverable threshold"},
        {0x04, 0x0D, 0x01, "failure predicted"},
        {0x07, 0x08, 0x02, "critical (from less severe)"},
        {0x08, 0x15, 0x01, "device inserted or present"},
        {0x0B, 0x09, 0x05, "non-redundant, insufficient resources"},
        {0x6F, 0x07, 0x0A, "processor throttled"},
        {0x6F, 0x08, 0x03, "power supply input lost (AC/DC)"},
        {0x6F, 0x0C, 0x01, "uncorrectable memory error (ECC or other)"},
        {0x6F, 0x10, 0x02, "log cleared"},
        {0x6F, 0x13, 0x0B, "bus degraded"},
        {0x6F, 0x22, 0x0E, "power state unknown"},
        {0x6F, 0x23, 0x08, "watchdog timer interrupt"},
        {0x6F, 0x27, 0x00, "LAN heartbeat lost"},
        {0x6F, 0x2C, 0x07, "FRU communication lost"},
    };
    for (const auto& c : cases) {
        EXPECT_EQ(EventOffsetText(c.eventType, c.sensorType, c.offset), c.text);
    }
}

TEST(EventType, HasAClassAndAName) {
    const struct {
        std::uint8_t type;
        EventClass eventClass;
        const char* name;
    } cases[] = {
        {0x00, EventClass::kUnspecified, ""},
        {0x01, EventClass::kThreshold, "Threshold"},
        {0x02, EventClass::kGeneric, "Usage State"},
        {0x07, EventClass::kGeneric, "Severity"},
        {0x0C, EventClass::kGeneric, "ACPI Device Power State"},
        {0x0D, EventClass::kReserved, ""},
        {0x6E, EventClass::kReserved, ""},
        {0x6F, EventClass::kSensorSpecific, "Sensor-specific"},
        {0x70, EventClass::kOem, "OEM"},
        {0x7F, EventClass::kOem, "OEM"},
    };
    for (const auto& c : cases) {
        EXPECT_EQ(ClassOfEventType(c.type), c.eventClass) << +c.type;
        EXPECT_EQ(EventTypeName(c.type), c.name) << +c.type;
    }
}

TEST(SensorType, HasAName) {
    const struct {
        std::uint8_t type;
        const char* name;
    } cases[] = {{0x00, ""},
                 {0x01, "Temperature"},
                 {0x0B, "Other Units-based Sensor"},
                 {0x16, "Microcontroller/Coprocessor"},
                 {0x1D, "System Boot/Restart Initiated"},
                 {0x23, "Watchdog 2"},
                 {0x2C, "FRU State"},
                 {0x2D, ""},
                 {0xBF, ""},
                 {0xC0, "OEM"},
                 {0xFF, "OEM"}};
    for (const auto& c : cases) EXPECT_EQ(SensorTypeName(c.type), c.name) << +c.type;
}

TEST(Entity, HasANameAnInstanceAndMayBeNoPartAtAll) {
    const struct {
        std::uint8_t id;
        std::uint8_t instance;
        const char* text;
        bool physical;
    } cases[] = {{0x0A, 2, "Power Supply 2", true},
                 {0x03, 0x60, "Processor 0", true},
                 {0x03, 0x7F, "Processor 31", true},
                 {0x03, 0x5F, "Processor 95", true},
                 {0x2C, 1, "I/O Module 1", true},
                 {0x35, 1, "Real Time Clock 1", true},
                 {0x41, 1, "Processor 1", true},
                 {0x90, 1, "Chassis-specific Entity 90h 1", true},
                 {0xCF, 1, "Board-set-specific Entity CFh 1", true},
                 {0xD0, 1, "OEM Entity D0h 1", true},
                 {0x21, 1, "System Management Software 1", false},
                 {0x22, 1, "System Firmware 1", false},
                 {0x23, 1, "Operating System 1", false},
                 {0x2E, 1, "Management Controller Firmware 1", false},
                 {0x31, 1, "PCI Express Bus 1", false},
                 {0x00, 1, "", false},
                 {0x36, 1, "", false},
                 {0x43, 1, "", false}};
    for (const auto& c : cases) {
        EXPECT_EQ(EntityText(c.id, c.instance), c.text);
        EXPECT_EQ(IsPhysicalEntity(c.id), c.physical) << c.text;
    }
}

}  // namespace ipmi
