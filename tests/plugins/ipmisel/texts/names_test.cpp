#include <string>
#include <vector>

#include "plugins/ipmisel/texts/sdr_strings.h"
#include "tests/plugins/ipmisel/texts/mapping_fixture.h"

namespace {

TEST(SensorType, NamesStandardAndOemTypes) {
    const std::tuple<int, unsigned, const char*> cases[] = {{0x00, 0, "Unknown Sensor Type"},
                                                            {0x01, 0x65, "Temperature"},
                                                            {0x14, 0, "Button"},
                                                            {0x28, 0, "Managment Subsystem Health"},
                                                            {0x2C, 0, "FRU State"},
                                                            {0x2D, 0, "Unknown Sensor Type"},
                                                            {0xC1, 0x60, "Drive Status"},
                                                            {0xD1, 0x65, "Drive Status"},
                                                            {0xD1, 0x68, "Drive/Slot Status"},
                                                            {0xD1, 0x94, "CPU 1 Mismatch"},
                                                            {0xC1, 0x97, "CPU 4 Mismatch"},
                                                            {0xC1, 0x98, "Drive/Slot Status"},
                                                            {0xD1, 0x70, "Drive/Slot Status"},
                                                            {0xD0, 0x60, "SEL Fullness"},
                                                            {-1, 0, "Unknown Sensor Type"},
                                                            {0x1000001, 0, "Unknown Sensor Type"}};
    IPMIMapping mapping;
    for (const auto& [sensorType, sensorNumber, name] : cases) {
        char out[128] = "stale";
        EXPECT_EQ(mapping.GetSensorType(nullptr, sensorType, out, 128, sensorNumber), 0);
        EXPECT_STREQ(out, name) << sensorType << " " << sensorNumber;
    }
    char small[5];
    mapping.GetSensorType(nullptr, 0x01, small, sizeof small, 0);
    EXPECT_STREQ(small, "Temp");
}

TEST(SdrString, ExpandsAbbreviationsAndVoltages) {
    const std::string indent = ipmiseltest::kFifteenBlanks;
    const struct {
        std::string in;
        unsigned room;
        std::string out;
    } cases[] = {
        {"CPU1 VCore", 128, indent + "CPU1 Core Voltage "},
        {"CPU  Temp ", 128, indent + "Processor Temperature "},
        {"cpu", 128, indent + "cpu "},
        {"12VSB", 128, indent + "12 Volts Standby "},
        {"3.3V", 128, indent + "3.3 Volts "},
        {"VREF", 128, indent + " Volts "},
        {"5AUX", 128, indent + "Auxiliary 5 Volts "},
        {"5VAUX", 128, indent + "5 Volts "},  // the V is looked for first
        {"", 128, indent},
        {"DIMM", 20, indent + "Memo"},
        {"DIMM", 4, "   "},
        {std::string(200, 'a'), 256, indent + std::string(127, 'a')},
    };
    for (auto c : cases) {
        std::vector<char> out(c.room, 'x');
        EXPECT_EQ(Translate_SDRString(c.in.data(), out.data(), 0, c.room), 0);
        EXPECT_EQ(std::string(out.data()), c.out) << c.in;
    }
}

}  // namespace
