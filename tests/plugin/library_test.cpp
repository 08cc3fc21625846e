#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <array>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <memory>
#include <sstream>
#include <string>
#include <vector>

#include "host/core/host.h"
#include "tests/support/machine_fixture.h"

// The shared library itself, as the host loads it.

namespace ipmiseltest {
namespace {

using ::testing::IsEmpty;
using ::testing::UnorderedElementsAre;

std::vector<std::string> ExportedNames() {
    const std::unique_ptr<std::FILE, int (*)(std::FILE*)> nm(
        popen(NM " -D --defined-only -P " IPMISEL_PLUGIN, "r"), pclose);
    std::vector<std::string> names;
    std::array<char, 1024> line{};
    while (nm && std::fgets(line.data(), line.size(), nm.get()) != nullptr) {
        names.push_back(std::string(line.data()).substr(0, std::string(line.data()).find(' ')));
    }
    return names;
}

std::string Contents(const std::filesystem::path& file) {
    std::stringstream text;
    text << std::ifstream(file, std::ios::binary).rdbuf();
    return text.str();
}

TEST(Library, ExportsTheEntryPointsAlone) {
    EXPECT_THAT(ExportedNames(),
                UnorderedElementsAre("IPMISELInit", "IPMISELPluginInit", "IPMISELPluginDeInit",
                                     "IPMISELGetData", "IPMISELGetInfo", "IPMISELGetStatus",
                                     "IPMISELGetDataZero", "ExportMessageLog", "ExportReferences"));
}

TEST(Library, StandsBesideItsTexts) {
    const auto copy = std::filesystem::path(IPMISEL_PLUGIN).parent_path() / "ipmisel.INI";
    EXPECT_FALSE(Contents(copy).empty());
    EXPECT_EQ(Contents(copy), Contents(IPMISEL_TEXTS "/ipmisel.INI"));
}

using LoadedPlugin = MachineTest;

TEST_F(LoadedPlugin, RegistersAndCollects) {
    tqrhost::Plugin plugin(IPMISEL_PLUGIN);
    EXPECT_EQ(plugin.Info().name, "IPMISEL");
    nodes[0].selEntries = {SystemEvent(1, 0x01, 0x30)};
    nodes[0].sdrRecords = {FullSensor(1, 0x30, 0x07, 1, "Ambient")};
    OpenMachine();
    EXPECT_EQ(plugin.Collect({"QORSG_IPMILogRecord"}, written).code, 0);
    EXPECT_EQ(written.instances.size(), 1U);
    EXPECT_THAT(log.Lines(0), IsEmpty());

    EXPECT_EQ(plugin.RunExporter("ExportReferences", written), 0);
    EXPECT_EQ(written.instances.size(), 3U);
}

}  // namespace
}  // namespace ipmiseltest
