#include "program/commands/configuration.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <CLI/CLI.hpp>
#include <algorithm>
#include <cstdlib>

#include "program/commands/failure.h"
#include "tests/support/temporary_folder.h"

namespace {

using ipmisel::Command;
using ipmisel::Configuration;
using ipmisel::ConfigurationFiles;
using ipmisel::Failure;
using testing::HasSubstr;

/// A command line of two commands, and files with options for them.
class ConfigurationTest : public testing::Test {
protected:
    ConfigurationTest() {
        collect->add_option("--guest", guest)->excludes(collect->add_option("--user", user));
        collect->add_option("--window", window)->check(CLI::Range(1, 32));
        collect->add_option("--class", classes)->allow_extra_args(false);
        collect->add_flag("!--no-pager", pager);
        watch->add_option("--every", every);
        watch->add_option("--user", watchUser);
    }
    ~ConfigurationTest() override { unsetenv("IPMISEL_USER"); }

    std::string Write(const std::string& text) {
        return folder.Write("conf" + std::to_string(files_++), text);
    }
    Configuration Read(const std::vector<std::string>& texts) {
        std::vector<std::string> files;
        for (const std::string& text : texts) files.push_back(Write(text));
        return {files, {{collect, {}}, {watch, {}}}};
    }
    void Collect(const std::vector<std::string>& texts, std::vector<std::string> arguments = {}) {
        std::reverse(arguments.begin(), arguments.end());
        arguments.emplace_back("collect");
        app.parse(std::move(arguments));
        Read(texts).ApplyTo(collect);
    }
    std::string Refusal(const std::string& text) {
        try {
            Collect({text});
        } catch (const Failure& failure) {
            EXPECT_EQ(failure.exitStatus, ipmisel::kExitUsage);
            return failure.what();
        }
        return "nothing was refused";
    }

    ipmiseltest::TemporaryFolder folder;
    CLI::App app{"", "ipmisel"};
    CLI::App* collect = app.add_subcommand("collect");
    CLI::App* watch = app.add_subcommand("watch");
    std::string user, guest, watchUser;
    std::vector<std::string> classes;
    int window = 0, every = 0;
    bool pager = true;

private:
    int files_ = 0;
};

TEST_F(ConfigurationTest, OptionsOfEveryKindStandInAFile) {
    Collect(
        {"# a comment\nuser = \"night shift\"\nno-pager\n\n[collect]\nwindow=4\nclass = A, B\n"});
    EXPECT_EQ(user, "night shift");
    EXPECT_EQ(window, 4);
    EXPECT_EQ(classes, (std::vector<std::string>{"A", "B"}));
    EXPECT_FALSE(pager);
}

TEST_F(ConfigurationTest, CommandLineThenEnvironmentThenTheFirstFileCounts) {
    const std::vector<std::string> files{"user = first\n", "user = second\nwindow = 2\n"};
    Collect(files);
    EXPECT_EQ(user, "first");
    EXPECT_EQ(window, 2);
    setenv("IPMISEL_USER", "environment", 1);
    Collect(files);
    EXPECT_EQ(user, "environment");
    Collect(files, {"--user", "line"});
    EXPECT_EQ(user, "line");
}

TEST_F(ConfigurationTest, WhatTheCommandLineHasInsteadGoesBeforeTheFile) {
    Collect({"guest = file\n"}, {"--user", "line"});
    EXPECT_EQ(guest, "");
    EXPECT_EQ(user, "line");
}

TEST_F(ConfigurationTest, ACommandsOwnSectionGoesBeforeWhatIsForAll) {
    Collect({"user = all\n[collect]\nuser = own\n[watch]\nuser = other\nevery = 60\n"});
    EXPECT_EQ(user, "own");
    EXPECT_EQ(watchUser, "") << "another command's";
}

TEST_F(ConfigurationTest, ALineThatCannotHoldIsRefusedWithItsFile) {
    const struct {
        const char *text, *problem;
    } cases[] = {
        {"usre = x\n", "no command has an option \"usre\""},
        {"[collect]\nevery = 60\n", "collect has no option \"every\""},
        {"[colect]\nuser = x\n", "there is no command \"colect\""},
        {"[group]\nhosts = a\n", "a group has a name"},
        {"[group.a]\nclass = x\n", "group a has no option \"class\""},
        {"window = 33\n", "--window"},
        {"user = a\nuser = b\n", "--user"},
        {"help\n", "no command has an option \"help\""},
    };
    for (const auto& c : cases) {
        EXPECT_THAT(Refusal(c.text), testing::AllOf(HasSubstr(c.problem), HasSubstr("/conf")))
            << c.text;
    }
}

TEST_F(ConfigurationTest, APasswordIsRefusedAndNotSaid) {
    for (const char* text : {"password = sesame\n", "[collect]\npassword = sesame\n",
                             "[group.a]\npassword = sesame\n", "kg = sesame\n"}) {
        EXPECT_THAT(Refusal(text), testing::AllOf(HasSubstr("a file of its own"),
                                                  testing::Not(HasSubstr("sesame"))))
            << text;
    }
}

TEST_F(ConfigurationTest, AGroupHasHostsAndWhatTheyHaveInCommon) {
    const Configuration configuration =
        Read({"[group.rack7]\nhosts = \"n[1,3]\", m\nuser = monitor\nworkaround = a, b\n",
              "[group.rack7]\nhosts = other\nwindow = 1\n[group.a.b]\nhosts = c\n"});
    const auto group = configuration.Group("rack7");
    ASSERT_TRUE(group);
    EXPECT_EQ(group->hosts, "n[1,3],m");
    EXPECT_EQ(group->options, (decltype(group->options){
                                  {"user", "monitor"}, {"workaround", "a"}, {"workaround", "b"}}));
    EXPECT_EQ(configuration.Group("a.b")->hosts, "c");
    EXPECT_FALSE(configuration.Group("rack"));
}

TEST_F(ConfigurationTest, TheTextSaysWhatHoldsAndWhereFrom) {
    setenv("IPMISEL_USER", "environment", 1);
    const std::string text =
        Read({"user = first\nwindow = 4\n", "window = 2\n[group.g]\nhosts = a b\n"}).Text();
    EXPECT_THAT(text, testing::ContainsRegex("user = environment +# IPMISEL_USER\n"));
    EXPECT_THAT(text, testing::ContainsRegex("window = 4 +# [^\n]*/conf0\n"));
    EXPECT_THAT(text, testing::ContainsRegex("\\[group.g\\] +# [^\n]*/conf1\nhosts = \"a,b\"\n"));
    EXPECT_THAT(text, testing::Not(testing::AnyOf(HasSubstr("first"), HasSubstr("window = 2"))));
}

TEST_F(ConfigurationTest, AFileThatIsNotThereIsNoFault) {
    const Configuration configuration({"/nowhere/ipmisel.conf"}, {{collect, {}}});
    EXPECT_EQ(configuration.Text(), "# read: no file\n");
}

TEST(ConfigurationFiles, TheUsersComesBeforeThatOfTheSystem) {
    setenv("XDG_CONFIG_HOME", "/home/a/conf", 1);
    EXPECT_THAT(ConfigurationFiles(),
                testing::ElementsAre("/home/a/conf/ipmisel.conf", "/etc/ipmisel.conf"));
    setenv("XDG_CONFIG_HOME", "relative", 1);
    setenv("HOME", "/home/a", 1);
    EXPECT_EQ(ConfigurationFiles().front(), "/home/a/.config/ipmisel.conf");
}

}  // namespace
