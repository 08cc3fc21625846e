#include <gmock/gmock.h>

#include <filesystem>
#include <string>
#include <vector>

#include "host/core/host.h"
#include "host/core/plugin_set.h"
#include "tests/support/bmc_fixture.h"
#include "tests/support/temporary_folder.h"
#include "tqr/classes.h"

namespace {

using namespace NQORTQR20;
using NQORTQR20::ClassInfo;
using NQORTQR20::Instance;
using namespace ::testing;

class Plugins : public ::testing::Test {
protected:
    ipmiseltest::TemporaryFolder folder;
    ipmiseltest::InstanceRecorder sink;

    std::string Install(const char* plugin, const std::string& name) const {
        const auto file = folder.path() / name;
        std::filesystem::copy_file(plugin, file);
        return file.string();
    }
    /// The line for the user when the plug-ins cannot be loaded.
    std::string Failure(const std::vector<std::filesystem::path>& further = {}) const {
        try {
            const NQORTQR20::PluginSet plugins(folder.path(), further);
        } catch (const NQORTQR20::PluginError& error) {
            return error.what();
        }
        return "loaded";
    }
    static std::vector<std::string> Names(const std::vector<ClassInfo>& classes) {
        std::vector<std::string> names;
        for (const ClassInfo& info : classes) names.push_back(info.name);
        return names;
    }
};

TEST_F(Plugins, ATableOfClassesIsReadAsItIsDeclared) {
    Install(TEST_PLUGIN, "a.pi");
    const NQORTQR20::PluginSet plugins(folder.path());
    EXPECT_THAT(Names(plugins.Classes()), ElementsAre("TEST_Last", "TEST_Record", "TEST_Exported"));
    EXPECT_THAT(plugins.DefaultClasses(), ElementsAre("TEST_Last", "TEST_Record"));
    EXPECT_EQ(plugins.FindClass("TEST_Rec"), nullptr);
    const ClassInfo* const record = plugins.FindClass("TEST_Record");
    ASSERT_NE(record, nullptr);
    EXPECT_EQ(record->description, "one per record");
    EXPECT_EQ(record->nodeProperty, "Node");
    EXPECT_TRUE(record->Is(kPerLogRecord) && record->Is(kReadsLog));
    EXPECT_FALSE(record->Is(kReadsSensors) || record->Is(kWrittenAtEnd));
    ASSERT_EQ(record->properties.size(), 2U);
    EXPECT_EQ(record->properties[1].name, "Text");
    EXPECT_EQ(record->properties[1].type, fdrPropertyType::kText);
    EXPECT_EQ(record->properties[0].description, "node, from 1");
}

TEST_F(Plugins, LoadInTheOrderOfTheirNamesWithTheDescribedFirst) {
    Install(TEST_PLUGIN_RESIDENT, "a.pi");
    Install(TEST_PLUGIN, "libipmisel.pi");
    Install(TEST_PLUGIN, "other.so");  // no plug-in by its name
    // The class that both have tells which was loaded first.
    EXPECT_THAT(Failure(), AllOf(HasSubstr("TEST_Last is in two plug-ins"),
                                 ContainsRegex("libipmisel.pi and [^ ]*/a.pi; ")));
}

TEST_F(Plugins, AFileThatIsLoadedAlreadyIsNoOther) {
    const std::string file = Install(TEST_PLUGIN, "a.pi");
    std::filesystem::create_symlink(file, folder.path() / "link");
    EXPECT_EQ(Failure({file, folder.path() / "link"}), "loaded");
    EXPECT_THAT(Failure({TEST_PLUGIN_TWIN}), HasSubstr("two plug-ins"));
    EXPECT_THAT(Failure({"/no/such.pi"}), HasSubstr("/no/such.pi"));
}

TEST_F(Plugins, AFolderWithoutAPluginIsRefused) {
    EXPECT_THAT(Failure(), HasSubstr("no plug-in in " + folder.path().string() + "; "));
    std::filesystem::remove(folder.path());
    EXPECT_THAT(Failure(), HasSubstr("No such file or directory; "));
}

TEST_F(Plugins, WhatFollowsAClassWrittenAtTheEndTakesAPassOfItsOwn) {
    Install(TEST_PLUGIN, "a.pi");
    NQORTQR20::PluginSet plugins(folder.path());
    NQORTQR20::CollectionPlan plan(
        plugins, {"TEST_Exported", "TEST_Record", "NO_Class", "TEST_Last", "TEST_Record"});
    static int passes;
    passes = 0;
    plan.RunPasses(sink, [] { return ++passes <= 2; });
    EXPECT_EQ(passes, 2);
    EXPECT_EQ(sink.instances.size(), 3U);
    EXPECT_EQ(plan.Status().code, kStatusBadTime);  // as the pass ended
    plan.RunExporters(sink);
    EXPECT_EQ(sink.instances.size(), 4U);
    ASSERT_EQ(plan.Statuses().size(), 1U);
    EXPECT_EQ(plan.Statuses()[0].plugin.name, "TEST");
    EXPECT_EQ(plan.Statuses()[0].status.code, kStatusBadTime);  // not the exporter's 7
    EXPECT_THAT(sink.instances, ElementsAre(Field(&Instance::className, "TEST_Record"),
                                            Field(&Instance::className, "TEST_Last"),
                                            Field(&Instance::className, "TEST_Record"), _));
}

TEST_F(Plugins, AFileThatAPluginNeedsIsLookedForWhenItsClassesAreWanted) {
    Install(TEST_PLUGIN, "a.pi");
    const NQORTQR20::PluginSet plugins(folder.path());
    const auto failure = [&](const std::vector<std::string>& classes) -> std::string {
        try {
            plugins.CheckNeededFiles(classes);
        } catch (const NQORTQR20::PluginError& error) {
            return error.what();
        }
        return "fine";
    };
    const std::string file = (folder.path() / "test_plugin.needs").string();
    EXPECT_EQ(failure({"TEST_Record"}),
              "cannot use " + file +
                  ", which the plug-in a.pi needs: No such file or directory; reinstall it");
    EXPECT_EQ(failure({}), "fine");
    std::filesystem::create_directory(file);
    EXPECT_THAT(failure({"TEST_Record"}), HasSubstr("it is no file; "));
    std::filesystem::remove(file);
    folder.Write("test_plugin.needs", "0123456789");
    EXPECT_EQ(failure({"TEST_Record"}), "fine");
    folder.Write("test_plugin.needs", "0123456789a");
    EXPECT_THAT(failure({"TEST_Record"}), HasSubstr("more than 10 bytes; "));
}

TEST_F(Plugins, SettingsOfTheUserAreAnswered) {
    NQORTQR20::SetPluginSettings({{{"severities", "a text"}}, {"rack7", "rack8"}});
    const NQORTQR20::PluginContext context(folder.path());
    const char* text = nullptr;
    EXPECT_EQ(fdrGetOption(context.get(), "severities", &text).code, kStatusOk);
    EXPECT_STREQ(text, "a text");
    EXPECT_EQ(fdrGetOption(context.get(), "other", &text).code, kStatusOk);
    EXPECT_EQ(text, nullptr);
    EXPECT_EQ(fdrGetSystemName(context.get(), 1, &text).code, kStatusOk);
    EXPECT_STREQ(text, "rack8");
    for (const int node : {-1, 2}) {
        EXPECT_EQ(fdrGetSystemName(context.get(), node, &text).code, kStatusOk);
        EXPECT_EQ(text, nullptr) << node;
    }
    NQORTQR20::SetPluginSettings({});
}

}  // namespace
