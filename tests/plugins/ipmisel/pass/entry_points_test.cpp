#include "plugins/ipmisel/pass/entry_points.h"

#include <array>
#include <cstdio>
#include <memory>

#include "plugins/ipmisel/pass/state.h"
#include "tests/support/bmc_fixture.h"

namespace ipmiseltest {
namespace {

using namespace ::testing;

class EntryPoints : public ::testing::Test {
protected:
    LogRecorder log;
    tqrhost::PluginContext context{IPMISEL_TEXTS};

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

TEST_F(EntryPoints, AreAllThatTheLibraryExports) {
    const std::unique_ptr<std::FILE, int (*)(std::FILE*)> nm(
        popen(NM " -D --defined-only -P " IPMISEL_PLUGIN, "r"), pclose);
    std::vector<std::string> names;
    std::array<char, 1024> line{};
    while (nm && std::fgets(line.data(), line.size(), nm.get()) != nullptr) {
        names.push_back(std::string(line.data()).substr(0, std::string(line.data()).find(' ')));
    }
    EXPECT_THAT(names,
                UnorderedElementsAre("IPMISELInit", "IPMISELPluginInit", "IPMISELPluginDeInit",
                                     "IPMISELGetData", "IPMISELGetInfo", "IPMISELGetStatus",
                                     "IPMISELGetDataZero", "ExportMessageLog", "ExportReferences",
                                     "fdrPluginClasses"));
}

TEST_F(EntryPoints, RefusedRegistrationIsOneErrorLine) {
    IPMISELPluginInit(context.get());
    IPMISELInit();  // the host loads no plug-in now
    EXPECT_THAT(log.All(), ElementsAre(Pair(0, "Couldn't register plugin!")));
    EXPECT_EQ(ipmisel::Module().gPluginHandle, context.get());
    const tqrhost::PluginContext second(IPMISEL_TEXTS);
    EXPECT_EQ(IPMISELPluginInit(second.get()).code, 0);
    EXPECT_EQ(ipmisel::Module().gPluginHandle, second.get());
}

}  // namespace
}  // namespace ipmiseltest
