#include "plugin/discovery.h"

#include <dlfcn.h>

#include "tests/support/machine_fixture.h"

namespace ipmiseltest {
namespace {

using ::testing::ElementsAre;
using ::testing::Pair;

class Discovery : public MachineTest {};

TEST_F(Discovery, MachineTypeIsThatOfTheHost) {
    facts.machineType = "SIM-1";
    OpenMachine();
    std::string type;
    EXPECT_EQ(getMachineType(context.get(), &type).code, 0);
    EXPECT_EQ(type, "SIM-1");
    EXPECT_TRUE(ipmisel::Module().fMTonce);
    EXPECT_THAT(log.All(), ElementsAre(Pair(3, "getMachineType() entered."),
                                       Pair(3, "getMachineType() completed.")));
}

TEST_F(Discovery, BmcIsAnIpmiDeviceStructure) {
    OpenMachine();
    EXPECT_EQ(DiscoverBMC(context.get()), 0U);
    EXPECT_THAT(log.All(), ElementsAre(Pair(3, "Found a Type 38 SMBIOS BMC record")));

    log.Clear();
    facts.smbios = {OemStrings({"CPLD"})};
    OpenMachine();
    EXPECT_EQ(DiscoverBMC(context.get()), 1U);
    EXPECT_THAT(log.All(), ElementsAre(Pair(3, "Did NOT find a Type 38 SMBIOS BMC record")));

    log.Clear();
    EXPECT_EQ(DiscoverBMC(nullptr), 1U);
    EXPECT_THAT(log.All(), ElementsAre(Pair(3,
                                            "Unable to read BMC type from SMBIOS. Invalid "
                                            "Handle was encountered.")));
}

TEST_F(Discovery, PartsAreNamedByAnyOemString) {
    std::vector<std::uint8_t> cut = OemStrings({"CPLD"});
    cut.resize(7);  // in the middle of its only string
    std::vector<std::uint8_t> longHeader = OemStrings({"CPLD"});
    longHeader[1] = 0xFF;
    const struct {
        std::vector<std::vector<std::uint8_t>> structures;
        bool cpld;
        bool fpga;
    } cases[] = {
        {{}, false, false},
        {{OemStrings({"nothing"})}, false, false},
        {{OemStrings({"rev 2 CPLD 0x17"})}, true, false},
        {{OemStrings({" ", "other", "FPGA"})}, false, true},
        {{OemStrings({"first"}), OemStrings({"CPLD", "FPGA"})}, true, true},
        {{SmbiosStructure(12, {0x01}, {"CPLD"})}, false, false},  // another type
        {{cut}, false, false},
        {{longHeader}, false, false},
        {{{11}}, false, false},
    };
    for (const auto& c : cases) {
        facts.smbios = c.structures;
        OpenMachine();
        EXPECT_EQ(DiscoverCPLD(), c.cpld) << &c - cases;
        EXPECT_EQ(DiscoverFPGA(), c.fpga) << &c - cases;
    }
}

TEST_F(Discovery, WalkOverOemStringsIsTraced) {
    facts.smbios = {OemStrings({"first"}), OemStrings({"CPLD"})};
    OpenMachine();
    EXPECT_TRUE(DiscoverCPLD());
    EXPECT_THAT(log.Lines(3),
                ElementsAre("SMBIOSInfo::getSMBIOSInfo - Retrieving first SMBIOS structure",
                            "SMBIOSInfo::getSMBIOSInfo - Retrieving the next SMBIOS structure."));

    ipmisel::Module().gPluginHandle = nullptr;
    EXPECT_FALSE(DiscoverCPLD());
    EXPECT_TRUE(Logged(1,
                       "SMBIOSInfo::getSMBIOSInfo - Invalid handle to extended BIOS data area. "
                       "Unable to retrieve information from SMBIOS."));
}

TEST_F(Discovery, DriverProbesTellOfTheOneLibrary) {
    for (const auto probe : {DiscoverQORSP6WDriver, DiscoverOSADriver, DiscoverMSIDriver}) {
        EXPECT_TRUE(probe());
    }
    void* const driver = dlopen(TEST_DRIVER, RTLD_NOW);
    ASSERT_NE(driver, nullptr) << dlerror();
    for (const auto probe : {DiscoverQORSP6WDriver, DiscoverOSADriver, DiscoverMSIDriver}) {
        EXPECT_FALSE(probe());
    }
    dlclose(driver);
    EXPECT_TRUE(DiscoverOSADriver());
}

}  // namespace
}  // namespace ipmiseltest
