#include <algorithm>
#include <array>
#include <set>

#include "plugins/ipmisel/texts/machine_families.h"
#include "plugins/ipmisel/texts/oem_detail.h"
#include "tests/plugins/ipmisel/texts/mapping_fixture.h"

namespace {

constexpr std::array<std::uint8_t, 13> kBytes{0x57, 0x01, 0x02, 'D', 'i',  's', 'k',
                                              0x00, 'a',  'b',  'c', 0x7F, 0x80};

TEST(OemRecord, LosesNothing) {
    using Operation =
        int (IPMIMapping::*)(NQORTQR20::TCPluginCallbacks*, const std::uint8_t*, char*, unsigned);
    const char* const all = "OEM data: 57 01 02 44 69 73 6B 00 61 62 63 7F 80. Text: \"Disk\"";
    const std::tuple<Operation, const char*> cases[] = {
        {&IPMIMapping::GetOEMxC0, "Manufacturer ID: 131415 (0x020157). OEM data: 44 69"},
        {&IPMIMapping::GetOEMxC1, "Manufacturer ID: 131415 (0x020157). OEM data: 44 69 73 6B"},
        {&IPMIMapping::GetOEMxE0, "OEM data: 57 01 02 44 69 73 6B 00 61 62. Text: \"Disk\""},
        {&IPMIMapping::GetOEMxE1, all},
        {&IPMIMapping::GetOEMxE2, all},
        {&IPMIMapping::GetOEMxE3, all},
    };
    IPMIMapping mapping;
    for (const auto& [operation, text] : cases) {
        char out[128];
        EXPECT_EQ((mapping.*operation)(nullptr, kBytes.data(), out, sizeof out), 0);
        EXPECT_STREQ(out, text);
        EXPECT_EQ((mapping.*operation)(nullptr, kBytes.data(), out, 4), 0);
        EXPECT_EQ(std::string(out), std::string(text).substr(0, 3));
        EXPECT_NE((mapping.*operation)(nullptr, kBytes.data(), out, 0), 0);
        EXPECT_NE((mapping.*operation)(nullptr, nullptr, out, sizeof out), 0);
        EXPECT_NE((mapping.*operation)(nullptr, kBytes.data(), nullptr, 4), 0);
    }
}

class OemDetail : public ipmiseltest::MappingTest {};

TEST_F(OemDetail, NamesBitsAndCodes) {
    const ipmiseltest::Machine machine("SIM-1");
    const struct {
        int sensorType, sensorNumber, data1, data2, data3;
        const char* text;
    } cases[] = {
        {0x02, 0xA0, 0x80, 0x41, 0, "<531>12V Fault(s): 12V A. 12V G. "},
        {0x02, 0xA0, 0x80, 0x00, 0, "<531>12V Fault(s): "},
        {0x02, 0xA0, 0x80, 0x81, 0, "<531>12V Fault(s): 12V A. Unknown OEM value: 80. "},
        {0x1D, 0xA1, 0x80, 0x14, 0, "<531>Reset Source(s): Remote. Southbridge Port 92. "},
        {0x28, 0xA3, 0x80, 0x01, 0, "<531>Ping received: Remote. "},
        {0x28, 0xA3, 0x80, 0x02, 0, "<531>Ping received: Unknown OEM value: 02. "},
        {0x08, 0xB5, 0x80, 0x08, 0, "<531>Tower Power Supply 4 Fault: CSF#. "},
        {0x08, 0xB0, 0x80, 0x00, 0, "<531>Rack Power Supply 1 Fault: Normal Operation. "},
        // Event data 3, when it is declared OEM.
        {0x13, 0xA4, 0xA0, 0x01, 0x20, "<531>PCI fault(s): Slot 1. PCI PME: Slot 6. "},
        {0x13, 0xA4, 0x80, 0x01, 0x20, "<531>PCI fault(s): Slot 1. "},
        {0x0C, 0xA9, 0xA0, 0x80, 0x80,
         "<531>Machine Check on Memory DIMM fault: DIMM 8. DIMM 16. "},
        {0x0C, 0xA9, 0x80, 0x80, 0x80, "<531>Machine Check on Memory DIMM fault: DIMM 8. "},
        // Another sensor, another type, another use of event data 2.
        {0x02, 0xA1, 0x80, 0x41, 0, ""},
        {0x03, 0xA0, 0x80, 0x41, 0, ""},
        {0x02, 0xA0, 0xC0, 0x41, 0, ""},
    };
    for (const auto& c : cases) {
        EXPECT_EQ(Generic(0x03, c.data1, c.data2, c.data3, c.sensorType, c.sensorNumber),
                  std::string("<130>. ") + c.text)
            << c.sensorType << " " << c.sensorNumber;
    }
}

TEST_F(OemDetail, IsLeftOutOnAMachineOfNoFamily) {
    const ipmiseltest::Machine machine("SIM-12");
    int index = 7;
    EXPECT_EQ(ipmisel::FindMachineFamily("SIM-12", &index), nullptr);
    EXPECT_EQ(ipmisel::FindMachineFamily(""), nullptr);
    EXPECT_EQ(index, 7);
    EXPECT_EQ(Generic(0x03, 0x80, 0x41, 0, 0x02, 0xA0), "<130>. ");
}

TEST(MachineFamilies, SimulatedServerReachesTheWholeVocabulary) {
    int index = -1;
    const ipmisel::MachineFamily* const family = ipmisel::FindMachineFamily("SIM-1", &index);
    ASSERT_NE(family, nullptr);
    EXPECT_EQ(index, 0);
    std::set<std::string_view> headings;
    for (const ipmisel::OemDetail& row : family->oemDetails) {
        headings.insert(row.heading);
        EXPECT_TRUE(row.heading.ends_with(": "));
        EXPECT_TRUE(row.form == ipmisel::OemForm::kCode ||
                    row.names.size() <= (row.data == ipmisel::OemData::kBoth ? 16u : 8u));
    }
    EXPECT_EQ(headings.size(), 19u);
    std::set<ipmisel::FirmwareKind> queried;
    for (const auto& query : family->firmwareQueries) queried.insert(query.kind);
    EXPECT_EQ(queried.size(), 3u);
}

}  // namespace
