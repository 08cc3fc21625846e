#include "export/event_message.h"

#include <gtest/gtest.h>

namespace {

using ipmisel::EventMessage;

TEST(EventMessage, RewritesSomeNames) {
    // Entity, instance, sensor type, sensor, deassertion, event.
    const struct {
        EventMessage parts;
        const char* message;
    } cases[] = {
        {{"Processor", "2", "Temperature", "CPU 2 Temp", false, "Too hot. "},
         "Processor 2 (Temperature - CPU 2 Temp): Assertion: Too hot. "},
        {{"Processor", "2", "Temperature", "CPU 2 Temp", true, "Too hot. "},
         "Processor 2 (Temperature - CPU 2 Temp): Deassertion: Too hot. "},
        {{"", "", "Fan", "", false, ""}, "  (Fan - ): Assertion: "},
        // The instance goes with memory, one blank more stays.
        {{"Memory Device", "32", "Memory", "DIMM 3", false, "ECC. "},
         "Memory Device  (Memory - DIMM 3): Assertion: ECC. "},
        {{"Power Unit", "1", "Power Supply", "VRM 1", false, ""},
         "Power Unit 1 (Voltage Regulator Module - VRM 1): Assertion: "},
        {{"Power Unit", "1", "Voltage", "VRM 1", false, ""},
         "Power Unit 1 (Voltage - VRM 1): Assertion: "},
        {{"Unknown", "1", "Fan", "HSDC Fan", false, ""},
         "HS IO Expansion 1 (Fan - HSDC Fan): Assertion: "},
        {{"Unknown", "1", "Fan", "Fan 7", false, ""}, "Fan 7 1 (Fan - Fan 7): Assertion: "},
        {{"Cannot tell", "1", "Fan", "Fan 7", false, ""}, "Fan 7 1 (Fan - Fan 7): Assertion: "},
        // The first occurrence alone, and not the blank beside it.
        {{"Board", "1", "Unknown Sensor Unknown", "X", false, ""},
         "Board 1 ( Sensor Unknown - X): Assertion: "},
    };
    for (const auto& c : cases) EXPECT_EQ(Compose(c.parts), c.message);
}

}  // namespace
