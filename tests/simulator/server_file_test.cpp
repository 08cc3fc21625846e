#include "simulator/server_file.h"

#include <gmock/gmock.h>

#include <cstring>
#include <string>

namespace ipmisim {
namespace {

using namespace ::testing;

constexpr const char* kWhole = R"({  // a server with everything
  "machine_type": "SIM-1", "integrated_bmc": true, "ipmi_driver": false, "ipmi_lan": true,
  "local_time": "20240305120000.000000+060",
  "smbios": ["26 12 0030", ""],
  "bmcs": [{}, {
    "device_id": "20 01", "latency_us": 4294967295,
    "sel": {"version": "02", "entries": ["0100 02 b0e5e665 2000 04 01 30 01 59 50 45"],
            "time": 1709640000},
    "sdr": {"version": "15", "records": ["0A0b0C"]}, /* short */
    "fru": {"0": "01", "255": "0203"}, "aux_log": {"count": 7},
    "replies": [{"netfn": "0a", "command": "5b", "request": "01", "response": "001234"}],
    "faults": [{"netfn": "0a", "command": "40", "call": 1, "no_response": true},
      {"netfn": "0a", "command": "43", "completion_code": "cb"},
      {"netfn": "0a", "command": "23", "truncate": 4},
      {"netfn": "3f", "command": "43", "data": "00 ff"}],
    "guid": "00010203 04050607 08090a0b 0c0d0e0f", "chassis_status": "01 00 00",
    "self_test": "5500", "whole_sdr": false,
    "sensors": {"30": {"reading": "59", "states": "c0 c0", "thresholds": "3f 05", "lun": 1,
                       "factors": {"5a": "60 01 00 02 00 00 00"}, "owner": "20"},
                "82/3/30": {"reading": "5A"}},
    "pef": {"filters": ["01 80 01 02 10 ffff 01 ff 01 00 02 000000 000000 000000"]}
  }, {"sel": {"free_bytes": 65535, "last_addition": 1, "last_erase": 4294967295,
              "overflow": true, "utc_offset_minutes": -90}}]
})";

/// The one line with which a text is refused, after the name of the file.
std::string Refusal(const std::string& text) {
    try {
        ParseServer(text, "s.json");
    } catch (const ServerFileError& error) {
        const std::string message = error.what();
        EXPECT_EQ(message.find('\n'), std::string::npos) << message;
        EXPECT_THAT(message, StartsWith("s.json:"));
        return message.substr(7);
    }
    return "";
}

// What the keys of a BMC do is seen in its answers; here only that all are taken.
TEST(ServerFile, TheMachineIsRead) {
    const ServerDescription server = ParseServer(kWhole, "s.json");
    EXPECT_EQ(server.machineType, "SIM-1");
    EXPECT_TRUE(server.integratedBmc && !server.ipmiDriver && server.ipmiLan);
    EXPECT_EQ(server.localTime, "20240305120000.000000+060");
    EXPECT_THAT(server.smbios, ElementsAre(ElementsAre(0x26, 0x12, 0x00, 0x30), ElementsAre()));
    ASSERT_EQ(server.bmcs.size(), 3u);
    EXPECT_EQ(server.bmcs[1].latencyMicroseconds, 0xFFFFFFFFu);
}

TEST(ServerFile, AClockThatIsNotGivenIsTheMachines) {
    const ServerDescription server = ParseServer(kWhole, "s.json");
    EXPECT_EQ(server.bmcs[0].selTime, 1709636400u);  // 11:00 UTC
    EXPECT_EQ(server.bmcs[1].selTime, 1709640000u);
    EXPECT_EQ(server.bmcs[2].selTime, 1709636400u - 90 * 60);  // it keeps local time
    EXPECT_EQ(ParseServer("{\"bmcs\": [{}]}", "s.json").bmcs[0].selTime, std::nullopt);
    const auto none = R"({"local_time": "20241305120000.000000+060", "bmcs": [{}]})";
    EXPECT_EQ(ParseServer(none, "s.json").bmcs[0].selTime, std::nullopt);
}

TEST(ServerFile, ALongKeyIsNotPrintedWhole) {
    const std::string key(100000, 'k');
    try {
        ParseServer("{\"" + key + "\": 1}", "s.json");
        FAIL() << "read";
    } catch (const std::exception& error) {
        EXPECT_EQ(error.what(), "s.json:1: " + key.substr(0, 100) + "...: no such key here");
    }
}

TEST(ServerFile, RefusalNamesLineKeyAndReason) {
    // Each is the good file with one thing replaced.
    const std::tuple<const char*, const char*, const char*> cases[] = {
        {"_type", "", "2: machine: no such key here"},
        {"\"integrated_bmc\"", "\"machine_type\"", "2: machine_type: stands twice in one object"},
        {"\"SIM-1\"", "5", "2: machine_type: must be a text, not number"},
        {"true, \"ipmi_d", "1, \"ipmi_d", "2: integrated_bmc: must be true or false, not number"},
        {"+060", "", "3: local_time: must be a time as in 20240305120000.000000+060"},
        {"0030", "030", "4: smbios[0]: a byte is two hexadecimal digits; their number here is odd"},
        {"20 01", "20 0x", "6: bmcs[1].device_id: character 5 is no hexadecimal digit"},
        {"7295", "7296", "6: bmcs[1].latency_us: must be 0 to 4294967295, not 4294967296"},
        {"7295", ".0",
         "6: bmcs[1].latency_us: must be a whole number, 0 to 4294967295, not number"},
        {"\"02\"", "\"0002\"",
         "7: bmcs[1].sel.version: must be one byte in hexadecimal digits, not 2"},
        {" 50 45", " 50", "7: bmcs[1].sel.entries[0]: an entry has 16 bytes, not 15"},
        {"[\"0A0b0C\"]", "{}", "9: bmcs[1].sdr.records: must be a list, not object"},
        {"\"255\"", "\"256\"", "10: bmcs[1].fru.256: a FRU device ID is a number from 0 to 255"},
        {"\"255\"", "\"00\"", "10: bmcs[1].fru.00: the same FRU device stands here twice"},
        {"\"command\": \"5b\", ", "", "11: bmcs[1].replies[0].command: is missing"},
        {"\"call\": 1", "\"call\": 0",
         "12: bmcs[1].faults[0].call: must be 1 to 4294967295, not 0"},
        {"nse\": true", "nse\": false",
         "12: bmcs[1].faults[0].no_response: can only be true; leave the key out"},
        {", \"completion_code\": \"cb\"", "",
         "13: bmcs[1].faults[1]: a fault is one of no_response, completion_code, truncate and "
         "data, not 0 of them"},
        {": 4}", ": 4, \"data\": \"\"}",
         "14: bmcs[1].faults[2]: a fault is one of no_response, completion_code, truncate and "
         "data, not 2 of them"},
        {"\"3f\"", "\"40\"", "15: bmcs[1].faults[3].netfn: a NetFn has six bits, 00 to 3f"},
        {"0e0f", "0e", "16: bmcs[1].guid: a GUID has 16 bytes, not 15"},
        {"\"lun\": 1", "\"lun\": 4", "18: bmcs[1].sensors.30.lun: must be 0 to 3, not 4"},
        {"\"5a\"", "\"5\"",
         "19: bmcs[1].sensors.30.factors.5: a reading is two hexadecimal digits"},
        {"60 01 00 02 00 00 00", "60",
         "19: bmcs[1].sensors.30.factors.5a: an answer with factors has 7 bytes, not 1"},
        {"\"5a\"", "\"5A\": \"00000000000000\", \"5a\"",
         "19: bmcs[1].sensors.30.factors.5a: the same reading stands here twice"},
        {"82/3/30", "82/4/30", "20: bmcs[1].sensors.82/4/30: a LUN is 0 to 3"},
        {"82/3/30", "82/330", "20: bmcs[1].sensors.82/330: a sensor is NN or OWNER/LUN/NN"},
        {"82/3/30", "8x/3/30",
         "20: bmcs[1].sensors.8x/3/30: a sensor is NN or OWNER/LUN/NN; each of NN and OWNER is "
         "two hexadecimal digits"},
        {"82/3/30", "20/1/30", "18: bmcs[1].sensors.30: the same sensor stands here twice"},
        {"\"5A\"", "\"5A\", \"lun\": 3",
         "20: bmcs[1].sensors.82/3/30.lun: stands in the sensor's key already"},
        {"01 80 01 02", "01 80 01",
         "21: bmcs[1].pef.filters[0]: an event filter has 21 bytes, not 20"},
        {"65535", "65536", "22: bmcs[2].sel.free_bytes: must be 0 to 65535, not 65536"},
        {"-90", "-1441", "23: bmcs[2].sel.utc_offset_minutes: must be -1440 to 2047, not -1441"},
        {"-90", "1441",
         "23: bmcs[2].sel.utc_offset_minutes: must be -1440 to 1440, or 2047 for not known"},
        {"-90", "4294967296",
         "23: bmcs[2].sel.utc_offset_minutes: must be -1440 to 2047, not 4294967296"},
    };
    for (const auto& [from, to, message] : cases) {
        std::string text = kWhole;
        EXPECT_EQ(Refusal(text.replace(text.find(from), std::strlen(from), to)), message);
    }
}

TEST(ServerFile, WhatIsNotJsonOrCannotBeReadIsRefused) {
    EXPECT_THAT(Refusal(""), StartsWith("1: not JSON: syntax error"));
    EXPECT_THAT(Refusal("{\n\"bmcs\": [\n{]}"), StartsWith("3: not JSON: syntax error"));
    EXPECT_THAT(Refusal("{} \n {}"), StartsWith("2: not JSON: syntax error"));
    EXPECT_THAT(Refusal("{\"machine_type\": \"\xFF\"}"), StartsWith("1: not JSON: "));
    EXPECT_EQ(Refusal("[]"), "1: must be an object, not array");
    EXPECT_EQ(Refusal("{\"a\\nb\": 1}"), "1: a?b: no such key here");
    EXPECT_THROW(ReadServerFile("/nonexistent/s.json"), ServerFileError);
    EXPECT_THROW(ReadServerFile("/"), ServerFileError);
}

}  // namespace
}  // namespace ipmisim
