#include "simulator/server_file.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>

namespace ipmisim {
namespace {

using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::Not;
using ::testing::StartsWith;

constexpr const char* kWhole = R"({
  // a server with everything
  "machine_type": "SIM-1", "integrated_bmc": true, "ipmi_driver": false, "ipmi_lan": true,
  "local_time": "20240305120000.000000+060",
  "smbios": ["26 12 0030", ""],
  "bmcs": [{}, {
    "device_id": "20 01",
    "latency_us": 4294967295,
    "sel": {"version": "02", "entries": ["0100 02 b0e5e665 2000 04 01 30 01 59 50 45"],
            "time": 1709640000},
    "sdr": {"version": "15", "records": ["0A0b0C"]}, /* short */
    "fru": {"0": "01", "255": "0203"},
    "aux_log": {"count": 7},
    "replies": [{"netfn": "0a", "command": "5b", "request": "01", "response": "001234"}],
    "faults": [
      {"netfn": "0a", "command": "40", "call": 1, "no_response": true},
      {"netfn": "0a", "command": "43", "completion_code": "cb"},
      {"netfn": "0a", "command": "23", "truncate": 4},
      {"netfn": "3f", "command": "43", "data": "00 ff"}
    ]
  }]
})";

TEST(ServerFile, EveryKeyIsRead) {
    const ServerDescription server = ParseServer(kWhole, "s.json");
    EXPECT_EQ(server.machineType, "SIM-1");
    EXPECT_TRUE(server.integratedBmc && !server.ipmiDriver && server.ipmiLan);
    EXPECT_EQ(server.localTime, "20240305120000.000000+060");
    EXPECT_THAT(server.smbios, ElementsAre(ElementsAre(0x26, 0x12, 0x00, 0x30), ElementsAre()));
    ASSERT_EQ(server.bmcs.size(), 2u);
    EXPECT_FALSE(server.bmcs[0].deviceId || server.bmcs[0].selTime || server.bmcs[0].auxLogCount);
    const BmcDescription& bmc = server.bmcs[1];
    EXPECT_EQ(bmc.deviceId, (Bytes{0x20, 0x01}));
    EXPECT_EQ(bmc.latencyMicroseconds, 0xFFFFFFFFu);
    EXPECT_EQ(bmc.selVersion, 0x02);
    EXPECT_THAT(bmc.selEntries, ElementsAre(ElementsAre(1, 0, 2, 0xB0, 0xE5, 0xE6, 0x65, 0x20, 0, 4,
                                                        1, 0x30, 1, 0x59, 0x50, 0x45)));
    EXPECT_EQ(bmc.selTime, 1709640000u);
    EXPECT_EQ(bmc.sdrVersion, 0x15);
    EXPECT_THAT(bmc.sdrRecords, ElementsAre(ElementsAre(0x0A, 0x0B, 0x0C)));
    EXPECT_EQ(bmc.fru, (std::map<std::uint8_t, Bytes>{{0, {1}}, {255, {2, 3}}}));
    EXPECT_EQ(bmc.auxLogCount, 7u);
    ASSERT_EQ(bmc.replies.size(), 1u);
    EXPECT_EQ(bmc.replies[0].netFn, 0x0A);
    EXPECT_EQ(bmc.replies[0].command, 0x5B);
    EXPECT_EQ(bmc.replies[0].request, (Bytes{0x01}));
    EXPECT_EQ(bmc.replies[0].response, (Bytes{0x00, 0x12, 0x34}));
    ASSERT_EQ(bmc.faults.size(), 4u);
    EXPECT_EQ(bmc.faults[0].kind, Fault::Kind::kNoResponse);
    EXPECT_EQ(bmc.faults[0].call, 1u);
    EXPECT_EQ(bmc.faults[1].kind, Fault::Kind::kCompletionCode);
    EXPECT_EQ(bmc.faults[1].completionCode, 0xCB);
    EXPECT_EQ(bmc.faults[1].call, std::nullopt);
    EXPECT_EQ(bmc.faults[2].kind, Fault::Kind::kTruncate);
    EXPECT_EQ(bmc.faults[2].truncate, 4u);
    EXPECT_EQ(bmc.faults[3].kind, Fault::Kind::kData);
    EXPECT_EQ(bmc.faults[3].data, (Bytes{0x00, 0xFF}));
    EXPECT_EQ(bmc.faults[3].netFn, 0x3F);
}

TEST(ServerFile, RefusalNamesFileLineKeyAndReason) {
    // Each is the good file with one thing replaced.
    const struct {
        const char* from;
        const char* to;
        const char* message;
    } cases[] = {
        {"\"machine_type\"", "\"machine\"", "s.json:3: machine: no such key here"},
        {"\"SIM-1\"", "5", "s.json:3: machine_type: must be a text, not number"},
        {"true, \"ipmi_driver\"", "1, \"ipmi_driver\"",
         "s.json:3: integrated_bmc: must be true or false, not number"},
        {"+060", "", "s.json:4: local_time: must be a time as in 20240305120000.000000+060"},
        {"\"26 12 0030\"", "\"26 120 030 1\"",
         "s.json:5: smbios[0]: a byte is two hexadecimal digits; their number here is odd"},
        {"\"20 01\"", "\"20 0x\"",
         "s.json:7: bmcs[1].device_id: character 5 is no hexadecimal digit"},
        {"4294967295", "4294967296",
         "s.json:8: bmcs[1].latency_us: must be 0 to 4294967295, not 4294967296"},
        {"4294967295", "-1", "s.json:8: bmcs[1].latency_us: must be 0 to 4294967295, not -1"},
        {"4294967295", "1.5",
         "s.json:8: bmcs[1].latency_us: must be a whole number, 0 to 4294967295, not number"},
        {"\"version\": \"02\"", "\"version\": \"0002\"",
         "s.json:9: bmcs[1].sel.version: must be one byte in hexadecimal digits, not 2"},
        {"59 50 45", "59 50", "s.json:9: bmcs[1].sel.entries[0]: an entry has 16 bytes, not 15"},
        {"[\"0A0b0C\"]", "{}", "s.json:11: bmcs[1].sdr.records: must be a list, not object"},
        {"\"255\"", "\"256\"",
         "s.json:12: bmcs[1].fru.256: a FRU device ID is a number from 0 to 255"},
        {"\"255\"", "\"\"", "s.json:12: bmcs[1].fru.: a FRU device ID is a number from 0 to 255"},
        {"\"count\": 7", "", "s.json:13: bmcs[1].aux_log.count: is missing"},
        {"\"count\": 7", "\"count\": 65536",
         "s.json:13: bmcs[1].aux_log.count: must be 0 to 65535, not 65536"},
        {"\"command\": \"5b\", ", "", "s.json:14: bmcs[1].replies[0].command: is missing"},
        {"\"call\": 1", "\"call\": 0",
         "s.json:16: bmcs[1].faults[0].call: must be 1 to 4294967295, not 0"},
        {"\"no_response\": true", "\"no_response\": false",
         "s.json:16: bmcs[1].faults[0].no_response: can only be true; leave the key out"},
        {", \"completion_code\": \"cb\"", "",
         "s.json:17: bmcs[1].faults[1]: a fault is one of no_response, completion_code, truncate "
         "and data, not 0 of them"},
        {"\"truncate\": 4", "\"truncate\": 4, \"data\": \"\"",
         "s.json:18: bmcs[1].faults[2]: a fault is one of no_response, completion_code, truncate "
         "and data, not 2 of them"},
        {"\"3f\"", "\"40\"", "s.json:19: bmcs[1].faults[3].netfn: a NetFn has six bits, 00 to 3f"},
    };
    for (const auto& c : cases) {
        std::string text = kWhole;
        text.replace(text.find(c.from), std::string(c.from).size(), c.to);
        try {
            ParseServer(text, "s.json");
            ADD_FAILURE() << "accepted: " << c.to;
        } catch (const ServerFileError& error) {
            EXPECT_STREQ(error.what(), c.message);
        }
    }
}

TEST(ServerFile, WhatIsNotJsonIsRefusedInOneLine) {
    const struct {
        const char* text;
        const char* start;
    } cases[] = {{"", "s.json:1: not JSON: syntax error"},
                 {"{\n\"bmcs\": [\n{]}", "s.json:3: not JSON: syntax error"},
                 {"{} \n {}", "s.json:2: not JSON: syntax error"},
                 {"[]", "s.json:1: must be an object, not array"},
                 {"{\"a\\nb\": 1}", "s.json:1: a?b: no such key here"},
                 {"{\"machine_type\": \"\xFF\"}", "s.json:1: not JSON: "}};
    for (const auto& c : cases) {
        try {
            ParseServer(c.text, "s.json");
            ADD_FAILURE() << "accepted: " << c.text;
        } catch (const ServerFileError& error) {
            EXPECT_THAT(error.what(), StartsWith(c.start));
            EXPECT_THAT(error.what(), Not(HasSubstr("\n")));
        }
    }
}

TEST(ServerFile, AFileThatCannotBeReadSaysWhy) {
    for (const char* file : {"/nonexistent/s.json", "/"}) {
        try {
            ReadServerFile(file);
            ADD_FAILURE() << "read: " << file;
        } catch (const ServerFileError& error) {
            EXPECT_THAT(error.what(), StartsWith(std::string(file) + ": cannot be read: "));
        }
    }
}

}  // namespace
}  // namespace ipmisim
