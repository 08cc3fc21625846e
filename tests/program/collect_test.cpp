#include <sys/stat.h>

#include <set>

#include "tests/program/program_fixture.h"

namespace ipmiseltest {
namespace {

using namespace ::testing;

std::vector<std::string> Lines(const std::string& text) {
    std::vector<std::string> lines;
    std::istringstream in(text);
    for (std::string line; std::getline(in, line);) lines.push_back(line);
    return lines;
}

class Collecting : public ProgramTest {};

TEST_F(Collecting, TheJsonReportHoldsEveryPropertyInTheOrderWritten) {
    const std::string source = Write(Server());
    const Ended ended = Collect(source, {"--format", "json", "--class", "QORSG_IPMILogRecord"});
    EXPECT_EQ(ended.exitStatus, 0);
    const Json expected = Json::parse(R"({
        "format": "ipmisel/1", "source": "", "machine_type": "SIM-T",
        "collected": "2024-03-05T11:00:00Z", "complete": true, "systems": [{"name": "server"}],
        "plugin": {"name": "IPMISEL", "version": "1.0", "interface": "1.0"},
        "status": {"code": 0, "text": "Success"},
        "instances": [{"class": "QORSG_IPMILogRecord", "properties": {
            "CreationClassName": "QORSG_IPMILog", "LogCreationClassName": "QORSG_IPMILog",
            "LogName": "IPMILogEntry", "RecordID": "1",
            "MessageTimestamp": "20240305092816.000000+060",
            "CreationTimeStamp": "20240305092816.000000+060",
            "Source": "16 (address). LUN 0. Channel 0.",
            "SensorType": "Temperature", "EventType": "Assertion, Threshold.",
            "Entity": "Processor", "EntityInstance": "1", "SensorInformation": "CPU1 Temp",
            "Message": "Processor 1 (Temperature - CPU1 Temp): Assertion: Rose above the upper critical limit. \n               Trigger threshold value: 69 degrees C. \n               Trigger reading: 80 degrees C.",
            "AuxLog": "No Extended Data", "SourceNode": "1",
            "RawData": [1, 0, 2, 176, 229, 230, 101, 32, 0, 4, 1, 48, 1, 89, 80, 69]}}],
        "notices": [],
        "completeness": [{"node": 1, "source": "",
            "log": {"announced": 1, "read": 1, "exported": 1},
            "sensors": {"announced": 1, "read": 1},
            "controller": {"announced": 1, "read": 1}, "faults": []}]})");
    Json report = Json::parse(ended.out);
    for (Json* text : {&report["source"], &report["completeness"][0]["source"]}) {
        EXPECT_EQ(*text, source);
        *text = "";
    }
    EXPECT_EQ(report["plugins"][0]["status"], report["status"]);
    report.erase("plugins");
    EXPECT_EQ(report, expected) << report.dump(2);
}

TEST_F(Collecting, FormatsAndPlacesAgree) {
    const std::string source = Example("two-node");
    const Json instances = Report(source)["instances"];
    Json lines = Json::array();
    Json summaries = Json::array();
    for (const std::string& text : Lines(Collect(source, {"--format", "ndjson"}).out)) {
        Json line = Json::parse(text);
        EXPECT_EQ(line["format"], "ipmisel/1");
        if (line.contains("summary")) {
            summaries.push_back(line);
        } else {
            lines.push_back({{"class", line["class"]}, {"properties", line["properties"]}});
        }
    }
    EXPECT_EQ(lines, instances);
    ASSERT_EQ(summaries.size(), 2U);
    EXPECT_EQ(summaries[1]["summary"]["completeness"]["node"], 2);
    EXPECT_EQ(summaries[1]["summary"]["complete"], true);

    const Ended table = Collect(source);
    EXPECT_THAT(Lines(table.out), Each(SizeIs(Lt(101U))));
    EXPECT_THAT(table.out, AllOf(HasSubstr("\nNode 2: two-node\n"),
                                 EndsWith("Event log and sensors are complete.\n")));
    EXPECT_EQ(Collect(source, {"--output", "-"}).out, table.out);

    const std::string file = InPlace("report");
    place.Write("report", "what was there before");
    // What stands there keeps its mode and owner; a new file is the user's alone.
    struct stat old {
    }, kept{};
    EXPECT_TRUE(chown(file.c_str(), 12345, 23456) == 0 || errno == EPERM);
    std::filesystem::permissions(file, std::filesystem::perms(0664));
    EXPECT_EQ(stat(file.c_str(), &old), 0);
    const mode_t before = umask(0);
    EXPECT_EQ(Collect(source, {"--output", file}).out, "");
    EXPECT_EQ(ReadText(file), table.out);
    EXPECT_EQ(stat(file.c_str(), &kept), 0);
    EXPECT_EQ(std::tuple(kept.st_mode, kept.st_uid, kept.st_gid),
              std::tuple(old.st_mode, old.st_uid, old.st_gid));
    std::filesystem::remove(file);
    Collect(source,
            {"--output", file, "--record", InPlace("capture"), "--log-file", InPlace("log")});
    umask(before);
    for (const char* name : {"report", "capture", "log"}) {
        EXPECT_EQ(std::filesystem::status(InPlace(name)).permissions(),
                  std::filesystem::perms(0600));
    }
    for (const char* name : {"capture", "log"}) std::filesystem::remove(InPlace(name));
    EXPECT_THAT(Left(), ElementsAre("report"));
}

TEST_F(Collecting, WhatThereIsNotIsToldAndNotCalledComplete) {
    Json server = Server();
    server["ipmi_lan"] = true;
    server["bmcs"][0]["faults"] = {{{"netfn", "0a"}, {"command", "10"}, {"completion_code", "ff"}}};
    const std::string source = Write(server);
    const Ended ended = Collect(source, {"--class", "QORSG_IPMIFRU", "--class", "IPMI_FRU"});
    EXPECT_EQ(ended.exitStatus, 0);
    EXPECT_THAT(ended.err, MatchesRegex("ipmisel: over the network there is no QORSG_IPMIFRU; "
                                        "[^\n]+\n"));
    EXPECT_THAT(ended.out, EndsWith("Event log and sensors are complete.\n"));
    EXPECT_EQ(Collect(source).err, "");  // nobody asked for it by name
}

TEST_F(Collecting, ClassesComeInTheirOrderOrTheUsers) {
    const std::vector<std::string> listed = Lines(Run({"classes"}).out);
    ASSERT_THAT(listed, SizeIs(Ge(9U)));
    EXPECT_THAT(listed, Each(ContainsRegex("^[A-Z]+_[A-Za-z]+  +[A-Za-z]")));
    EXPECT_THAT(listed[0], StartsWith("QORSG_IPMIFirmwareElement "));
    EXPECT_THAT(listed[5], StartsWith("QORSG_IPMILogRecord "));

    const auto classesOf = [](const Json& report) {
        std::vector<std::string> classes;
        for (const Json& instance : report["instances"]) {
            const auto name = instance["class"].get<std::string>();
            if (classes.empty() || classes.back() != name) classes.push_back(name);
        }
        return classes;
    };
    // By default those that a pass yields, in the order listed: the inventory before the log,
    // although the plug-in writes it last.
    std::vector<std::string> classes = classesOf(Report(Example("rack-server")));
    const auto own = std::find_if(classes.begin(), classes.end(), [](const std::string& name) {
        return name.starts_with("IPMI_");
    });
    EXPECT_THAT(std::vector(own, classes.end()),
                AllOf(Not(IsEmpty()), Each(StartsWith("IPMI_"))));  // behind all the others
    classes.erase(own, classes.end());
    EXPECT_THAT(classes, ElementsAre("QORSG_IPMIFirmwareElement", "QORSG_CPLDFirmwareElement",
                                     "QORSG_FPGAFirmwareElement", "QORSG_AMIFirmwareElement",
                                     "QORSG_IPMIFRU", "QORSG_IPMILogRecord"));

    const Json named = Report(
        Write(Server()), {"--class", "QORSG_IPMIRecordInLog", "--class", "QORSG_IPMIMessageLog"});
    EXPECT_THAT(classesOf(named), ElementsAre("QORSG_IPMIRecordInLog", "QORSG_IPMIMessageLog"));
    EXPECT_EQ(named["instances"][1]["properties"]["LogRecord"],
              Json::parse(R"({"class": "QORSG_IPMILogRecord", "keys": {"RecordID": "2"}})"));
}

TEST_F(Collecting, HelpAndVersionAreTheOutputThatWasAskedFor) {
    const Ended help = Run({"collect", "--help"});
    EXPECT_EQ(help.exitStatus, 0);
    EXPECT_THAT(help.out, AllOf(HasSubstr("table, json, ndjson"), HasSubstr("replay:FILE")));
#ifdef IPMISEL_LAN
    EXPECT_THAT(help.out, HasSubstr("\n  opensesspriv "));
#endif
    EXPECT_THAT(Run({"--version"}).out, MatchesRegex("ipmisel [0-9.]+\n"));
}

TEST_F(Collecting, TextsOfABmcDoNotSteerTheTerminal) {
    Json server = Server();
    server["machine_type"] = "SIM\u001b[31m";
    // Four bytes of a shutdown comment: ESC and "[", or CSI as one character and DEL
    server["bmcs"][0]["sel"]["entries"] = {"0100 dd b0e5e665 000000 00 1b5bff41 00",
                                           "0200 dd b0e5e665 000000 00 c29b7f42 00"};
    const std::string source = Write(server);
    for (const char* format : {"table", "json", "ndjson"}) {
        const Ended ended = Collect(
            source, {"--format", format, "--log-level", "trace", "--class", "QORSG_IPMILogRecord"});
        for (const std::string& text : {ended.out, ended.err}) {
            EXPECT_FALSE(text.empty());
            for (const char* control : {"\x1b", "\x7f", "\xff", "\xc2\x9b"}) {
                EXPECT_THAT(text, Not(HasSubstr(control))) << format;
            }
        }
    }
    const Json instances = Report(source, {"--class", "QORSG_IPMILogRecord"})["instances"];
    const std::string lead = "(Shutdown Event): Comment String Part 0: ";
    EXPECT_EQ(instances[0]["properties"]["Message"], lead + "\x1b[\uFFFDA");
    EXPECT_EQ(instances[1]["properties"]["Message"], lead + "\u009b\u007fB");
}

TEST_F(Collecting, TheLogFileHoldsEveryLineAndTheTerminalWhatWasAskedFor) {
    const std::vector<std::string> everything{"--format", "ndjson"};
    const auto with = [&everything](std::vector<std::string> more) {
        more.insert(more.end(), everything.begin(), everything.end());
        return more;
    };
    const Ended ended = Collect(Write(Server()), with({"--log-file", InPlace("log")}));
    std::set<int> severities;
    const std::vector<std::string> lines = Lines(ReadText(InPlace("log")));
    for (const std::string& line : lines) {
        severities.insert(Json::parse(line)["severity"].get<int>());
    }
    EXPECT_THAT(lines, IsSupersetOf({R"({"severity": 3, "text": "Getting IPMI SEL data."})",
                                     R"({"severity": 4, "text": "num_SELentries = 1"})"}));
    EXPECT_THAT(severities, ElementsAre(1, 2, 3, 4));
    EXPECT_THAT(Lines(ended.err), AllOf(Not(IsEmpty()), Each(StartsWith("ipmisel: warning: "))));
    EXPECT_EQ(Collect(Write(Server()), with({"--log-level", "error"})).err, "");
    EXPECT_THAT(Collect(Write(Server()), with({"--log-level", "info"})).err,
                HasSubstr("ipmisel: info: Getting IPMI SEL data.\n"));
}

TEST_F(Collecting, WhatABmcMayLackIsNoWarningOnTheTerminal) {
    Json server = Server();
    for (const std::size_t nodes : {1U, 2U}) {
        while (server["bmcs"].size() < nodes) server["bmcs"].push_back(server["bmcs"][0]);
        const auto collect = [&](const char* level) {
            return Collect(Write(server),
                           {"--class", "QORSG_IPMILogRecord", "--class", "QORSG_ZMCAuxDebugRecord",
                            "--log-level", level, "--log-file", InPlace("log")});
        };
        EXPECT_EQ(collect("warning").err, "") << nodes;
        std::size_t warnings = 0;
        for (const std::string& line : Lines(ReadText(InPlace("log")))) {
            warnings += Json::parse(line)["severity"] == 1 ? 1U : 0U;
        }
        EXPECT_EQ(warnings, 3 * nodes);  // no auxiliary log, twice, and what that class makes of it
        EXPECT_THAT(Lines(collect("notice").err),
                    Contains(StartsWith("ipmisel: warning: ")).Times(3 * static_cast<int>(nodes)));
    }
}

TEST_F(Collecting, TextsThatAreGoneInMidRunAreWarnedOfOnceAndLoggedEachTime) {
    namespace fs = std::filesystem;
    const fs::path program = IPMISEL_PROGRAM;
    fs::create_directories(folder.path() / "bin");
    fs::create_directories(folder.path() / "lib");
    fs::copy(program, folder.path() / "bin/ipmisel");
    fs::copy(program.parent_path().parent_path() / "lib/ipmisel", folder.path() / "lib/ipmisel");
    Json server = Server(30);
    server["bmcs"][0]["latency_us"] = 50000;
    RunningProgram running(
        folder.path().string(),
        {(folder.path() / "bin/ipmisel").string(), "collect", "--from", Write(server), "--class",
         "QORSG_IPMILogRecord", "--log-file", InPlace("log"), "--output", InPlace("report")},
        setting);
    ASSERT_TRUE(Eventually([&] { return ReadText(InPlace("log")).size() > 4000; }));
    fs::remove(folder.path() / "lib/ipmisel/ipmisel.INI");
    const Ended ended = running.Wait();
    EXPECT_EQ(ended.exitStatus, 0) << ended.err;
    EXPECT_THAT(Lines(ended.err), ElementsAre(HasSubstr("ipmisel.INI. Did not obtain string #")));
    EXPECT_THAT(Lines(ReadText(InPlace("log"))),
                Contains(HasSubstr("ipmisel.INI. Did not obtain string #")).Times(Ge(30)));
}

TEST_F(Collecting, ANoticeIsToldAndKept) {
    Json server = Server();
    server["ipmi_driver"] = false;
    const Json report = Report(Write(server));
    ASSERT_EQ(report["notices"].size(), 1U);
    const auto text = report["notices"][0].get<std::string>();
    EXPECT_THAT(text, StartsWith("A BMC/ZMC was detected, but the IPMI driver is not installed."));
    EXPECT_THAT(ReadText((folder.path() / "stderr").string()), HasSubstr(Lines(text)[0]));
}

TEST_F(Collecting, WhatWentWrongShowsInExitStatusReportAndOneLine) {
    const struct {
        const char *what, *fault;
        int exitStatus, statusCode;
        const char* line;
    } cases[] = {
        {"no log", R"({"netfn": "0a", "command": "40", "no_response": true})", 1, 3,
         "the pass ended with status 3"},
        {"a record in the middle",
         R"({"netfn": "0a", "command": "43", "call": 3, "completion_code": "cb"})", 4, 0,
         "1 of 3 log records not read, Get SEL Entry 0003: completion code cb"},
        {"sensors", R"({"netfn": "0a", "command": "23", "no_response": true})", 4, 0,
         "Get SDR 0000: no response"},
        {"a log that is asked for twice",
         R"({"netfn": "0a", "command": "40", "call": 1, "no_response": true})", 0, 0, ""},
    };
    for (const auto& c : cases) {
        Json server = Server(3);
        server["bmcs"][0]["faults"] = {Json::parse(c.fault)};
        const Ended ended = Collect(Write(server), {"--format", "json", "--log-level", "error",
                                                    "--class", "QORSG_IPMILogRecord"});
        EXPECT_EQ(ended.exitStatus, c.exitStatus) << c.what;
        EXPECT_EQ(Json::parse(ended.out)["status"]["code"], c.statusCode) << c.what;
        const auto lines = Lines(ended.err);
        if (c.exitStatus != 0) {
            ASSERT_THAT(lines, Not(IsEmpty())) << c.what;
            EXPECT_THAT(lines.back(), AllOf(StartsWith("ipmisel: "), HasSubstr(c.line))) << c.what;
        }
    }
}

TEST_F(Collecting, AMachineWithoutABmcGivesAnEmptyReport) {
    for (const char* key : {"smbios", "bmcs"}) {
        Json server = Server();
        server.erase(key);
        for (const char* name : {"QORSG_IPMILogRecord", "QORSG_IPMIMessageLog"}) {
            const Ended ended = Collect(
                Write(server), {"--format", "json", "--class", name, "--log-level", "error"});
            EXPECT_EQ(ended.exitStatus, 3);
            EXPECT_EQ(Json::parse(ended.out)["instances"].size(), 0U);
            EXPECT_THAT(Lines(ended.err), ElementsAre(StartsWith("ipmisel: no BMC")));
        }
    }
}

TEST_F(Collecting, AControllerThatAnswersIsOneWhateverTheTablesOfTheMachineSay) {
    Json server = Server();
    server.erase("smbios");
    server["bmcs"][0].erase("sdr");
    for (const auto& [name, instances] : {std::pair("IPMI_EventLog", 1U), {"IPMI_Sensor", 0U}}) {
        const Ended ended = Collect(Write(server), {"--format", "json", "--class", name});
        EXPECT_EQ(ended.exitStatus, 0);
        EXPECT_EQ(Json::parse(ended.out)["instances"].size(), instances);
        EXPECT_EQ(ended.err, "");
    }
}

TEST_F(Collecting, AReaderThatLeavesEndsItQuietly) {
    const std::string source = Write(Server(500));
    const Ended ended =
        RunningProgram(
            folder.path().string(),
            {"/bin/sh", "-c", "{ \"$@\"; echo status $? >&2; } | head -n 1", "sh", IPMISEL_PROGRAM,
             "collect", "--from", source, "--format", "ndjson", "--log-level", "error"})
            .Wait();
    EXPECT_THAT(Lines(ended.out), SizeIs(1));
    EXPECT_EQ(ended.err, "status 141\n");  // 128 + SIGPIPE
}

/// A BMC that is too slow for anybody's patience.
class Slow : public ProgramTest {
protected:
    std::vector<std::string> ToFile() {
        Json server = Server(200);
        server["bmcs"][0]["latency_us"] = 100000;
        return Command({"collect", "--from", Write(server), "--class", "QORSG_IPMILogRecord",
                        "--format", "json", "--log-level", "trace", "--output", InPlace("report")});
    }
    static bool IsReading(const RunningProgram& program) {
        return Eventually(
            [&] { return program.Errors().find("IPMIGetSELEntry") != std::string::npos; });
    }
};

TEST_F(Slow, AnInterruptionLeavesAReportOfWhatWasRead) {
    RunningProgram program(folder.path().string(), ToFile());
    ASSERT_TRUE(IsReading(program));
    program.Signal(SIGINT);
    EXPECT_EQ(program.Wait().exitStatus, 4);
    Json report = Json::parse(ReadText(InPlace("report")), nullptr, false);
    ASSERT_FALSE(report.is_discarded());
    EXPECT_THAT(report["completeness"].dump(),
                AllOf(HasSubstr(R"("announced":200)"), HasSubstr(R"("problem":"interrupted")")));
    EXPECT_THAT(Left(), ElementsAre("report"));
}

TEST_F(Slow, ASecondSignalEndsItAtOnceAndLeavesNothing) {
    RunningProgram program(folder.path().string(), ToFile());
    ASSERT_TRUE(IsReading(program));
    EXPECT_THAT(Left(), SizeIs(1));
    program.Signal(SIGTERM);
    std::this_thread::sleep_for(std::chrono::milliseconds(20));
    program.Signal(SIGTERM);
    EXPECT_EQ(program.Wait().signal, SIGTERM);
    EXPECT_THAT(Left(), IsEmpty());
}

TEST_F(Collecting, DeadSourcesBesideALivingOneAreNamedAndItIsExitStatusFour) {
    if (!IpmiSim::Missing().empty()) GTEST_SKIP() << IpmiSim::Missing();
    const IpmiSim sim({});
    setting.environment["IPMISEL_PASSWORD"] = "secret";
    const std::string living = "lan:" + sim.Place();
    const std::vector<std::string> dead{"lan:127.0.0.1:1", "lan:127.0.0.1:2"};
    const Ended ended =
        Collect(dead[0], {"--from", living, "--from", dead[1], "--user", "root", "--workaround",
                          "opensesspriv", "--format", "json", "--timeout", "2"});
    EXPECT_EQ(ended.exitStatus, 4);
    EXPECT_THAT(ended.err, AllOf(HasSubstr("ipmisel: " + dead[0] + ": "),
                                 HasSubstr("ipmisel: " + dead[1] + ": "),
                                 HasSubstr(dead[1] + " could not be opened")));
    const Json report = Json::parse(ended.out);
    EXPECT_EQ(report["complete"], false);
    const Json& completeness = report["completeness"];
    ASSERT_EQ(completeness.size(), 3U);
    EXPECT_EQ(completeness[0]["source"], living);
    EXPECT_EQ(completeness[0]["node"], 1);
    for (std::size_t i = 0; i < dead.size(); ++i) {
        EXPECT_EQ(completeness[i + 1]["source"], dead[i]);
        EXPECT_FALSE(completeness[i + 1].contains("node"));
    }
#ifndef __SANITIZE_ADDRESS__  // which wants descriptors of its own
    // Out of descriptors, for a library, a session or the report: a line says so.
    for (const char* limit : {"5", "6", "7"}) {
        // None but the first three is handed on.
        const std::string script =
            std::string("exec 3>&- 4>&- 5>&- 6>&- 7>&-; ulimit -n ") + limit + "; exec \"$@\"";
        const Ended without =
            RunningProgram(folder.path().string(),
                           {"/bin/sh", "-c", script, "sh", IPMISEL_PROGRAM, "collect", "--from",
                            dead[0], "--from", dead[1], "--from", "lan:127.0.0.1:3", "--from",
                            living, "--timeout", "2", "--output", InPlace("report")},
                           setting)
                .Wait();
        EXPECT_THAT(without.exitStatus, AnyOf(2, 3)) << limit << without.err;
        EXPECT_THAT(without.err, AnyOf(HasSubstr("no file descriptor is left"),
                                       HasSubstr("Too many open files")))
            << limit;
    }
#endif
}

TEST_F(Collecting, ThePasswordComesFromAFileOrIsAskedForUnseen) {
    if (!IpmiSim::Missing().empty()) GTEST_SKIP() << IpmiSim::Missing();
    const IpmiSim sim({});
    const std::vector<std::string> access{
        "collect", "--from",       "lan:" + sim.Place(), "--user",
        "root",    "--workaround", "opensesspriv",       "--format",
        "json",    "--class",      "QORSG_IPMILogRecord"};
    std::vector<std::string> fromFile = access;
    fromFile.push_back("--password-file");
    fromFile.push_back(folder.Write("password", "secret\nmore\n"));
    EXPECT_EQ(Run(fromFile).exitStatus, 0);
    fromFile.back() = folder.Write("password", "wrong\n");
    EXPECT_EQ(Run(fromFile).exitStatus, 3);

    setting.onTerminal = true;
    RunningProgram program(folder.path().string(), Command(access), setting);
    std::string shown;
    const auto read = [&] {
        char part[64];
        const ssize_t count = ::read(program.Terminal(), part, sizeof part);
        if (count > 0) shown.append(part, static_cast<std::size_t>(count));
        return shown.find("Password: ") != std::string::npos;
    };
    ASSERT_TRUE(Eventually(read));
    termios terminal{};
    tcgetattr(program.Terminal(), &terminal);
    EXPECT_EQ(terminal.c_lflag & ECHO, 0U);
    ASSERT_EQ(write(program.Terminal(), "secret\n", 7), 7);
    const Ended ended = program.Wait();
    EXPECT_EQ(ended.exitStatus, 0) << ended.err;
    tcgetattr(program.Terminal(), &terminal);
    EXPECT_NE(terminal.c_lflag & ECHO, 0U);
    EXPECT_EQ(shown, "Password: ");
}

}  // namespace
}  // namespace ipmiseltest
