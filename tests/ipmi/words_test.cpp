#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "ipmi/entities.h"
#include "ipmi/event_types.h"
#include "ipmi/sensor_types.h"

namespace ipmi {

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
