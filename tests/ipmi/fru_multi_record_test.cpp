#include "ipmi/fru_multi_record.h"

#include <gtest/gtest.h>

#include <vector>

namespace {

using namespace ipmi;
using Bytes = std::vector<std::uint8_t>;

std::string Text(std::uint8_t type, const Bytes& data) {
    return MultiRecordText(ReadMultiRecord(type, data));
}

const Bytes kPowerSupply{0xEE, 0x02, 0x84, 0x03, 0x19, 0x0A, 0x28, 0x23, 0xB0, 0x36, 0x50, 0x46,
                         0x20, 0x67, 0x2F, 0x3F, 0x14, 0x1F, 0x52, 0xA3, 0x02, 0x73, 0x00, 0x07};

// Capacities, currents and times as the bytes count them, voltages in hundredths of a volt.
TEST(FruMultiRecord, PowerSupplyHasAllItsValues) {
    EXPECT_EQ(Text(0x00, kPowerSupply),
              "Power supply; overall capacity 750 W; peak apparent power 900 VA; inrush current 25 "
              "A; inrush interval 10 ms; input voltage range 1 low end 90.00 V; input voltage "
              "range 1 high end 140.00 V; input voltage range 2 low end 180.00 V; input voltage "
              "range 2 high end 264.00 V; input frequency low end 47 Hz; input frequency high end "
              "63 Hz; input dropout tolerance 20 ms; predictive failure signal yes; tachometer "
              "pulses per rotation 2; predictive failure threshold 7 rotations per second; power "
              "factor correction yes; automatic input voltage switch yes; hot swap yes; peak "
              "capacity 850 W; peak capacity held for 10 s; combined voltages 12 V and 5 V; "
              "combined capacity 115 W");
}

TEST(FruMultiRecord, UnspecifiedValuesOfAPowerSupplyAreLeftOut) {
    Bytes data(24, 0x00);
    data[0] = 0xF4;  // above twelve bits is reserved
    data[1] = 0xF1;
    for (const std::size_t at : {2, 3, 4, 18, 19}) data[at] = 0xFF;
    EXPECT_EQ(Text(0x00, data),
              "Power supply; overall capacity 500 W; input voltage range 1 low end 0.00 V; input "
              "voltage range 1 high end 0.00 V; input dropout tolerance 0 ms; predictive failure "
              "signal no; power factor correction no; automatic input voltage switch no; hot swap "
              "no");
}

TEST(FruMultiRecord, APredictiveFailurePinIsToldApartFromATachometer) {
    Bytes data = kPowerSupply;
    data[23] = 0;
    EXPECT_NE(Text(0x00, data).find("; failure signalled by assertion; "), std::string::npos);
    data[17] = 0x0F;
    EXPECT_NE(Text(0x00, data).find("; failure signalled by deassertion; "), std::string::npos);
}

TEST(FruMultiRecord, DcOutputsAndLoadsHaveSignedVoltages) {
    const Bytes dc{0x82, 0x50, 0xFB, 0x28, 0xFB, 0x78, 0xFB, 0x78, 0x00, 0x0A, 0x00, 0xF4, 0x01};
    EXPECT_EQ(Text(0x01, dc),
              "DC output; output 2; on in standby yes; nominal voltage -12.00 V; maximum negative "
              "deviation -12.40 V; maximum positive deviation -11.60 V; ripple and noise 120 mV; "
              "minimum current draw 10 mA; maximum current draw 500 mA");
    EXPECT_EQ(Text(0x02, dc),
              "DC load; output needed 2; nominal voltage -12.00 V; minimum voltage -12.40 V; "
              "maximum voltage -11.60 V; ripple and noise 120 mV; minimum current load 10 mA; "
              "maximum current load 500 mA");
    Bytes extended = dc;
    EXPECT_NE(Text(0x09, extended).find("maximum current draw 5000 mA"), std::string::npos);
    extended[0] |= 0x10;
    EXPECT_NE(Text(0x09, extended).find("maximum current draw 50000 mA"), std::string::npos);
    EXPECT_NE(Text(0x0A, extended).find("maximum current load 50000 mA"), std::string::npos);
    EXPECT_EQ(FixedMultiRecordLength(0x01), dc.size());
    EXPECT_EQ(FixedMultiRecordLength(0x03), 0u);
}

TEST(FruMultiRecord, OtherRecords) {
    const struct {
        std::uint8_t type;
        Bytes data;
        const char* text;
    } cases[] = {
        {0x03, {1, 'h', ':', '/'}, "Management access; system management URL h:/"},
        {0x03, {5, 'n', '1'}, "Management access; component name n1"},
        {0x03, {7, 0x0A, 0x0B}, "Management access; system unique ID 0x0a0b"},
        {0x03, {9, 0x0A}, "Management access; kind 9; data 0x0a"},
        {0x03, {}, "Management access"},
        {0x04,
         {0xD9, 0x7E, 0xF0, 0x0A, 0x05, 0x02, 0x81},
         "Base compatibility; manufacturer ID 32473; entity ID 10; compatibility base 5; first "
         "compatible code 2; mask of compatible codes 0x81"},
        {0x05, {0xD9, 0x7E, 0x00}, "Extended compatibility; manufacturer ID 32473"},
        {0x06, {0x01}, "ASF fixed SMBus device; data 0x01"},
        {0x20, {0x01, 0x02}, "Record 20h; data 0x0102"},
        {0xFA, {0xDA, 0x00, 0x00, 0x7F}, "OEM record fah; manufacturer ID 218; data 0x7f"},
        {0xFA, {0xDA, 0x00}, "OEM record fah; data 0xda00"},
    };
    for (const auto& c : cases) EXPECT_EQ(Text(c.type, c.data), c.text);
}

TEST(FruMultiRecord, DataCutAtAnyLengthHaveTheValuesThatAreWhole) {
    for (const std::uint8_t type : {0x00, 0x01, 0x02, 0x03, 0x04, 0x09, 0xC0}) {
        const std::string whole = Text(type, kPowerSupply);
        std::size_t values = 0;
        for (std::size_t length = 0; length <= kPowerSupply.size(); ++length) {
            const Bytes cut(kPowerSupply.begin(), kPowerSupply.begin() + static_cast<long>(length));
            const auto read = ReadMultiRecord(type, cut).values;
            EXPECT_GE(read.size(), values) << int{type} << " at " << length;
            values = read.size();
        }
        EXPECT_GT(values, 0u);
    }
}

}  // namespace
