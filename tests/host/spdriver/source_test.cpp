#include <gmock/gmock.h>
#include <sys/stat.h>
#include <sys/sysmacros.h>

#include <fstream>

#include "host/spdriver/capture.h"
#include "host/spdriver/kinds.h"
#include "tests/host/spdriver/requests.h"
#include "tests/support/ipmi_sim.h"

namespace {

using ipmiseltest::ReadRequest;
using ipmiseltest::RequestOf;
using namespace ::testing;
using namespace tqrhost;

using ipmi::kGetSelEntry;
using ipmi::kGetSelInfo;
using ipmi::kGetSelTime;

/// The one line with which the sources are refused; empty when they open.
std::string Refusal(const std::vector<std::string>& sources) {
    try {
        OpenSources(sources, {});
    } catch (const SourceError& error) {
        EXPECT_THAT(error.what(), Not(HasSubstr("\n")));
        return error.what();
    }
    return "";
}

constexpr const char* kServer = R"({
  "machine_type": "SIM-1", "integrated_bmc": true, "ipmi_driver": false, "ipmi_lan": true,
  "smbios": ["26 04 0030 0000"],
  "bmcs": [
    {"sel": {"time": 1, "entries": ["0100 02 b0e5e665 2000 04 01 30 01 59 50 45"]},
     "faults": [{"netfn": "0a", "command": "48", "call": 1, "no_response": true},
                {"netfn": "0a", "command": "48", "call": 2, "completion_code": "c3"}]},
    {"sel": {"time": 2}}
  ]
})";

TEST(Sources, WhatIsOfNoKindOrCannotBeJoinedIsRefused) {
    EXPECT_THAT(Refusal({}), HasSubstr("no source"));
    EXPECT_THAT(Refusal({"usb:0"}), AllOf(StartsWith("there is no source \"usb:0\""),
                                          HasSubstr("sim:FILE, replay:FILE")));
    EXPECT_THAT(Refusal({"inband:x"}), StartsWith("there is no source"));
    EXPECT_THAT(Refusal({"sim:"}), HasSubstr("write it as sim:FILE"));
    EXPECT_THAT(Refusal({"sim:a", "sim:b"}), HasSubstr("\"sim:a\" stands alone"));
    EXPECT_THAT(Refusal({"sim:/nonexistent"}), HasSubstr("cannot be read"));
#ifndef IPMISEL_LAN
    EXPECT_THAT(Refusal({"lan:h"}), StartsWith("there is no source \"lan:h\""));
#endif
}

/// What a reader asks, and what it gets: of either node, answered, refused and not at all.
std::vector<std::optional<Response>> Converse(const Source& source) {
    std::vector<std::optional<Response>> answers;
    for (int i = 0; i < 3; ++i) {
        answers.push_back(source.nodes[0].transport->Exchange(RequestOf(kGetSelTime)));
    }
    answers.push_back(source.nodes[0].transport->Exchange(ReadRequest(kGetSelEntry, 1)));
    answers.push_back(source.nodes[1].transport->Exchange(RequestOf(kGetSelTime)));
    return answers;
}

TEST(Capture, AReplayAnswersWhatWasRecorded) {
    const ipmiseltest::TemporaryFolder folder;
    const std::string file = (folder.path() / "capture").string();
    Source source = OpenSources({"sim:" + folder.Write("s.json", kServer)}, {});
    const auto capture = NQORTQR20::RecordTo(file, source);
    const auto recorded = Converse(source);
    EXPECT_TRUE(capture->Finish());
    ASSERT_THAT(recorded, ElementsAre(std::nullopt, Response{0xC3}, Response{0, 1, 0, 0, 0},
                                      Optional(SizeIs(19)), Response{0, 2, 0, 0, 0}));
    std::string facts, first;
    std::ifstream in(file);
    std::getline(std::getline(in, facts), first);
    EXPECT_THAT(facts, StartsWith("{\"ipmisel_capture\":1,\"machine_type\":\"SIM-1\","));
    EXPECT_THAT(first, StartsWith(R"({"node": 0, "request": "01200a004800000000000000000000", )"
                                  R"("response": null, "at": ")"));

    const Source replay = OpenSources({"replay:" + file}, {});
    EXPECT_EQ(replay.facts.machineType, "SIM-1");
    EXPECT_TRUE(replay.facts.integratedBmc && !replay.facts.ipmiDriver && replay.facts.ipmiLan);
    // The clock is held still from the recording on.
    EXPECT_TRUE(replay.facts.localTime && replay.facts.localTime == source.facts.localTime);
    EXPECT_THAT(replay.facts.smbios, ElementsAre(ElementsAre(0x26, 0x04, 0x00, 0x30, 0, 0)));
    ASSERT_EQ(replay.nodes.size(), 2u);
    EXPECT_EQ(Converse(replay), recorded);
    // Asked once more than recorded; another node's request; other data; another command.
    EXPECT_EQ(replay.nodes[0].transport->Exchange(RequestOf(kGetSelTime)), recorded[2]);
    EXPECT_EQ(replay.nodes[1].transport->Exchange(ReadRequest(kGetSelEntry, 1)), std::nullopt);
    EXPECT_EQ(replay.nodes[0].transport->Exchange(ReadRequest(kGetSelEntry, 2)), std::nullopt);
    EXPECT_EQ(replay.nodes[0].transport->Exchange(RequestOf(kGetSelInfo)), std::nullopt);
}

/// A controller that takes its time, and the clock that a plug-in sees around the question.
TEST(Capture, AReplayShowsTheClockAsItWasAtTheQuestion) {
    const ipmiseltest::TemporaryFolder folder;
    const std::string file = (folder.path() / "capture").string();
    const std::string server =
        folder.Write("s.json", R"({"bmcs": [{"latency_us": 20000, "sel": {"time": 5}}]})");
    const auto times = [](Source source) {
        NQORTQR20::SetMachineFacts(source.facts);
        std::vector<std::string> seen;
        const auto see = [&seen] {
            seen.push_back(NQORTQR20::TOSSpecific::GetLocalTime().ToString());
        };
        for (int i = 0; i < 2; ++i) {
            source.nodes[0].transport->Exchange(RequestOf(kGetSelInfo));
            see();
            source.nodes[0].transport->Exchange(RequestOf(kGetSelTime));
            see();
        }
        NQORTQR20::SetMachineFacts({});
        return seen;
    };
    Source source = OpenSources({"sim:" + server}, {});
    std::vector<std::string> recorded;
    {
        const auto capture = NQORTQR20::RecordTo(file, source, {"A", "B"});
        recorded = times(std::move(source));
        EXPECT_TRUE(capture->Finish());
    }
    EXPECT_LT(recorded[0], recorded[1]);
    Source replay = OpenSources({"replay:" + file}, {});
    EXPECT_THAT(replay.classes, ElementsAre("A", "B"));
    EXPECT_EQ(times(std::move(replay)), recorded);
}

TEST(Capture, OneThatEndsInTheMiddleOfALineIsReplayedAsFarAsItGoes) {
    const ipmiseltest::TemporaryFolder folder;
    const std::string text =
        "{\"ipmisel_capture\": 1, \"nodes\": 1}\n"
        "{\"node\": 0, \"request\": \"01200a004800000000\", \"response\": \"0001000000\"}\n"
        "{\"node\": 0, \"request\": \"01200a004000000000\", \"response\": \"00\"}";
    const std::size_t lastLine = text.rfind('\n') + 1;
    for (std::size_t length = lastLine; length <= text.size(); ++length) {
        Source source =
            OpenSources({"replay:" + folder.Write("capture", text.substr(0, length))}, {});
        EXPECT_TRUE(source.nodes[0].transport->Exchange(RequestOf(kGetSelTime)));
        std::vector<std::string> problems;
        for (const auto& fault : source.nodes[0].missing()) problems.push_back(fault.problem);
        const bool cut = length > lastLine && length < text.size();
        EXPECT_EQ(problems.size(), cut ? 1u : 0u) << length;
        // What it lacks is reported, once.
        for (int i = 0; i < 2; ++i) {
            source.nodes[0].transport->Exchange(RequestOf(kGetSelEntry));
        }
        ASSERT_EQ(source.nodes[0].missing().size(), cut ? 2u : 1u);
        EXPECT_EQ(source.nodes[0].missing().back(),
                  (ReadFault{"Get SEL Entry", "", "not in the capture", true}));
    }
}

TEST(Capture, WhatCannotBeWrittenIsTold) {
    for (const char* file : {"/nonexistent/capture", "/dev/full", "/"}) {
        Source source;
        EXPECT_THROW(NQORTQR20::RecordTo(file, source), SourceError) << file;
    }
    // Half of the longest line, which the other text of it makes too long.
    const ipmiseltest::TemporaryFolder folder;
    const std::string file = folder.Write("capture", "before");
    Source source;
    source.facts.smbios = {std::vector<std::uint8_t>(NQORTQR20::kMaxCaptureLine / 2)};
    EXPECT_THROW(NQORTQR20::RecordTo(file, source), SourceError);
    EXPECT_EQ(ipmiseltest::ReadText(file), "before");
    source.facts.smbios[0].resize(NQORTQR20::kMaxCaptureLine / 2 - 1000);
    EXPECT_TRUE(NQORTQR20::RecordTo(file, source)->Finish());
    EXPECT_EQ(OpenSources({"replay:" + file}, {}).facts.smbios, source.facts.smbios);
}

TEST(Capture, ABadFileIsRefusedByLineKeyAndReason) {
    const auto exchange = [](const std::string& rest) {
        return "{\"ipmisel_capture\": 1, \"nodes\": 1}\n{\"node\": " + rest;
    };
    const struct {
        std::string text;
        const char* message;
    } cases[] = {
        {"", ": is empty, not a capture"},
        {"{\"ipmisel_capture\": 2, \"nodes\": 1}", ":1: ipmisel_capture: must be 1 to 1, not 2"},
        {"{\"ipmisel_capture\": 1}", ":1: nodes: is missing"},
        {"{\"ipmisel_capture\": 1, \"nodes\": 1, \"local_time\": \"noon\"}",
         ":1: local_time: must be a time as in"},
        {exchange("0,"), ":2: not JSON: "},
        {exchange("1, \"request\": \"\", \"response\": null}"),
         ":2: node: the first line announces"},
        {exchange("0, \"request\": \"01200a0040010000\", \"response\": null}"),
         ":2: request: is no request frame"},
        {exchange("0, \"request\": \"01200a004000000000\", \"response\": \"\"}"),
         ":2: response: begins with a completion code"},
        {exchange("0, \"request\": \"01200a004000000000\"}"), ":2: response: is missing"},
        {exchange("0, \"request\": \"01200a004000000000\", \"response\": null, \"at\": \"now\"}"),
         ":2: at: is no time"},
        {exchange("0, \"request\": \"01200a004000000000\", \"response\": null, \"took\": -1}"),
         ":2: took: must be finite and not below 0"},
        {exchange(std::string(std::size_t{5} << 20, ' ')), ":2: the line is longer than 4194304"},
    };
    const ipmiseltest::TemporaryFolder folder;
    for (const auto& c : cases) {
        const std::string file = folder.Write("capture", c.text + (c.text.empty() ? "" : "\n"));
        EXPECT_THAT(Refusal({"replay:" + file}), StartsWith(file + c.message)) << c.text;
    }
    EXPECT_THAT(Refusal({"replay:/nonexistent"}), StartsWith("/nonexistent: cannot be read: "));
    EXPECT_THAT(Refusal({"replay:/"}), StartsWith("/: cannot be read: "));
}

/// The one line with which this machine's BMC is refused; empty when it opens.
std::string InbandRefusal(const std::vector<std::filesystem::path>& devices,
                          tqrhost::SystemSmbios smbios) {
    try {
        tqrhost::OpenInbandDevice(devices, std::move(smbios), std::chrono::seconds(1));
    } catch (const SourceError& error) {
        return error.what();
    }
    return "";
}

TEST(InbandSource, EachFailureHasItsTrueReason) {
    const std::vector<std::uint8_t> ipmiDevice{38, 4, 0, 0, 0, 0};
    const std::vector<std::uint8_t> other{1, 4, 0, 0, 0, 0};
    EXPECT_THAT(InbandRefusal({"/nonexistent/ipmi0"}, {{other}, 0}),
                HasSubstr("neither an IPMI device (/dev/ipmi0) nor an IPMI record"));
    EXPECT_THAT(InbandRefusal({"/nonexistent/ipmi0"}, {{}, EACCES}),
                AllOf(HasSubstr("SMBIOS cannot be read: Permission denied"), HasSubstr("as root")));
    // What is no IPMI device, and a folder.
    EXPECT_THAT(InbandRefusal({"/nonexistent", "/dev/null"}, {{ipmiDevice}, 0}),
                StartsWith("/dev/null: is no IPMI device"));
    EXPECT_THAT(InbandRefusal({"/dev"}, {{ipmiDevice}, 0}),
                StartsWith("/dev: cannot be opened: Is a directory"));
    // A device file that no driver serves.
    const ipmiseltest::TemporaryFolder folder;
    const std::string device = (folder.path() / "ipmi0").string();
    if (mknod(device.c_str(), S_IFCHR | 0600, makedev(261, 0)) != 0) {
        GTEST_SKIP() << "a device file can be made by root only";
    }
    EXPECT_THAT(InbandRefusal({device}, {{other}, 0}),
                StartsWith(device + ": there is no driver behind this device"));
}

TEST(InbandSource, WithoutADriverTheSmbiosRecordMakesAMachineThatIsSilent) {
    const std::vector<std::uint8_t> ipmiDevice{38, 4, 0, 0, 0, 0};
    Source source = tqrhost::OpenInbandDevice({"/nonexistent/ipmi0"}, {{ipmiDevice}, 0},
                                              std::chrono::seconds(1));
    EXPECT_FALSE(source.facts.ipmiDriver);
    EXPECT_THAT(source.facts.smbios, ElementsAre(ipmiDevice));
    ASSERT_EQ(source.nodes.size(), 1u);
    EXPECT_EQ(source.nodes[0].transport->Exchange(RequestOf(kGetSelInfo)), std::nullopt);
}

}  // namespace
