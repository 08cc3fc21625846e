#include "plugins/ipmisel/texts/sensor_units.h"

#include "tests/plugins/ipmisel/texts/mapping_fixture.h"

namespace {

using ::testing::Contains;
using ::testing::IsSupersetOf;

class SensorUnits : public ipmiseltest::MappingTest {};

// Fields in the order of the record: type, units 1 to 3, linearization, M, B, R and B exponents.
TEST_F(SensorUnits, ConvertsAndFormats) {
    const std::tuple<s_SDR_Mod_Units, int, const char*> cases[] = {
        {{1, 0x00, 1, 0, 0, 2, 0, 0, 0}, 0x20, "64.00 <731>"},
        {{1, 0x00, 1, 0, 0, 0x3FF, 0, 0, 0}, 5, "-5.00 <731>"},
        {{1, 0x00, 4, 0, 0, 195, 0, 0xD, 0}, 0xC8, "39.00 <734>"},
        {{1, 0x00, 4, 0, 0, 1, 0, 0xE, 0}, 150, "1.50 <734>"},
        {{1, 0x00, 18, 0, 0, 1, 3, 2, 0}, 5, "800.00 <748>"},
        {{1, 0x00, 1, 0, 0, 1, 0x3F6, 0, 1}, 5, "-95.00 <731>"},               // B of -10, times 10
        {{1, 0x00, 1, 0, 0, 1, 5, 0, 0xF}, 5, "5.50 <731>"},                   // B over 10
        {{1, 0x00, 1, 0, 0, 0x1FF, 0, 7, 0}, 0xFF, "1303050059776.00 <731>"},  // single precision
        {{1, 0x00, 1, 0, 7, 2, 0, 0, 0}, 32, "32.00 <731>"},
        {{2, 0x00, 1, 0, 0, 2, 0, 0, 0}, 32, "32.00 <731>"},
        {{1, 0x40, 1, 0, 0, 2, 0, 0, 0}, 0xFE, "-1 <731>"},
        {{1, 0x80, 1, 0, 0, 2, 0, 0, 0}, 0xFE, "-2 <731>"},
        {{1, 0xC0, 1, 0, 0, 2, 0, 0, 0}, 0xFE, "508.00 <731>"},
        {{1, 0x01, 0, 0, 0, 1, 0, 0, 0}, 45, "45.00% <730>"},
        {{1, 0x19, 70, 0, 0, 1, 0, 0, 0}, 45, "45.00% <723> <800>"},
        {{1, 0x3A, 70, 22, 0, 1, 0, 0, 0}, 45, "45.00 <727> <800>/<752>"},
        {{1, 0x04, 5, 24, 0, 1, 0, 0, 0}, 45, "45.00 <735>*<754>"},
        {{1, 0x06, 5, 24, 0, 1, 0, 0, 0}, 45, "45.00 reserved units"},
        {{1, 0x00, 93, 0, 0, 1, 0, 0, 0}, 45, "45.00 "},  // no unit, and none of another list
    };
    for (const auto& [units, reading, text] : cases) EXPECT_EQ(Units(&units, reading), text);
    EXPECT_EQ(Units(nullptr, 45), "45.00 <730>");
}

TEST_F(SensorUnits, TracesTheConversion) {
    const s_SDR_Mod_Units units{1, 0, 1, 0, 0, 0x3FF, 0x3F6, 0xE, 1};
    Units(&units, 5);
    EXPECT_THAT(log.Lines(4),
                IsSupersetOf({"SDRType is 1", "Linear sensor.", ". M = 1023", ". FinalM = -1",
                              ". B = 1014", ". FinalB = -10", ". Rexp = 14", ". FinalRexp = -2",
                              ". Bexp = 1", ". FinalBexp = 1", "Value = -5"}));
    EXPECT_EQ(log.All().front().second, "IPMIMapping::GetSensorUnits() function entered.");
    EXPECT_EQ(log.All().back().second, "IPMIMapping::GetSensorUnits() function completed.");
    EXPECT_EQ(log.Lines(0).size(), 0u);
}

TEST_F(SensorUnits, WithinTheBufferAndCutToTheRoomOfAReading) {
    const s_SDR_Mod_Units units{1, 0, 1, 0, 0, 2, 0, 0, 0};
    for (unsigned room = 1; room <= 12; ++room) {
        std::vector<char> out(room, 'x');
        mapping.GetSensorUnits(context.get(), &units, 0x20, out.data(), room);
        EXPECT_EQ(std::string(out.data()), std::string("64.00 <731>").substr(0, room - 1));
    }
    const ipmiseltest::TextFolder wordy("7=\n731=" + std::string(80, 'u') + "\n100=low\n");
    const NQORTQR20::PluginContext other(wordy.path());
    const s_SDR_Mod_Units pair{1, 0x02, 1, 1, 0, 2, 0, 0, 0};
    char out[256] = {};
    mapping.GetThresholdOffset(other.get(), 0x40, 0x20, 0, out, sizeof out, &pair);
    const std::string unit(62, 'u');  // a buffer of 64, and the cut takes one more
    EXPECT_EQ(std::string(out), "low. " + std::string(15, ' ') + "Trigger reading: " +
                                    ("64.00 " + unit + "/" + unit).substr(0, 127) + ".");
}

TEST_F(SensorUnits, OnesComplement) {
    const std::tuple<int, const char*> cases[] = {
        {0xFE, "-1"}, {0x80, "-127"}, {0xFF, "-0"}, {0x00, "0"}, {0x7F, "127"}};
    for (const auto& [value, text] : cases) {
        char out[16];
        EXPECT_EQ(mapping.GetOnesComplement(context.get(), static_cast<char>(value), out, 16), 0);
        EXPECT_STREQ(out, text);
    }
    EXPECT_THAT(log.Lines(4), Contains("IPMIMapping::GetOnesComplement() function completed."));
}

}  // namespace
