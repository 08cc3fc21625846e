#include "plugins/ipmisel/pass/discovery.h"

#include <dlfcn.h>

#include "tests/support/machine_fixture.h"

namespace ipmiseltest {
namespace {

using namespace ::testing;

class Discovery : public MachineTest {};

// Whether one is found is seen in the passes.
TEST_F(Discovery, BmcNeedsTheHandleOfThePlugin) {
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
        bool cpld, fpga;
    } cases[] = {
        {{}, false, false},
        {{OemStrings({"nothing"})}, false, false},
        {{OemStrings({"rev 2 CPLD 0x17"})}, true, false},
        {{OemStrings({" ", "other", "FPGA"})}, false, true},
        {{SmbiosStructure(12, {0x01}, {"CPLD"})}, false, false},  // another type
        {{cut}, false, false},
        {{longHeader}, false, false},
        {{{11}}, false, false},
        {{OemStrings({"first"}), OemStrings({"CPLD", "FPGA"})}, true, true},
    };
    for (const auto& c : cases) {
        facts.smbios = c.structures;
        OpenMachine();
        EXPECT_EQ(DiscoverCPLD(), c.cpld) << &c - cases;
        log.Clear();
        EXPECT_EQ(DiscoverFPGA(), c.fpga) << &c - cases;
    }
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
