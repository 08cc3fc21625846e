#include "plugins/ipmisel/pass/driver_notice.h"

#include <cstdlib>

#include "tests/support/machine_fixture.h"

namespace ipmiseltest {
namespace {

using namespace ::testing;

class DriverNotice : public MachineTest {
protected:
    DriverNotice() { facts.ipmiDriver = false; }
    ~DriverNotice() override { unsetenv("TQR_ISBOOTABLE"); }

    /// The mark-up form of the one notice of a first pass.
    std::string Markup() {
        ipmisel::ResetModuleState();
        IPMISELPluginInit(context.get());
        EXPECT_EQ(Collect({}), 0);
        const auto notices = NQORTQR20::TakeNotices();
        EXPECT_THAT(notices, SizeIs(1));
        return notices.empty() ? "" : notices[0].markupText;
    }
};

TEST_F(DriverNotice, IsGivenInTwoFormsOnceInTheProcess) {
    facts.smbios.clear();
    Collect({});
    EXPECT_THAT(NQORTQR20::TakeNotices(), IsEmpty()) << "without a BMC";
    facts.smbios = {IpmiDeviceStructure()};
    Collect({});
    const auto notices = NQORTQR20::TakeNotices();
    ASSERT_THAT(notices, SizeIs(1));
    for (const std::string& text : {notices[0].plainText, notices[0].markupText}) {
        EXPECT_THAT(text,
                    StartsWith("A BMC/ZMC was detected, but the IPMI driver is not installed."));
        EXPECT_THAT(text, HasSubstr("If no IPMI driver package is available for your machine type "
                                    "from these links, please use the built in IPMI driver for "
                                    "your Linux release."));
    }
    EXPECT_THAT(notices[0].plainText, Not(HasSubstr("<")));
    EXPECT_THAT(notices[0].markupText,
                HasSubstr("<a href=\"https://docs.kernel.org/driver-api/ipmi.html\">"));
    Collect({});
    EXPECT_THAT(NQORTQR20::TakeNotices(), IsEmpty()) << "again";
    ipmisel::ResetModuleState();
    IPMISELPluginInit(context.get());
    facts.ipmiDriver = true;
    Collect({});
    EXPECT_THAT(NQORTQR20::TakeNotices(), IsEmpty()) << "with a driver";
}

TEST_F(DriverNotice, HasNoLinksWhereNobodyCanFollowThem) {
    EXPECT_NE(Markup(), "");

    setenv("TQR_ISBOOTABLE", "no", 1);
    EXPECT_NE(Markup(), "");
    setenv("TQR_ISBOOTABLE", "yes", 1);
    EXPECT_EQ(Markup(), "");
    unsetenv("TQR_ISBOOTABLE");

    facts.machineType = "Merrowgate";
    EXPECT_EQ(Markup(), "");
    facts.machineType = "Merrowgate 2";
    EXPECT_NE(Markup(), "");

    for (const std::uint8_t type : {10, 11, 41}) {
        facts.smbios = {IpmiDeviceStructure(),
                        SmbiosStructure(type, {0x83, 0x01}, {"TSB II adapter"})};
        EXPECT_EQ(Markup(), "") << int{type};
    }
}

}  // namespace
}  // namespace ipmiseltest
