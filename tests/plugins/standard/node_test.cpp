#include "plugins/standard/node.h"

#include <gmock/gmock.h>

#include "simulator/server_file.h"
#include "tests/support/bmc_fixture.h"

namespace standard {
namespace {

using namespace ::testing;
using ipmi::Threshold;

// A temperature, y = x - 10 degrees C, with readable thresholds.
constexpr const char* kTemperature =
    "0100 51 01 32 20 00 30 03 01 7f 68 01 01 00 00 00 00 3f 00 00 01 00"
    " 00 01 00 f6 c0 00 00 00 00 00 00 00 00 64 5f 5a 0f 0a 05 00 00 00 00 00 c7 43505520546d70";
// A discrete power supply sensor at LUN 1.
constexpr const char* kSupply =
    "0200 51 02 1e 20 01 40 0a 01 7f 40 08 6f 00 00 00 00 00 00 c0 00 00"
    " 01 00 00 00 00 00 00 00 c3 505331";
// A sensor of another controller.
constexpr const char* kForeign =
    "0300 51 02 1e 82 00 41 0a 01 7f 40 08 6f 00 00 00 00 00 00 c0 00 00"
    " 01 00 00 00 00 00 00 00 c3 505332";

/// A node over a simulated BMC that is described in JSON.
class NodeTest : public ipmiseltest::BmcTest {
protected:
    std::unique_ptr<Node> Open(const std::string& json) {
        bmc = ipmisim::ParseServer("{\"bmcs\": [" + json + "]}", "test").bmcs.front();
        return std::make_unique<Node>(1, *FreshLibrary());
    }
    static std::string Repository(std::initializer_list<const char*> records) {
        std::string list;
        for (const char* record : records) {
            list += (list.empty() ? "\"" : ", \"") + std::string(record) + "\"";
        }
        return "\"sdr\": {\"records\": [" + list + "]}";
    }
    long Sent(ipmi::CommandCode code) const { return ipmiseltest::CountOf(code, requests); }
};

TEST_F(NodeTest, EachFactIsAskedForOnceAndOnlyWhenWanted) {
    const auto node = Open(R"({"device_id": "20 01 02 15 02 bf 57 01 00 00 01",
        "guid": "000102030405060708090a0b0c0d0e0f", "self_test": "5500",
        "chassis_status": "01 00 00"})");
    EXPECT_THAT(requests, IsEmpty());
    for (int i = 0; i < 2; ++i) {
        EXPECT_EQ(node->DeviceId()->manufacturerId, 0x157u);
        EXPECT_EQ(node->Guid()->at(15), 0x0F);
        EXPECT_EQ(node->SelfTest(), "passed");
        EXPECT_TRUE(node->Chassis()->powerOn);
    }
    EXPECT_THAT(requests, SizeIs(4));
}

TEST_F(NodeTest, WhatTheControllerDoesNotHaveIsEmpty) {
    const auto node = Open("{}");
    EXPECT_FALSE(node->DeviceId() || node->Guid() || node->SelfTest() || node->Chassis());
    EXPECT_EQ(Sent(ipmi::kGetDeviceGuid), 1);  // asked for where the system has none
    EXPECT_FALSE(node->LogAllocation());
    EXPECT_EQ(Sent(ipmi::kGetSelAllocationInfo), 0);
    EXPECT_THAT(node->ReadLog(), IsEmpty());
    EXPECT_THAT(node->Repository(), IsEmpty());
    EXPECT_THAT(node->Filters(), IsEmpty());
}

TEST_F(NodeTest, TheClockIsComparedWithTheCollectors) {
    const ipmiseltest::Machine machine("", "20240305130000.000000+060");
    const auto late = Open(R"({"sel": {"time": 1709639998}})");
    EXPECT_EQ(late->GetClock().time, 1709639998);
    EXPECT_EQ(late->GetClock().offsetSeconds, -2.0);
    EXPECT_EQ(late->GetClock().uncertaintySeconds, 0.5);
    EXPECT_EQ(late->GetClock().utcOffsetMinutes, std::nullopt);
    // A controller that keeps local time and says so is not an hour ahead.
    const auto local = Open(R"({"sel": {"time": 1709643600, "utc_offset_minutes": 60}})");
    EXPECT_EQ(local->GetClock().time, 1709640000);
    EXPECT_EQ(local->GetClock().offsetSeconds, 0.0);
    EXPECT_EQ(local->GetClock().utcOffsetMinutes, 60);
    for (const char* unset : {"5", "536870912", "4294967295"}) {
        const auto node = Open("{\"sel\": {\"time\": " + std::string(unset) + "}}");
        EXPECT_EQ(node->GetClock().time, std::nullopt) << unset;
        EXPECT_EQ(node->GetClock().offsetSeconds, std::nullopt) << unset;
    }
}

TEST_F(NodeTest, TheLogIsReadUpToItsLastRecordOrTheFirstFault) {
    constexpr const char* kLog = R"({"sel": {"entries": [
        "0100 02 b0e5e665 2000 04 01 30 01 59 50 45", "02ff 02 b1e5e665 2000 04 01 30 01 59 50 45",
        "0300 02 b2e5e665 2000 04 01 30 01 59 50 45"]})";
    const auto node = Open(std::string(kLog) + "}");
    EXPECT_THAT(node->ReadLog(), SizeIs(3));  // an ID of FFxxh is one like others
    EXPECT_EQ(Sent(ipmi::kGetSelEntry), 3);
    const auto broken = Open(std::string(kLog) + R"(,
        "faults": [{"netfn": "0a", "command": "43", "call": 3, "completion_code": "cb"}]})");
    EXPECT_THAT(broken->ReadLog(), SizeIs(2));
    // A chain that leads back: every answer names the first record as the next.
    const auto circle = Open(std::string(kLog) + R"(, "faults": [{"netfn": "0a", "command": "43",
        "data": "0100 0100 02 b0e5e665 2000 04 01 30 01 59 50 45"}]})");
    EXPECT_THAT(circle->ReadLog(), SizeIs(1));
}

TEST_F(NodeTest, SensorsAreReadAtTheirOwnersLunAndOnlyTheControllersOwn) {
    const auto node = Open("{" + Repository({kTemperature, kSupply, kForeign}) + R"(,
        "sensors": {"30": {"reading": "59", "states": "c0 00", "thresholds": "3b 05 0a 0f 50 5a 64"},
                    "20/1/40": {"reading": "00", "states": "c0 02 80"}, "41": {"reading": "77"}}})");
    ASSERT_THAT(node->Sensors(), SizeIs(3));
    const SensorState& temperature = node->StateOf(node->Sensors()[0]);
    EXPECT_EQ(temperature.value, 79);
    EXPECT_EQ(temperature.limits[0], -5);
    EXPECT_EQ(temperature.limits[2], std::nullopt);  // not readable
    EXPECT_EQ(temperature.limits[5], 90);
    const SensorState& supply = node->StateOf(*node->FindSensor({0x20, 1, 0x40}));
    EXPECT_TRUE(supply.reading->Asserted(1));
    EXPECT_EQ(supply.value, std::nullopt);
    const SensorState& foreign = node->StateOf(*node->FindSensor({0x82, 0, 0x41}));
    EXPECT_FALSE(foreign.reading || foreign.unavailable);
    EXPECT_EQ(node->FindSensor({0x20, 0, 0x40}), nullptr);
    node->StateOf(node->Sensors()[0]);
    EXPECT_EQ(Sent(ipmi::kGetSensorReading), 2);
    EXPECT_EQ(Sent(ipmi::kGetSensorThresholds), 1);  // a discrete sensor has none
}

TEST_F(NodeTest, ASensorThatGivesNothingHasNoReading) {
    const struct {
        const char* sensor;
        bool unavailable;
    } cases[] = {{R"({"reading": "59", "states": "e0 00"})", true},    // unavailable
                 {R"({"reading": "59", "states": "80 00"})", true},    // not scanned
                 {R"({"thresholds": "01 05 00 00 00 00 00"})", true},  // CBh
                 {R"({"reading": "59", "states": ""})", false}};       // one byte
    for (const auto& c : cases) {
        const auto node =
            Open("{" + Repository({kTemperature}) + ", \"sensors\": {\"30\": " + c.sensor + "}}");
        const SensorState& state = node->StateOf(node->Sensors().at(0));
        EXPECT_EQ(state.unavailable, c.unavailable) << c.sensor;
        EXPECT_FALSE(state.reading || state.value) << c.sensor;
    }
}

TEST_F(NodeTest, ASensorThatTheControllerRefusesOrDoesNotAnswerForIsNoHarm) {
    const struct {
        const char* fault;
        bool unavailable;
    } cases[] = {{R"("completion_code": "d5")", true},
                 {R"("completion_code": "cb")", true},
                 {R"("no_response": true)", false},
                 {R"("truncate": 1)", false}};
    for (const auto& c : cases) {
        const auto node = Open("{" + Repository({kTemperature, kSupply}) + R"(,
            "sensors": {"30": {"reading": "59", "thresholds": "3f 05 0a 0f 50 5a 64"},
                        "20/1/40": {"states": "c0 01 80"}},
            "faults": [{"netfn": "04", "command": "2d", "call": 1, )" +
                               c.fault + "}]}");
        const SensorState& state = node->StateOf(node->Sensors().at(0));
        EXPECT_EQ(state.unavailable, c.unavailable) << c.fault;
        EXPECT_FALSE(state.reading || state.value) << c.fault;
        EXPECT_EQ(state.limits[5], 90) << c.fault;  // its limits can be had all the same
        EXPECT_TRUE(node->StateOf(node->Sensors().at(1)).reading) << c.fault;
    }
}

TEST_F(NodeTest, ANonLinearSensorIsConvertedByTheFactorsOfEachReading) {
    std::string record = kTemperature;
    record.replace(record.find("01 00 00 01 00 f6"), 8, "01 00 70");
    const auto node = Open("{" + Repository({record.c_str()}) + R"(, "sensors": {"30": {
        "reading": "59", "states": "c0 00", "thresholds": "03 05 59 0f 50 5a 64",
        "factors": {"59": "60 02 00 00 00 00 00", "05": "60 00 00 07 00 00 00"}}}})");
    const SensorState& state = node->StateOf(node->Sensors().at(0));
    EXPECT_EQ(state.value, 178);
    EXPECT_EQ(state.limits[0], 7);
    EXPECT_EQ(state.limits[1], 178);
    EXPECT_EQ(Sent(ipmi::kGetSensorReadingFactors), 2);  // one for each raw value
}

TEST_F(NodeTest, FixedThresholdsComeFromTheRecord) {
    std::string record = kTemperature;
    record.replace(record.find("7f 68"), 5, "7f 6c");
    const auto node = Open("{" + Repository({record.c_str()}) + "}");
    EXPECT_EQ(node->StateOf(node->Sensors().at(0)).limits[0], -5);
    EXPECT_EQ(Sent(ipmi::kGetSensorThresholds), 0);
}

TEST_F(NodeTest, ARepositoryIsReadInPartsWhereWholeRecordsAreRefused) {
    for (const char* code : {"ca", "c7", "c8"}) {
        const auto node =
            Open("{" + Repository({kTemperature, kSupply}) +
                 ", \"faults\": [{\"netfn\": \"0a\", \"command\": \"23\", \"call\": 1, "
                 "\"completion_code\": \"" +
                 code + "\"}]}");
        ASSERT_THAT(node->Sensors(), SizeIs(2)) << code;
        EXPECT_EQ(node->Sensors()[0].name, "CPU Tmp");
        EXPECT_TRUE(node->Repository()[0].whole);
        EXPECT_EQ(node->Sensors()[1].name, "PS1");
        EXPECT_EQ(Sent(ipmi::kReserveSdrRepository), 1);
        requests.clear();
    }
    const auto cut = Open("{" + Repository({kTemperature, kSupply}) + R"(, "faults": [
        {"netfn": "0a", "command": "23", "call": 1, "truncate": 20},
        {"netfn": "0a", "command": "23", "call": 4, "truncate": 20}]})");
    ASSERT_THAT(cut->Sensors(), SizeIs(2));
    EXPECT_TRUE(cut->Repository()[0].whole);
    EXPECT_TRUE(cut->Repository()[1].whole);
    EXPECT_EQ(Sent(ipmi::kReserveSdrRepository), 1);
}

TEST_F(NodeTest, ARecordWhoseReservationIsLostIsReadAnewFromItsBeginning) {
    // The first record is cut, its rest refused; what stands at its ID by then is another.
    const auto node = Open("{" + Repository({kSupply, kForeign}) + R"(, "faults": [
        {"netfn": "0a", "command": "23", "call": 1, "data":
         "0200 0100 51 01 32 20 00 30 03 01 7f 68 01 01 00 00 00 00 3f"},
        {"netfn": "0a", "command": "23", "call": 2, "completion_code": "c5"}]})");
    ASSERT_THAT(node->Sensors(), SizeIs(2));
    EXPECT_EQ(node->Sensors()[0].name, "PS1");
    EXPECT_TRUE(node->Repository()[0].whole);
    // One that is lost each time leaves what one answer has, not a mixture of several.
    const auto never = Open("{" + Repository({kTemperature}) + R"(, "faults": [
        {"netfn": "0a", "command": "23", "call": 1, "truncate": 20},
        {"netfn": "0a", "command": "23", "call": 2, "completion_code": "c5"},
        {"netfn": "0a", "command": "23", "call": 3, "truncate": 20},
        {"netfn": "0a", "command": "23", "call": 4, "completion_code": "c5"},
        {"netfn": "0a", "command": "23", "call": 5, "truncate": 20},
        {"netfn": "0a", "command": "23", "call": 6, "completion_code": "c5"},
        {"netfn": "0a", "command": "23", "call": 7, "truncate": 20},
        {"netfn": "0a", "command": "23", "call": 8, "completion_code": "c5"}]})");
    ASSERT_THAT(never->Repository(), SizeIs(1));
    EXPECT_FALSE(never->Repository()[0].whole);
    EXPECT_EQ(never->Sensors().at(0).key.number, 0x30);
}

TEST_F(NodeTest, RecordsOfOneSensorAreConvertedEachByItsOwn) {
    // An event-only record of the same sensor first, and one that counts in another way.
    std::string other = kTemperature;
    other.replace(0, 4, "0300");
    other.replace(other.find("f6 c0"), 5, "00 00");
    const auto node = Open("{" +
                           Repository({"0200 51 03 0f 20 00 30 03 01 01 01 00 00 00 00 c3 545454",
                                       kTemperature, other.c_str()}) +
                           R"(, "sensors": {"30": {"reading": "59", "states": "c0 00",
                                     "thresholds": "3f 05 0a 0f 50 5a 64"}}})");
    ASSERT_THAT(node->Sensors(), SizeIs(3));
    EXPECT_FALSE(node->StateOf(node->Sensors()[0]).value);
    EXPECT_EQ(node->StateOf(node->Sensors()[1]).value, 79);
    EXPECT_EQ(node->StateOf(node->Sensors()[2]).value, 89);
    EXPECT_EQ(node->StateOf(node->Sensors()[2]).limits[0], 5);
    EXPECT_EQ(Sent(ipmi::kGetSensorReading), 1);
    EXPECT_EQ(Sent(ipmi::kGetSensorThresholds), 1);
}

TEST_F(NodeTest, ARecordOfWhichThePartsFailKeepsWhatCame) {
    const auto node = Open("{\"whole_sdr\": false, " + Repository({kTemperature, kSupply}) + R"(,
        "faults": [{"netfn": "0a", "command": "23", "call": 4, "completion_code": "c9"}]})");
    ASSERT_THAT(node->Sensors(), SizeIs(2));
    EXPECT_FALSE(node->Repository()[0].whole);
    EXPECT_EQ(node->Sensors()[0].key.number, 0x30);
    EXPECT_TRUE(node->Repository()[1].whole);
    // A reservation that never holds ends the reading.
    const auto never = Open("{\"whole_sdr\": false, " + Repository({kTemperature}) + R"(,
        "faults": [{"netfn": "0a", "command": "23", "completion_code": "c5"}]})");
    EXPECT_THAT(never->Sensors(), IsEmpty());
}

TEST_F(NodeTest, ARepositoryThatChangesWhileItIsReadKeepsWhatCame) {
    const auto gone = Open("{" + Repository({kTemperature, kSupply, kForeign}) + R"(, "faults": [
        {"netfn": "0a", "command": "23", "call": 2, "completion_code": "cb"}]})");
    EXPECT_THAT(gone->Sensors(), SizeIs(1));
    // Records that do not end: each leads to the next, and the last to the first.
    const auto circle = Open("{" + Repository({kTemperature, kSupply}) + R"(, "faults": [
        {"netfn": "0a", "command": "23", "call": 2, "data": "0100 0200 51 c0 03 570100"}]})");
    EXPECT_THAT(circle->Repository(), SizeIs(2));
}

TEST_F(NodeTest, EventFiltersAreReadInTheirOrder) {
    const auto node = Open(R"({"pef": {"filters": [
        "01 80 01 02 10 ffff 01 ff 01 00 02 000000 000000 000000",
        "02 80 01 02 08 ffff 02 ff 01 00 02 000000 000000 000000"]}})");
    ASSERT_THAT(node->Filters(), SizeIs(2));
    EXPECT_EQ(node->Filters()[1].sensorType, 2);
    const auto none = Open(R"({"pef": {"filters": []}})");
    EXPECT_THAT(none->Filters(), IsEmpty());
}

}  // namespace
}  // namespace standard
