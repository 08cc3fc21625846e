#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <string>
#include <vector>

#include "host/spdriver/kinds.h"
#include "host/spdriver/transport.h"
#include "tests/host/spdriver/requests.h"
#include "tests/support/ipmi_sim.h"

namespace {

using ipmiseltest::ReadRequest;
using ipmiseltest::StorageRequest;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::Not;
using ::testing::StartsWith;
using tqrhost::OpenSources;
using tqrhost::Response;
using tqrhost::Source;
using tqrhost::SourceError;

constexpr std::uint8_t kGetSelInfo = 0x40, kGetSelEntry = 0x43, kGetSelTime = 0x48;

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

std::vector<std::string> LinesOf(const std::string& file) {
    std::ifstream in(file);
    std::vector<std::string> lines;
    for (std::string line; std::getline(in, line);) lines.push_back(line);
    return lines;
}

constexpr const char* kServer = R"({
  "machine_type": "SIM-1", "integrated_bmc": true, "ipmi_driver": false, "ipmi_lan": true,
  "local_time": "20240305120000.000000+060", "smbios": ["26 04 0030 0000"],
  "bmcs": [
    {"sel": {"time": 1, "entries": ["0100 02 b0e5e665 2000 04 01 30 01 59 50 45"]},
     "faults": [{"netfn": "0a", "command": "48", "call": 1, "no_response": true},
                {"netfn": "0a", "command": "48", "call": 2, "completion_code": "c3"}]},
    {"sel": {"time": 2}}
  ]
})";

TEST(Sources, WhatIsOfNoKindOrCannotBeJoinedIsRefused) {
    EXPECT_THAT(Refusal({}), HasSubstr("no source"));
    EXPECT_THAT(Refusal({"usb:0"}), AllOf(StartsWith("this build has no source \"usb:0\""),
                                          HasSubstr("sim:FILE, replay:FILE")));
    EXPECT_THAT(Refusal({"inband:x"}), StartsWith("this build has no source"));
    EXPECT_THAT(Refusal({"sim:"}), HasSubstr("write it as sim:FILE"));
    EXPECT_THAT(Refusal({"sim:a", "sim:b"}), HasSubstr("\"sim:a\" stands alone"));
    EXPECT_THAT(Refusal({"sim:/nonexistent"}), HasSubstr("cannot be read"));
#ifndef IPMISEL_FREEIPMI
    EXPECT_THAT(Refusal({"lan:h"}), StartsWith("this build has no source \"lan:h\""));
    EXPECT_THAT(Refusal({"inband"}), StartsWith("this build has no source \"inband\""));
#endif
}

TEST(Capture, AReplayAnswersWhatWasRecorded) {
    const ipmiseltest::TemporaryFolder folder;
    const std::string file = (folder.path() / "capture").string();
    std::vector<std::optional<Response>> recorded;
    {
        Source source = OpenSources({"sim:" + folder.Write("s.json", kServer)}, {});
        const auto capture = tqrhost::RecordTo(file, source);
        for (int i = 0; i < 3; ++i) {
            recorded.push_back(source.nodes[0]->Exchange(StorageRequest(kGetSelTime)));
        }
        recorded.push_back(source.nodes[0]->Exchange(ReadRequest(kGetSelEntry, 1)));
        recorded.push_back(source.nodes[1]->Exchange(StorageRequest(kGetSelTime)));
        EXPECT_TRUE(capture->Finish());
    }
    ASSERT_EQ(recorded[0], std::nullopt);
    ASSERT_EQ(recorded[1], (Response{0xC3}));

    const auto lines = LinesOf(file);
    ASSERT_EQ(lines.size(), 6u);
    EXPECT_THAT(lines[0], StartsWith("{\"ipmisel_capture\":1,\"machine_type\":\"SIM-1\","));
    EXPECT_EQ(lines[1],
              R"({"node": 0, "request": "01200a004800000000000000000000", "response": null})");

    Source replay = OpenSources({"replay:" + file}, {});
    EXPECT_EQ(replay.facts.machineType, "SIM-1");
    EXPECT_TRUE(replay.facts.integratedBmc && !replay.facts.ipmiDriver && replay.facts.ipmiLan);
    EXPECT_EQ(replay.facts.localTime, "20240305120000.000000+060");
    EXPECT_THAT(replay.facts.smbios, ElementsAre(ElementsAre(0x26, 0x04, 0x00, 0x30, 0, 0)));
    ASSERT_EQ(replay.nodes.size(), 2u);
    for (int i = 0; i < 3; ++i) {
        EXPECT_EQ(replay.nodes[0]->Exchange(StorageRequest(kGetSelTime)), recorded[i]) << i;
    }
    EXPECT_EQ(replay.nodes[0]->Exchange(StorageRequest(kGetSelTime)), recorded[2]);
    EXPECT_EQ(replay.nodes[0]->Exchange(ReadRequest(kGetSelEntry, 1)), recorded[3]);
    EXPECT_EQ(replay.nodes[1]->Exchange(StorageRequest(kGetSelTime)), recorded[4]);
    // Not in the capture: another node's request, other data.
    EXPECT_EQ(replay.nodes[1]->Exchange(ReadRequest(kGetSelEntry, 1)), std::nullopt);
    EXPECT_EQ(replay.nodes[0]->Exchange(ReadRequest(kGetSelEntry, 2)), std::nullopt);
    EXPECT_EQ(replay.nodes[0]->Exchange(StorageRequest(kGetSelInfo)), std::nullopt);
}

TEST(Capture, TheClockIsHeldStillFromTheRecordingOn) {
    const ipmiseltest::TemporaryFolder folder;
    const std::string file = (folder.path() / "capture").string();
    Source source = OpenSources({"sim:" + folder.Write("s.json", "{}")}, {});
    ASSERT_EQ(source.facts.localTime, std::nullopt);
    tqrhost::RecordTo(file, source);
    ASSERT_TRUE(source.facts.localTime);
    EXPECT_EQ(OpenSources({"replay:" + file}, {}).facts.localTime, source.facts.localTime);
}

TEST(Capture, WhatCannotBeWrittenIsToldAndLeavesNothingBehind) {
    Source source;
    for (const char* file : {"/nonexistent/capture", "/dev/full", "/"}) {
        try {
            tqrhost::RecordTo(file, source);
            ADD_FAILURE() << "recorded to " << file;
        } catch (const SourceError& error) {
            EXPECT_THAT(error.what(),
                        StartsWith("the capture " + std::string(file) + " cannot be written: "));
        }
    }
    EXPECT_TRUE(std::filesystem::exists("/dev/full"));
}

TEST(Capture, ABadFileIsRefusedByLineKeyAndReason) {
    const std::string facts = "{\"ipmisel_capture\": 1, \"nodes\": 1}\n";
    const struct {
        std::string text;
        const char* message;
    } cases[] = {
        {"", ": is empty, not a capture"},
        {"{}", ":1: ipmisel_capture: is missing"},
        {"{\"ipmisel_capture\": 2, \"nodes\": 1}", ":1: ipmisel_capture: must be 1 to 1, not 2"},
        {"{\"ipmisel_capture\": 1}", ":1: nodes: is missing"},
        {facts + "{\"node\": 0,", ":2: not JSON: "},
        {facts + "{\"node\": 1, \"request\": \"\", \"response\": null}",
         ":2: node: the first line announces fewer nodes"},
        {facts + "{\"node\": 0, \"request\": \"01200a0040010000\", \"response\": null}",
         ":2: request: is no request frame"},
        {facts + "{\"node\": 0, \"request\": \"01200a004001000000\", \"response\": null}",
         ":2: request: is no request frame"},
        {facts + "{\"node\": 0, \"request\": \"01200a004000000000\", \"response\": \"\"}",
         ":2: response: begins with a completion code"},
        {facts + "{\"node\": 0, \"request\": \"01200a004000000000\"}", ":2: response: is missing"},
    };
    const ipmiseltest::TemporaryFolder folder;
    for (const auto& c : cases) {
        const std::string file = folder.Write("capture", c.text);
        EXPECT_THAT(Refusal({"replay:" + file}), StartsWith(file + c.message)) << c.text;
    }
    EXPECT_THAT(Refusal({"replay:/nonexistent"}), StartsWith("/nonexistent: cannot be read: "));
    EXPECT_THAT(Refusal({"replay:/"}), StartsWith("/: cannot be read: "));
}

#ifdef IPMISEL_FREEIPMI
TEST(Inband, WithoutADriverOnlyTheSmbiosRecordMakesAMachine) {
    const std::vector<std::uint8_t> ipmiDevice{38, 4, 0, 0, 0, 0};
    EXPECT_THROW(tqrhost::OpenInbandDevice({"/nonexistent/ipmi0"}, {{1, 4, 0, 0, 0, 0}}),
                 SourceError);
    Source source = tqrhost::OpenInbandDevice({"/nonexistent/ipmi0"}, {ipmiDevice});
    EXPECT_FALSE(source.facts.ipmiDriver);
    EXPECT_THAT(source.facts.smbios, ElementsAre(ipmiDevice));
    ASSERT_EQ(source.nodes.size(), 1u);
    EXPECT_EQ(source.nodes[0]->Exchange(StorageRequest(kGetSelInfo)), std::nullopt);
    // A device that is there is used; what is no IPMI device fails in one line.
    EXPECT_THROW(tqrhost::OpenInbandDevice({"/nonexistent", "/dev"}, {ipmiDevice}), SourceError);
}
#endif

}  // namespace
