#include "ipmi/units.h"

#include <gtest/gtest.h>

namespace ipmi {
namespace {

TEST(Units, BaseModifierRateAndPercentage) {
    const struct {
        SensorUnits units;
        const char* text;
    } cases[] = {
        {{0x00, 4, 0}, "Volts"},
        {{0x80, 1, 0}, "degrees C"},
        {{0x00, 0, 0}, ""},
        {{0x01, 0, 0}, "percent"},
        {{0x01, 18, 0}, "percent RPM"},
        {{0x02, 6, 31}, "Watts/cu feet"},
        {{0x04, 5, 24}, "Amps*hour"},
        {{0x00, 5, 24}, "Amps"},  // a modifier that is not used
        {{0x06, 5, 24}, "Amps"},  // a reserved use
        {{0x02, 5, 0}, "Amps"},
        {{0x28, 89, 0}, "correctable error per hour"},
        {{0x18, 0, 0}, "per second"},
        {{0x38, 6, 0}, "Watts"},  // a reserved rate
        {{0x00, 59, 0}, ""},
        {{0x00, 93, 0}, ""},
        {{0x00, 255, 0}, ""},
    };
    for (const auto& c : cases) EXPECT_EQ(UnitText(c.units), c.text);
    EXPECT_EQ((SensorUnits{0x9F, 0, 0}.Format()), NumberFormat::kTwosComplement);
}

}  // namespace
}  // namespace ipmi
