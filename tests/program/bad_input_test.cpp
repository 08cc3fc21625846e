#include <fcntl.h>
#include <sys/stat.h>

#include "tests/program/program_fixture.h"

namespace ipmiseltest {
namespace {

using namespace ::testing;

class BadInput : public ProgramTest {
protected:
    /// Ends with the status and one line that holds `part`; nothing is written.
    void ExpectRefused(const std::vector<std::string>& arguments, int exitStatus,
                       const std::string& part) {
        const Ended ended = Run(arguments);
        const std::string shown = PrintToString(arguments);
        EXPECT_EQ(ended.exitStatus, exitStatus) << shown;
        EXPECT_EQ(ended.out, "") << shown;
        // One line: what failed; what to do
        EXPECT_THAT(ended.err, AllOf(MatchesRegex("ipmisel: [^\n]+; [^\n]+\n"), HasSubstr(part)))
            << shown;
        EXPECT_THAT(Left(), IsEmpty()) << shown;
    }
    /// `collect` of a good source into a file, and what is wrong with it.
    std::vector<std::string> Good(std::vector<std::string> more) {
        more.insert(more.begin(), {"collect", "--from", Write(Server()), "--output",
                                   InPlace("report"), "--log-level", "error"});
        return more;
    }
};

TEST_F(BadInput, WrongUsage) {
    const struct {
        std::vector<std::string> more;
        const char* part;
    } cases[] = {
        {{"--class", "QORSG_IPMILog"}, "use one of QORSG_IPMIFirmwareElement, "},
        {{"--format", "xml"}, "use one of table, json, ndjson"},
        {{"--log-level", "debug"}, "use one of error, warning, notice, info, trace"},
        {{"--privilege", "root"}, "use one of user, operator, admin"},
        {{"--workaround", "none"}, "use one of authcap, "},
        {{"--window", "0"}, "a window of 0 requests is not possible; give 1 to 32"},
        {{"--timeout", "0"}, "give more than 0, at most 86400, with --timeout"},
        {{"--timeout", "nan"}, "--timeout"},
        {{"--deadline", "-1"}, "--deadline"},
        {{"--deadline", "soon"}, "--deadline"},
        {{"--cipher-suite", "four"}, "\"four\" is no number"},
        {{"--cipher-suite", "256"}, "cipher suite 256 is not supported"},
        {{"--log-file", ""}, "the name is empty"},
        {{"--name", ""}, "the name is empty"},
        {{"--name", "a", "--name", "b"}, "2 names for 1 sources"},
        {{"--severities", "/no/such"}, "/no/such: No such file"},
        {{"--severities", "/dev"}, "no regular file"},
        {{"--severities", folder.Write("severities", "# fine\nterrible sensor-type=01\n")},
         "line 2: \"terrible\" is no severity"},
        {{"--format", "json", "table"}, "table"},
        {{"--frmat", "json"}, "--frmat"},
        {{"--from", "lan:127.0.0.1"}, "stands alone"},
        {{"--plugin", "/no/such.pi"}, "cannot load the plug-in /no/such.pi: No such file"},
        {{"--log-file", "/no/such/log"}, "cannot write the log to /no/such/log"},
        {{"--record", "/no/such/capture"}, "/no/such/capture cannot be written"},
    };
    for (const auto& c : cases) {
        std::vector<std::string> arguments = Good(c.more);
        // One option twice is another fault.
        if (c.more[0] == "--log-level")
            arguments.erase(arguments.begin() + 5, arguments.begin() + 7);
        ExpectRefused(arguments, 2, c.part);
    }
    const std::string source = Write(Server());
    ExpectRefused({"collect", "--from", source, "--output", InPlace("none/report")}, 2,
                  "cannot write " + InPlace("none/report") + ": No such file or directory");
    ExpectRefused({"collect", "--from", source, "--output", place.path().string()}, 2,
                  "Is a directory");
    ExpectRefused({}, 2, "no command is named");
    ExpectRefused({"colect"}, 2,
                  "no command \"colect\"; did you mean collect? use one of collect, ");
    ExpectRefused({"frobnicate"}, 2, "no command \"frobnicate\"; use one of collect, ");
    ExpectRefused({"--verison"}, 2, "no option \"--verison\"; did you mean --version? see ");
    ExpectRefused({"--from", "sim:x"}, 2,
                  "--from belongs behind a command, such as ipmisel collect");
    ExpectRefused(
        {"collect", "-o", "/dev/null"}, 2,
        "collect has no option \"-o\"; did you mean --output? see ipmisel collect --help");
    ExpectRefused({"collect", "plan", "--form=json"}, 2, "did you mean --format or --from? see");
    ExpectRefused({"collect", "--no-such=1"}, 2, "no option \"--no-such\"; see ipmisel collect");
    ExpectRefused({"collect", "lan:bmc17"}, 2, "\"lan:bmc17\"; did you mean --from lan:bmc17? ");
    ExpectRefused({"doctor", "inband", "bmc17"}, 2, "doctor does not expect \"bmc17\"; see ");
    ExpectRefused({"collect", "--from", "tape:0"}, 2, "there is no source \"tape:0\"");
    ExpectRefused({"collect", "--from", "sim:"}, 2, "names no place");
}

TEST_F(BadInput, AnOptionOfAFileIsNamedWithTheFile) {
    const std::string file = folder.Write("ipmisel.conf", "last = 3\n");
    setting.environment["XDG_CONFIG_HOME"] = std::filesystem::path(file).parent_path();
    std::vector<std::string> arguments{"collect", "--from", Write(Server()), "--format", "json"};
    ExpectRefused(arguments, 2, "--last (of " + file + ") goes with a report for people; ");
    arguments.insert(arguments.end(), {"--last", "2"});
    ExpectRefused(arguments, 2, "--last goes with a report for people; leave it out");
}

TEST_F(BadInput, SourcesThatDoNotOpen) {
    const auto refused = [this](const std::string& source, int exitStatus, const char* part,
                                std::vector<std::string> more = {}) {
        more.insert(more.begin(), {"collect", "--from", source, "--output", InPlace("report"),
                                   "--record", InPlace("capture")});
        ExpectRefused(more, exitStatus, part);
    };
    refused("sim:/no/such.json", 3, "/no/such.json: ");
    refused("replay:/no/such.capture", 3, "/no/such.capture: ");
    refused("sim:" + folder.Write("a", "{\n  \"bmcs\": [\n"), 3, "a:3: not JSON");
    if (!std::filesystem::exists("/dev/ipmi0")) {
        ExpectRefused({"collect", "--output", InPlace("report")}, 3, "--from");
    }
#ifdef IPMISEL_LAN
    const std::string lan = "lan:127.0.0.1:1";
    refused(lan, 2, "--password-file");
    refused(lan, 2, "empty", {"--password-file", folder.Write("empty", "")});
    refused(lan, 2, "/no/such/password", {"--password-file", "/no/such/password"});
    setting.environment["IPMISEL_PASSWORD"] = "secret";
    for (const char* key : {"0x123", "0x12fg", "0x", "more than 20 characters"}) {
        refused(lan, 2, "Kg", {"--kg-file", folder.Write("kg", key)});
    }
    refused(lan, 3, "127.0.0.1:1", {"--timeout", "1"});
#endif
}

TEST_F(BadInput, WhatDoesNotFitLeavesWhatWasThere) {
    const std::string source = Write(Server(100));
    const std::string before = "what was there before";
    const std::string file = place.Write("report", before);
    setting.fileLimit = 20000;
    for (const char* format : {"json", "ndjson", "table"}) {
        const Ended ended = Collect(source, {"--output", file, "--format", format, "--log-level",
                                             "error", "--class", "QORSG_IPMILogRecord"});
        EXPECT_EQ(ended.exitStatus, 2) << format;
        EXPECT_THAT(ended.err, MatchesRegex("ipmisel: cannot [^\n]+: File too large; [^\n]+\n"));
        EXPECT_EQ(ReadText(file), before);
        EXPECT_THAT(Left(), ElementsAre("report"));
    }
}

TEST_F(BadInput, OneFileIsNotNamedTwice) {
    const std::string report = place.Write("report", "what was there before");
    std::filesystem::create_symlink(report, folder.path() / "link");
    const std::string link = (folder.path() / "link").string();
    const std::string other = place.path().string() + "/./none";
    const std::string source = Write(Server());
    const std::string file = source.substr(4);
    const struct {
        std::vector<std::string> more;
        const char* part;
    } cases[] = {{{"--output", report, "--record", link}, "--output and --record name one file"},
                 {{"--output", other, "--log-file", InPlace("none")}, "--output and --log-file"},
                 {{"--output", file}, "--output and --from"},
                 {{"--record", link, "--password-file", report}, "--record and --password-file"}};
    for (const auto& c : cases) {
        const Ended ended = Collect(source, c.more);
        EXPECT_EQ(ended.exitStatus, 2);
        EXPECT_THAT(ended.err, AllOf(MatchesRegex("ipmisel: [^\n]+; [^\n]+\n"), HasSubstr(c.part)));
        EXPECT_THAT(Left(), ElementsAre("report"));
        EXPECT_EQ(ReadText(report), "what was there before");
    }
    EXPECT_EQ(Collect(source, {"--output", "/dev/null", "--record", "/dev/null"}).exitStatus, 0);
}

TEST_F(BadInput, APluginThatIsCutShortIsRefused) {
    const auto whole =
        std::filesystem::path(IPMISEL_PROGRAM).parent_path() / "../lib/ipmisel/libipmisel.pi";
    const auto cut = folder.path() / "cut.pi";
    // All within what is loaded: how much follows it for debuggers depends on the build.
    for (const std::uintmax_t length : {100, 4096, 65536}) {
        std::filesystem::copy_file(whole, cut, std::filesystem::copy_options::overwrite_existing);
        std::filesystem::resize_file(cut, length);
        ExpectRefused(Good({"--plugin", cut.string()}), 2, "it is cut short");
    }
    const auto pipe = folder.path() / "pipe.pi";
    ASSERT_EQ(mkfifo(pipe.c_str(), 0600), 0);
    ExpectRefused(Good({"--plugin", pipe.string()}), 2, "it is no file");
}

TEST_F(BadInput, NamesOf255BytesAreWritten) {
    const std::string name(255, 'n');
    EXPECT_EQ(Collect(Write(Server()), {"--output", InPlace(name)}).exitStatus, 0);
    EXPECT_THAT(Left(), ElementsAre(name));
}

TEST_F(BadInput, WhatAKilledRunLeftIsTakenAwayByTheNext) {
    Json server = Server(200);
    server["bmcs"][0]["latency_us"] = 100000;
    // Under a name of its own: it may not have been read when the next run's server is written.
    const std::string slow = "sim:" + folder.Write("slow.json", server.dump());
    RunningProgram program(folder.path().string(),
                           Command({"collect", "--from", slow, "--output", InPlace("report")}));
    ASSERT_TRUE(Eventually([&] { return Left().size() == 1; }));
    // One that still runs keeps its file.
    EXPECT_EQ(Run(Good({})).exitStatus, 0);
    EXPECT_THAT(Left(), SizeIs(2));
    program.Signal(SIGKILL);
    program.Wait();
    EXPECT_EQ(Run(Good({})).exitStatus, 0);
    EXPECT_THAT(Left(), ElementsAre("report"));
}

TEST_F(BadInput, ASymbolicLinkIsReplacedAndNotFollowed) {
    const std::string other = place.Write("other", "precious");
    std::filesystem::create_symlink(other, InPlace("report"));
    std::filesystem::create_symlink(InPlace("nothing"), InPlace("capture"));
    EXPECT_EQ(Run(Good({"--record", InPlace("capture")})).exitStatus, 0);
    EXPECT_EQ(ReadText(other), "precious");
    EXPECT_THAT(Left(), ElementsAre("capture", "other", "report"));
    EXPECT_FALSE(std::filesystem::is_symlink(InPlace("report")));
    EXPECT_FALSE(std::filesystem::is_symlink(InPlace("capture")));
    EXPECT_THAT(ReadText(InPlace("report")), StartsWith("server: SIM-T"));
}

TEST_F(BadInput, APipeIsWrittenAndStays) {
    const std::string pipe = InPlace("report");
    ASSERT_EQ(mkfifo(pipe.c_str(), 0600), 0);
    const int reader = open(pipe.c_str(), O_RDONLY | O_NONBLOCK);
    EXPECT_EQ(Run(Good({})).exitStatus, 0);
    char begin[8] = {};
    EXPECT_EQ(read(reader, begin, 7), 7);
    EXPECT_STREQ(begin, "server:");
    close(reader);
    EXPECT_TRUE(std::filesystem::is_fifo(pipe));
}

}  // namespace
}  // namespace ipmiseltest
