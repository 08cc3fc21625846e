#include "plugins/ipmisel/pass/entry_points.h"

#include "plugins/ipmisel/pass/state.h"
#include "tests/support/bmc_fixture.h"

namespace ipmiseltest {
namespace {

using namespace ::testing;

class EntryPoints : public ::testing::Test {
protected:
    LogRecorder log;
    NQORTQR20::PluginContext context{IPMISEL_TEXTS};

    EntryPoints() { ipmisel::ResetModuleState(); }
    ~EntryPoints() override { ipmisel::ResetModuleState(); }
};

TEST_F(EntryPoints, StatusIsAlwaysNotStarted) {
    EXPECT_EQ(IPMISELGetStatus().code, 3);
    EXPECT_EQ(IPMISELPluginInit(context.get()).code, 0);
    EXPECT_EQ(IPMISELGetStatus().code, 3);
    EXPECT_EQ(IPMISELPluginDeInit(context.get()).code, 0);
    EXPECT_EQ(IPMISELGetStatus().code, 3);
}

TEST_F(EntryPoints, RefusedRegistrationIsOneErrorLine) {
    IPMISELPluginInit(context.get());
    IPMISELInit();  // the host loads no plug-in now
    EXPECT_THAT(log.All(), ElementsAre(Pair(0, "Couldn't register plugin!")));
    EXPECT_EQ(ipmisel::Module().gPluginHandle, context.get());
    const NQORTQR20::PluginContext second(IPMISEL_TEXTS);
    EXPECT_EQ(IPMISELPluginInit(second.get()).code, 0);
    EXPECT_EQ(ipmisel::Module().gPluginHandle, second.get());
}

}  // namespace
}  // namespace ipmiseltest
