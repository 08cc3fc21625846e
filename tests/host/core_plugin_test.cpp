#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>

#include "host/core/host.h"
#include "tests/support/temporary_folder.h"
#include "tqr/log.h"

namespace {

using namespace NQORTQR20;
using namespace ::testing;

class ClassNames : public tqrhost::WholeInstanceSink {
public:
    std::vector<std::string> names;

protected:
    bool Take(const tqrhost::Instance& instance) override {
        names.push_back(instance.className);
        return true;
    }
};

class PluginLoading : public ::testing::Test {
protected:
    void SetUp() override {
        consumer_ = tqrhost::AddLogConsumer(
            ILogger::kInfo, [this](auto, std::string_view text) { log.emplace_back(text); });
    }
    void TearDown() override {
        unsetenv("TEST_PLUGIN_FAULT");
        tqrhost::RemoveLogConsumer(consumer_);
    }
    /// The line for the user when the file cannot be loaded.
    static std::string Failure(const std::filesystem::path& file) {
        try {
            const tqrhost::Plugin plugin(file);
        } catch (const tqrhost::PluginError& error) {
            return error.what();
        }
        return "loaded";
    }
    std::vector<std::string> log;

private:
    int consumer_ = 0;
};

TEST_F(PluginLoading, DrivesAPlugin) {
    for (int round = 0; round < 2; ++round) {
        ClassNames sink;
        {
            tqrhost::Plugin plugin(TEST_PLUGIN);
            EXPECT_EQ(plugin.Info().name, "TEST");
            EXPECT_EQ(plugin.Info().version, "1.2");
            EXPECT_EQ(plugin.Info().interfaceVersion, "");
            EXPECT_EQ(plugin.Collect({"B", "A"}, sink).code, kStatusBadTime);
            EXPECT_EQ(plugin.RunExporter("TestExporter", sink), 7);
            EXPECT_EQ(plugin.RunExporter("NoExporter", sink), std::nullopt);
        }
        const auto folder = std::filesystem::canonical(TEST_PLUGIN).parent_path();
        EXPECT_THAT(sink.names, ElementsAre("B", "A", (folder / "ipmisel").string()));
        // Loaded anew, it registers anew: once, and with a copy of its record.
        EXPECT_THAT(log, ElementsAre("registered 0, again 3", "de-initialised"));
        log.clear();
    }
}

TEST_F(PluginLoading, PluginThatCannotBeUnloadedIsLoadedAgain) {
    for (int round = 0; round < 2; ++round) {
        tqrhost::Plugin plugin(TEST_PLUGIN_RESIDENT);
        EXPECT_EQ(plugin.Info().name, "TEST");
        // While it is in use, its one registration belongs to the first.
        EXPECT_THAT(Failure(TEST_PLUGIN_RESIDENT), HasSubstr("not register"));
    }
    EXPECT_THAT(log, ElementsAre("registered 0, again 3", "de-initialised", "de-initialised"));
}

TEST_F(PluginLoading, ExceptionsOfThePluginAreFailures) {
    setenv("TEST_PLUGIN_FAULT", "throw", 1);
    {
        tqrhost::Plugin plugin(TEST_PLUGIN);
        ClassNames sink;
        EXPECT_EQ(plugin.Collect({"A"}, sink).code, kStatusFailed);
        EXPECT_EQ(plugin.Info().name, "");
    }
    EXPECT_THAT(log, ElementsAre("registered 0, again 3", HasSubstr("thrown by the plug-in"),
                                 HasSubstr("thrown"), HasSubstr("thrown")));
}

TEST_F(PluginLoading, FailureSaysInOneLineWhatAndWhatToDo) {
    const ipmiseltest::TemporaryFolder folder;
    const struct {
        const char* fault;
        std::string file;
        const char* why;
    } cases[] = {{"", "/nonexistent/x.pi", "No such file"},
                 {"", folder.Write("text.pi", "text"), "no library"},
                 {"silent", TEST_PLUGIN, "not register"},
                 {"size", TEST_PLUGIN, "not register"},
                 {"callback", TEST_PLUGIN, "not register"},
                 {"initialise", TEST_PLUGIN, "status 4 (Out of memory)"},
                 {"throw at start", TEST_PLUGIN, "status 3"}};
    for (const auto& c : cases) {
        setenv("TEST_PLUGIN_FAULT", c.fault, 1);
        EXPECT_THAT(Failure(c.file), AllOf(HasSubstr(c.file), HasSubstr(c.why), HasSubstr("; "),
                                           Not(HasSubstr("\n"))))
            << c.fault;
    }
    EXPECT_THAT(log, Not(Contains("de-initialised")));  // what did not start is not stopped
    unsetenv("TEST_PLUGIN_FAULT");
    EXPECT_EQ(Failure(TEST_PLUGIN), "loaded");
}

}  // namespace
