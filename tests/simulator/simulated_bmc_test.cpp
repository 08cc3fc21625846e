#include "simulator/simulated_bmc.h"

#include <gtest/gtest.h>

#include "base/bytes.h"
#include "simulator/server_file.h"

namespace ipmisim {
namespace {

/// "Request: answer". Request: NetFn (and, from bit 8 on, LUN), command, data. Answer: completion
/// code, data; "none" for no response.
void Expect(SimulatedBmc& bmc, std::initializer_list<std::string> cases) {
    for (const std::string& c : cases) {
        const std::size_t colon = c.find(": ");
        const auto values = ipmisel::ScanHexRow(c.substr(0, colon), 16);
        const Bytes request(values->begin(), values->end());
        const auto lun = static_cast<std::uint8_t>(values->front() >> 8);
        const auto answer = bmc.Execute(request[0], lun, request[1], std::span(request).subspan(2));
        std::string text = answer ? DumpBytes(*answer, ipmisel::Digits::kLowerHex) : "none ";
        text.pop_back();
        EXPECT_EQ(text, c.substr(colon + 2)) << c;
    }
}

/// The BMC that a description of a simulated server's one BMC makes.
SimulatedBmc Bmc(const std::string& json) {
    return SimulatedBmc(ParseServer("{\"bmcs\": [" + json + "]}", "test").bmcs.front());
}

TEST(SimulatedBmc, SelEntriesAreFoundByIdChainedAndReadInParts) {
    auto bmc = Bmc(R"({"sel": {"version": "02", "time": 1709640000, "entries": [
        "1000 02 a3a4a5a6 a7a8 a9 aa ab ac ad ae af", "0302 02 b3b4b5b6 b7b8 b9 ba bb bc bd be bf",
        "0500 e0 c3c4c5c6 c7c8 c9 ca cb cc cd ce cf"]}})");
    Expect(bmc, {// The newest time is that of the last record that has one.
                 "0a 40: 00 02 03 00 ff ff b3 b4 b5 b6 ff ff ff ff 00", "0a 48: 00 40 09 e7 65",
                 "0a 43 0 0 00 00 0 ff: 00 03 02 10 00 02 a3 a4 a5 a6 a7 a8 a9 aa ab ac ad ae af",
                 "0a 43 0 0 10 00 7 3: 00 03 02 a7 a8 a9", "0a 43 0 0 03 02 e 9: 00 05 00 be bf",
                 "0a 43 0 0 05 00 f ff: 00 ff ff cf", "0a 43 0 0 ff ff f 1: 00 ff ff cf",
                 "0a 43 0 0 05 00 0 0: 00 ff ff", "0a 43 0 0 05 00 10 1: c9",
                 "0a 43 0 0 04 00 0 ff: cb", "0a 43 0 0 05 00 0: c7"});
}

TEST(SimulatedBmc, SdrWantsTheLatestReservationForReadsWithAnOffset) {
    auto bmc = Bmc(R"({"sdr": {"version": "15", "records": ["0300 51 01 02 b5 b6", "0401 51"]}})");
    Expect(bmc, {"0a 20: 00 15 02 00 f5 ff ff ff ff ff ff ff ff ff 02",
                 "0a 23 0 0 0 0 0 2: 00 04 01 03 00",
                 "0a 23 0 0 0 0 5 2: c5",  // none was made, and 0 is none
                 "0a 22: 00 01 00", "0a 22: 00 02 00", "0a 23 1 0 3 0 5 2: c5",
                 "0a 23 2 0 3 0 5 9: 00 04 01 b5 b6", "0a 23 2 0 3 0 2 ff: 00 04 01 51 01 02 b5 b6",
                 "0a 23 2 0 3 0 7 1: c9", "0a 23 2 0 4 1 2 4: 00 ff ff 51"});
}

TEST(SimulatedBmc, OddDescriptionsDoNoHarm) {
    auto empty = Bmc("{}");
    Expect(empty, {"0a 40: 00 51 00 00 ff ff ff ff ff ff ff ff ff ff 00", "0a 43 0 0 0 0 0 ff: cb",
                   "0a 23 0 0 ff ff 0 ff: cb", "0a 10 0: cb", "0a 11 0 0 0 10: cb", "0a 5a 1: c1",
                   "0a 42: c1", "06 01: c1", "06 40: c1"});
    // Without an ID, with half of one, two of one ID.
    auto odd = Bmc(R"({"sdr": {"records": ["", "07", "0900 a2", "0900 b2"]}})");
    Expect(odd, {"0a 23 0 0 0 0 0 ff: c9", "0a 23 0 0 7 0 0 ff: 00 09 00 07",
                 "0a 23 0 0 9 0 0 ff: 00 09 00 09 00 a2"});
}

TEST(SimulatedBmc, OtherCommandsAnswerWhatIsDescribed) {
    auto bmc = Bmc(R"({"device_id": "20 01 02", "aux_log": {"count": 4660},
        "fru": {"3": "d0 d1 d2 d3"},
        "replies": [{"netfn": "0a", "command": "5b", "request": "01", "response": "12 34"},
                    {"netfn": "2e", "command": "00", "response": "56"}]})");
    Expect(bmc, {"06 01: 00 20 01 02",
                 // Bytes 16 and 17 of the reply frame, whose byte 8 is the completion code.
                 "0a 5a 1: 00 00 00 00 00 00 00 00 34 12", "0a 10 3: 00 04 00 00",
                 "0a 11 3 1 0 2: 00 02 d1 d2", "0a 11 3 3 0 10: 00 01 d3", "0a 11 3 4 0 10: c9",
                 "0a 11 3 0 1 10: c9", "0a 5b 1 77: 00 12 34", "0a 5b 2: c1", "0a 5b: c1",
                 "2e 00 99: 00 56"});
}

TEST(SimulatedBmc, SensorsAreTheBmcsOwnAtTheLunAskedFor) {
    auto bmc = Bmc(R"({"sensors": {
        "30": {"reading": "59", "states": "c0 c1 c2", "thresholds": "3f 05 0a 0f 50 5a 64",
               "factors": {"59": "60 01 02 03 04 05 06"}},
        "20/2/30": {"reading": "77"}, "82/0/31": {"reading": "88"}, "33": {"states": "40"},
        "34": {"thresholds": "00"}, "35": {"reading": "99", "states": ""}}})");
    Expect(bmc, {"04 2d 30: 00 59 c0 c1 c2", "204 2d 30: 00 77 c0 00 80", "104 2d 30: cb",
                 "04 2d 31: cb",  // the sensor of another controller
                 "04 2d 33: 00 00 40", "04 2d 34: cb", "04 2d 35: 00 99",
                 "04 27 30: 00 3f 05 0a 0f 50 5a 64", "204 27 30: cb",
                 "04 23 30 59: 00 60 01 02 03 04 05 06", "04 23 30 5a: cb", "04 23 32 59: cb",
                 "04 2d: c7"});
}

TEST(SimulatedBmc, TheControllerTellsOfItself) {
    auto bmc = Bmc(R"({"guid": "000102030405060708090a0b0c0d0e0f", "chassis_status": "01 02 03",
        "self_test": "57 04", "sel": {"free_bytes": 513, "last_addition": 67305985,
        "last_erase": 134678021, "overflow": true, "utc_offset_minutes": -90},
        "pef": {"filters": ["07 80 01 02 10 ffff 01 ff 01 00 02 000000 000000 000000",
                            "02 00 01 02 10 ffff 01 ff 01 00 02 000000 000000 000000"]}})");
    Expect(bmc,
           {"06 37: 00 00 01 02 03 04 05 06 07 08 09 0a 0b 0c 0d 0e 0f", "06 04: 00 57 04",
            "00 01: 00 01 02 03", "0a 40: 00 51 00 00 01 02 01 02 03 04 05 06 07 08 80",
            "0a 5c: 00 a6 ff", "04 13 05 00 00: 00 11 02", "04 13 85 00 00: 00 11",
            // The second entry, whatever number it has.
            "04 13 06 02 00: 00 11 02 00 01 02 10 ff ff 01 ff 01 00 02 00 00 00 00 00 00 00 00 00",
            "04 13 06 00 00: c9", "04 13 06 03 00: c9", "04 13 01 00 00: 80"});
    auto silent = Bmc("{}");
    Expect(silent, {"06 37: c1", "06 04: c1", "00 01: c1", "0a 5c: c1", "04 13 05 00 00: c1",
                    "04 2d 30: cb", "04 27 30: cb"});
}

TEST(SimulatedBmc, WholeSensorRecordsMayBeRefused) {
    auto bmc = Bmc(R"({"whole_sdr": false, "sdr": {"records": [
        "0100 51 01 12 010203040506070809 0a0b0c0d0e0f101112", "0200 51 02 00"]}})");
    Expect(bmc, {"0a 22: 00 01 00", "0a 23 0 0 0 0 0 ff: ca", "0a 23 0 0 0 0 0 17: ca",
                 "0a 23 0 0 2 0 0 ff: 00 ff ff 02 00 51 02 00",
                 "0a 23 1 0 1 0 14 16: 00 02 00 10 11 12"});
}

TEST(SimulatedBmc, FaultsStrikeTheCallTheyName) {
    auto bmc = Bmc(R"({"sel": {"time": 1144201745}, "faults": [
        {"netfn": "0a", "command": "48", "call": 1, "no_response": true},
        {"netfn": "0a", "command": "48", "call": 2, "completion_code": "c3"},
        {"netfn": "0a", "command": "48", "call": 3, "truncate": 2},
        {"netfn": "0a", "command": "48", "call": 4, "data": "99"},
        {"netfn": "0a", "command": "48", "call": 5, "truncate": 99},
        {"netfn": "0a", "command": "40", "no_response": true}]})");
    Expect(bmc, {"0a 48: none", "0a 48: c3", "0a 40: none", "0a 48: 00 11 22", "0a 48: 00 99",
                 "0a 48: 00 11 22 33 44", "0a 48: 00 11 22 33 44", "0a 40: none"});
}

}  // namespace
}  // namespace ipmisim
