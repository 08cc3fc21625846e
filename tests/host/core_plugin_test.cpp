#include <gmock/gmock.h>

#include <cstdlib>
#include <filesystem>

#include "host/core/host.h"
#include "tests/support/bmc_fixture.h"
#include "tests/support/temporary_folder.h"
#include "tqr/log.h"

namespace {

using namespace NQORTQR20;
using NQORTQR20::Instance;
using namespace ::testing;

class PluginLoading : public ::testing::Test {
protected:
    ~PluginLoading() override { unsetenv("TEST_PLUGIN_FAULT"); }
    /// The line for the user when the file cannot be loaded.
    static std::string Failure(const std::filesystem::path& file) {
        try {
            const NQORTQR20::Plugin plugin(file);
        } catch (const NQORTQR20::PluginError& error) {
            return error.what();
        }
        return "loaded";
    }
    ipmiseltest::LogRecorder log;
    ipmiseltest::InstanceRecorder sink;
};

TEST_F(PluginLoading, DrivesAPlugin) {
    for (int round = 0; round < 2; ++round) {
        {
            NQORTQR20::Plugin plugin(TEST_PLUGIN);
            EXPECT_EQ(plugin.Info().name, "TEST");
            EXPECT_EQ(plugin.Info().version, "1.2");
            EXPECT_EQ(plugin.Info().interfaceVersion, "1.0");
            EXPECT_EQ(plugin.Collect({"B", "A"}, sink).code, kStatusBadTime);
            EXPECT_EQ(plugin.RunExporter("TestExporter", sink), 7);
            EXPECT_EQ(plugin.RunExporter("NoExporter", sink), std::nullopt);
        }
        const auto folder = std::filesystem::canonical(TEST_PLUGIN).parent_path();
        EXPECT_THAT(std::exchange(sink.instances, {}),
                    ElementsAre(Field(&Instance::className, "B"), Field(&Instance::className, "A"),
                                Field(&Instance::className, (folder / "ipmisel").string())));
        // Loaded anew, it registers anew: once, and with a copy of its record.
        EXPECT_THAT(log.Lines(ILogger::kInfo),
                    ElementsAre("registered 0, again 3", "de-initialised"));
        log.Clear();
    }
}

TEST_F(PluginLoading, PluginThatCannotBeUnloadedIsLoadedAgain) {
    for (int round = 0; round < 2; ++round) {
        NQORTQR20::Plugin plugin(TEST_PLUGIN_RESIDENT);
        EXPECT_EQ(plugin.Info().name, "TEST");
        // While it is in use, its one registration belongs to the first.
        EXPECT_THAT(Failure(TEST_PLUGIN_RESIDENT), HasSubstr("not register"));
    }
    EXPECT_THAT(log.Lines(ILogger::kInfo),
                ElementsAre("registered 0, again 3", "de-initialised", "de-initialised"));
}

TEST_F(PluginLoading, ExceptionsOfThePluginAreFailures) {
    {
        NQORTQR20::Plugin plugin(TEST_PLUGIN);
        setenv("TEST_PLUGIN_FAULT", "throw", 1);
        EXPECT_EQ(plugin.Collect({"A"}, sink).code, kStatusFailed);
    }
    EXPECT_THAT(log.Lines(ILogger::kError),
                ElementsAre(HasSubstr("thrown by the plug-in"), HasSubstr("thrown")));
}

TEST_F(PluginLoading, FailureSaysInOneLineWhatAndWhatToDo) {
    const ipmiseltest::TemporaryFolder folder;
    const struct {
        const char* fault;
        std::string file;
        const char* why;
    } cases[] = {
        {"", "/nonexistent/x.pi", "No such file"},
        {"", folder.Write("text.pi", "text"), "no library"},
        {"silent", TEST_PLUGIN, "not register"},
        {"size", TEST_PLUGIN, "not register"},
        {"callback", TEST_PLUGIN, "not register"},
        {"no version", TEST_PLUGIN, "version \"\" of the plug-in interface"},
        {"1.2", TEST_PLUGIN, "version \"1.2\" of the plug-in interface and this host has 1."},
        {"2.0", TEST_PLUGIN, "version \"2.0\""},
        {"0.9", TEST_PLUGIN, "version \"0.9\""},
        {"1", TEST_PLUGIN, "version \"1\""},
        {"1.0x", TEST_PLUGIN, "version \"1.0x\""},
        {"", TEST_PLUGIN_DAMAGED, "table of classes is damaged"},
        {"initialise", TEST_PLUGIN, "status 4 (Out of memory)"},
        {"throw at start", TEST_PLUGIN, "status 3"}};
    for (const auto& c : cases) {
        setenv("TEST_PLUGIN_FAULT", c.fault, 1);
        EXPECT_THAT(Failure(c.file), AllOf(HasSubstr(c.file), HasSubstr(c.why), HasSubstr("; "),
                                           Not(HasSubstr("\n"))))
            << c.fault;
    }
    EXPECT_THAT(log.Lines(ILogger::kInfo),
                Not(Contains("de-initialised")));  // what did not start is not stopped
    for (const char* version : {"", "1.1"}) {
        setenv("TEST_PLUGIN_FAULT", version, 1);
        EXPECT_EQ(Failure(TEST_PLUGIN), "loaded") << version;
    }
}

}  // namespace
