// The classes as the host gets them, over simulated machines.

#include <gmock/gmock.h>

#include <map>

#include "base/hex.h"
#include "base/text.h"
#include "host/spdriver/source.h"
#include "plugins/standard/classes.h"
#include "plugins/standard/controller_class.h"
#include "plugins/standard/enterprise_names.h"
#include "plugins/standard/plugin.h"
#include "plugins/standard/sensor_class.h"
#include "simulator/server_file.h"
#include "tests/support/bmc_fixture.h"
#include "tests/support/fru_image.h"
#include "tests/support/spd_image.h"
#include "tests/support/temporary_folder.h"

namespace standard {
namespace {

using namespace ::testing;

constexpr const char* kServer = R"({"local_time": "20240305130000.000000+060", "bmcs": [{
  "device_id": "20 81 02 15 02 bf 57 01 00 34 12 01 02 03 04",
  "guid": "0f0e0d0c 0b0a 0908 0706 050403020100", "self_test": "5500",
  "chassis_status": "03 01 01",
  "sel": {"time": 1709643598, "utc_offset_minutes": 60, "free_bytes": 16, "overflow": true,
          "last_erase": 4294967295, "entries": ["0100 02 b0e5e665 2000 04 01 30 01 59 50 45"]},
  "sdr": {"records": [
    "0100 51 01 32 20 00 30 03 01 7f 68 01 01 00 00 00 00 3f 00 00 01 00 00 01 02 f6 c0 10 00 05 20 20 00 00 00 64 5f 5a 0f 0a 05 02 03 00 00 00 c7 43505520546d70",
    "0200 51 02 1f 20 01 40 0a 61 7f 40 08 6f 00 00 00 00 00 00 c0 00 00 02 00 00 00 00 00 00 00 c4 50532041",
    "0300 51 03 0f 41 02 50 22 01 0f 6f 01 00 00 00 c3 534d49"]},
  "sensors": {"30": {"reading": "69", "states": "c0 c8", "thresholds": "3f 05 0a 0f 5a 5f 64"},
              "20/1/40": {"states": "c0 03 80"}}
}, {}]})";

/// A value of a property as text, and its type.
std::string Shown(const NQORTQR20::PropertyValue& value) {
    struct Visitor {
        std::string operator()(const std::string& v) const { return v; }
        std::string operator()(std::int64_t v) const { return std::to_string(v); }
        std::string operator()(double v) const { return ipmisel::Format("%.10g", v); }
        std::string operator()(bool v) const { return v ? "true" : "false"; }
        std::string operator()(const NQORTQR20::Time& v) const { return NQORTQR20::TimeText(v); }
        std::string operator()(const std::vector<std::string>& v) const {
            std::string all;
            for (const std::string& text : v) all += "[" + text + "]";
            return all.empty() ? "[]" : all;
        }
        std::string operator()(const std::vector<std::uint8_t>&) const { return "bytes"; }
        std::string operator()(const NQORTQR20::ObjectPath&) const { return "reference"; }
    };
    return std::visit(Visitor(), value);
}

/// "Name=value; " for every property, in the order of their names.
std::string Told(const std::map<std::string, std::string>& properties) {
    std::string told;
    for (const auto& [name, value] : properties) told += name + "=" + value + "; ";
    return told;
}

class StandardClasses : public Test {
protected:
    ~StandardClasses() override { NQORTQR20::CloseMachine(); }

    /// One pass over a simulated server; its status.
    std::int32_t Pass(const std::string& json, std::vector<const char*> classNames) {
        auto server = ipmisim::ParseServer(json, "test");
        NQORTQR20::Source source;
        source.facts.localTime = server.localTime;
        source.facts.smbios = server.smbios;
        for (auto& bmc : server.bmcs) {
            source.nodes.push_back(
                {"sim",
                 std::make_unique<ipmiseltest::SimulatedTransport>(std::move(bmc), &requests),
                 {}});
        }
        NQORTQR20::OpenMachine(std::move(source));
        written.instances.clear();
        const NQORTQR20::OutputHandle output(written);
        return GetData(context.get(), output.get(), classNames.data(),
                       static_cast<int>(classNames.size()))
            .code;
    }
    /// The same of a pass without a fault; every property of every instance as text.
    std::vector<std::map<std::string, std::string>> Collect(const std::string& json,
                                                            std::vector<const char*> classNames) {
        EXPECT_EQ(Pass(json, std::move(classNames)), NQORTQR20::kStatusOk);
        std::vector<std::map<std::string, std::string>> all;
        for (const auto& instance : written.instances) {
            auto& properties = all.emplace_back();
            for (const auto& [name, value] : instance.properties) properties[name] = Shown(value);
        }
        return all;
    }

    ipmiseltest::InstanceRecorder written;
    std::vector<std::vector<std::uint8_t>> requests;
    NQORTQR20::PluginContext context{"/nowhere"};
};

TEST_F(StandardClasses, AControllerTellsWhatItIsAndHowItIs) {
    auto all = Collect(kServer, {"IPMI_Controller"});
    ASSERT_EQ(all.size(), 2u);
    all[0].erase("Manufacturer");  // by a file of the system
    EXPECT_EQ(Told(all[0]),
              "AuxiliaryRevision=01020304; Capabilities=[chassis device][IPMB event "
              "generator][IPMB event receiver][FRU inventory device][SEL device][SDR "
              "repository device][sensor device]; ChassisIntrusion=true; "
              "ClockOffsetSeconds=-2; ClockUncertaintySeconds=0.5; DeviceID=32; "
              "DeviceRevision=1; FirmwareVersion=2.15; "
              "GUID=00010203-0405-0607-0809-0a0b0c0d0e0f; IPMIVersion=2.0; LastPowerEvent=[AC "
              "failed]; ManufacturerID=343; Node=1; PowerFaults=[power overload]; "
              "PowerOn=true; ProductID=4660; SelfTest=passed; Time=2024-03-05T11:59:58Z; "
              "UTCOffsetMinutes=60; ");
    // Of a controller that says nothing only its number and the clock that it has all the same.
    EXPECT_THAT(all[1],
                ElementsAre(Pair("ClockOffsetSeconds", "0"), Pair("ClockUncertaintySeconds", "0.5"),
                            Pair("Node", "2"), Pair("Time", "2024-03-05T12:00:00Z")));
}

TEST_F(StandardClasses, TheSystemIsKnownBySmbiosOrByItsInventory) {
    // Type 1: manufacturer, product, version, serial number; the identity that the controller sends
    // the other way round.
    const std::string smbios = R"("smbios": ["011b0100 01020304 03020100 0504 0706 08090a0b0c0d0e0f
        060000 4d616b657200 426f7800 3100 534e3700 00"])";
    std::string oneLine = smbios;
    oneLine.erase(oneLine.find('\n'), 1);
    const auto all = Collect("{" + oneLine + R"(, "bmcs": [{
        "guid": "0f0e0d0c 0b0a 0908 0706 050403020100"}]})",
                             {"IPMI_Controller"});
    EXPECT_EQ(all.at(0).at("SystemManufacturer"), "Maker");
    EXPECT_EQ(all[0].at("SystemProduct"), "Box");
    EXPECT_EQ(all[0].at("SystemSerialNumber"), "SN7");
    EXPECT_EQ(all[0].at("GUIDOrder"), "IPMI");
}

TEST_F(StandardClasses, TheEventLogAsAWhole) {
    const auto all = Collect(kServer, {"IPMI_EventLog"});
    EXPECT_THAT(all[0],
                ElementsAre(Pair("FreeBytes", "16"), Pair("LastAddition", "2024-03-05T08:28:16Z"),
                            Pair("Node", "1"), Pair("Overflow", "true"), Pair("Records", "1"),
                            Pair("UsedPercent", "50"), Pair("Version", "1.5")));
    EXPECT_THAT(all[1], ElementsAre(Pair("FreeBytes", "65535"), Pair("Node", "2"),
                                    Pair("Overflow", "false"), Pair("Records", "0"),
                                    Pair("Version", "1.5")));
    const auto allocated = Collect(R"({"bmcs": [{"faults": [{"netfn": "0a", "command": "40",
        "data": "51 0100 3000 ffffffff ffffffff 01"}], "replies": [{"netfn": "0a", "command": "41",
        "response": "0002 1000 f801 f001 02"}]}]})",
                                   {"IPMI_EventLog"});
    EXPECT_EQ(allocated.at(0).at("Allocation"),
              "unit size 16 bytes; units 512; free units 504; largest free block 496 units");
    EXPECT_EQ(allocated.at(0).at("UsedPercent"), "25");
}

TEST_F(StandardClasses, SensorsWithReadingLimitsAndStates) {
    const auto all = Collect(kServer, {"IPMI_Sensor"});
    ASSERT_EQ(all.size(), 4u);
    EXPECT_EQ(Told(all[0]),
              "Accuracy=0.64; Entity=Processor; EntityID=3; EntityInstance=1; "
              "EntityIsDeviceRelative=false; EventType=Threshold; EventTypeCode=1; LUN=0; "
              "LowerCritical=0; LowerNonCritical=-5; LowerNonRecoverable=5; Name=CPU Tmp; "
              "NegativeHysteresis=3; Node=1; Nominal=22; NormalMinimum=-10; Number=48; "
              "OwnerAddress=32; Part=Processor 1; PositiveHysteresis=2; Reading=95; "
              "RecordID=1; States=[at or above upper non-critical threshold]; Status=warning; "
              "Tolerance=1; Type=Temperature; TypeCode=1; Unit=degrees C; UpperCritical=85; "
              "UpperNonCritical=80; UpperNonRecoverable=90; ");
    EXPECT_EQ(all[1].at("Name"), "PS A 0");
    EXPECT_EQ(all[1].at("EntityIsDeviceRelative"), "true");
    EXPECT_THAT(all[1].at("States"), AllOf(HasSubstr("present"), HasSubstr("fail")));
    EXPECT_EQ(all[1].at("Status"), "critical");
    EXPECT_EQ(all[1].count("Reading") + all[1].count("Unit"), 0u);
    EXPECT_EQ(all[2].at("Number"), "65");
    EXPECT_EQ(all[2].at("Status"), "unavailable");  // CBh
    EXPECT_EQ(all[3].at("Name"), "SMI");
    EXPECT_EQ(all[3].count("Status") + all[3].count("States"), 0u);  // cannot be read
}

TEST_F(StandardClasses, WhatIsUnspecifiedIsLeftOut) {
    const auto all = Collect(R"({"bmcs": [{"device_id": "00 01 02 15 02 00 000000 0000",
        "sdr": {"records": [
    "0100 51 02 1c 2000 30 0001 7f40 016f 0000 0000 0000 c00000 0100 000000000000 c141"]}}]})",
                             {"IPMI_Controller", "IPMI_Sensor"});
    ASSERT_EQ(all.size(), 2u);
    for (const char* name : {"DeviceID", "ManufacturerID", "ProductID", "Capabilities"}) {
        EXPECT_EQ(all[0].count(name), 0u) << name;
    }
    EXPECT_EQ(all[1].at("Name"), "A");
    for (const char* name : {"Entity", "EntityID", "EntityInstance", "EntityIsDeviceRelative"}) {
        EXPECT_EQ(all[1].count(name), 0u) << name;
    }
}

TEST_F(StandardClasses, ASensorSaysWhyAValueIsMissing) {
    // kServer's temperature with one thing broken each; linearization and M stand after the units.
    const std::string record =
        "0100 51 01 32 2000 30 0301 7f68 0101 0000 0000 3f00 000100 00 01 00 f6 c0 10 00 05 202000 "
        "0000 645f5a0f0a05 0203 000000 c7 43505520546d70";
    const struct {
        const char *from, *to, *reading, *problem;
    } cases[] = {
        {"", "", "\"reading\": \"69\"", nullptr},
        {"00 01 00 f6", "0c 01 00 f6", "\"reading\": \"69\"",
         "[not converted: linearization 0ch is reserved]"},
        {"00 01 00 f6", "0f 01 00 f6", "\"reading\": \"69\"",
         "[not converted: linearization 0fh is reserved]"},
        {"00 01 00 f6", "6f 01 00 f6", "\"reading\": \"69\"",
         "[not converted: linearization 6fh is reserved]"},
        {"00 01 00 f6", "00 00 00 f6", "\"reading\": \"69\"",
         "[not converted: the record's factor M is 0]"},
        {"00 01 00 f6", "71 01 00 f6", "\"reading\": \"69\"",
         "[not converted: no reading factors for raw reading 69h]"},
        {"00 01 00 f6", "01 01 00 f6", "\"reading\": \"05\"",
         "[not converted: raw reading 05h has no value]"},
        {"2000 30", "2c00 30", "\"reading\": \"69\"", "[behind the controller at 2ch: not read]"},
        {"2000 30", "2c70 30", "\"reading\": \"69\"",
         "[behind the controller at 2ch, channel 7: not read]"},
        {"2000 30", "4100 30", "\"reading\": \"69\"", nullptr},  // software
        {"01 32 2000", "01 20 2000", "\"reading\": \"69\"", "[the sensor's record is cut short]"},
        {"01 32 2000", "01 08 2000", "\"reading\": \"69\"",
         "[the sensor's record ends before the sensor's type]"},
    };
    for (const auto& c : cases) {
        std::string broken = record;
        broken.replace(broken.find(c.from), std::string(c.from).size(), c.to);
        const auto all = Collect("{\"bmcs\": [{\"sdr\": {\"records\": [\"" + broken +
                                     "\"]}, \"sensors\": {\"30\": {" + c.reading +
                                     ", \"states\": \"c0 00\"}}}]}",
                                 {"IPMI_Sensor"});
        ASSERT_EQ(all.size(), 1u) << c.to;
        EXPECT_EQ(all[0].at("RecordID"), "1");
        EXPECT_EQ(all[0].count("Problems"), c.problem == nullptr ? 0u : 1u) << c.to;
        if (c.problem == nullptr) continue;
        EXPECT_EQ(all[0].at("Problems"), c.problem);
        // What comes before the cut can be had.
        EXPECT_EQ(all[0].count("Reading"), std::string(c.to) == "01 20 2000") << c.to;
    }
}

/// One with inventory areas, a memory module, and a device behind another controller.
std::string ServerWithInventory() {
    return R"({"bmcs": [{"sdr": {"records": [
        "0100 51 12 0e 20 00 00 bf 00 00 00 07 01 00 c3 424d43",
        "0200 51 11 11 20 02 80 00 00 10 00 08 01 00 c6 44494d4d2034",
        "0300 51 11 0e 82 02 80 00 00 10 00 c2 61 00 c3 535031"]}, "fru": {"0": ")" +
           ipmisel::HexText(ipmiseltest::WholeFruImage().Bytes()) + R"(", "2": ")" +
           ipmisel::HexText(ipmiseltest::Ddr3Image()) + R"("}}]})";
}

TEST_F(StandardClasses, AnInventoryHasEveryFieldOfItsDevice) {
    const auto devices = Collect(ServerWithInventory(), {"IPMI_FRU"});
    ASSERT_THAT(devices, SizeIs(3));
    EXPECT_EQ(Told(devices[0]),
              "BoardCustom=[first][second]; BoardFRUFile=F1; "
              "BoardManufactured=2024-06-15T13:20:00Z; BoardManufacturer=Acme; "
              "BoardPartNumber=BP-1; BoardProduct=Mainboard; BoardSerialNumber=BS01; "
              "ChassisCustom=[Rack 7]; ChassisPartNumber=CH-1; ChassisSerialNumber=CHS01; "
              "ChassisType=Rack Mount Chassis; DeviceID=0; Entity=System Board 1; EntityID=7; "
              "EntityInstance=1; EntityIsDeviceRelative=false; Manufacturer=Acme Systems; "
              "MultiRecords=[OEM record c0h; manufacturer ID 32473; data 0xab]; Node=1; "
              "PartNumber=P-1; Product=S-1; ProductAssetTag=T9; ProductCustom=[third]; "
              "ProductFRUFile=F2; ProductManufacturer=Acme Systems; ProductName=S-1; "
              "ProductPartNumber=P-1; ProductSerialNumber=SN01; ProductVersion=A00; "
              "SerialNumber=SN01; ");
    EXPECT_EQ(devices[1].at("Name"), "DIMM 4");
    EXPECT_EQ(devices[1].at("ModuleSerialNumber"), "A1B2C3D4");
    EXPECT_EQ(devices[1].at("ModuleType"), "DDR3");
    EXPECT_EQ(devices[2].at("ControllerAddress"), "130");
    EXPECT_EQ(devices[2].at("Problems"), "[behind the controller at 82h: not read]");
    EXPECT_EQ(devices[2].count("SerialNumber"), 0u);
}

TEST_F(StandardClasses, ASystemIsNamedByItsInventoryAndEachDeviceReadOnce) {
    const auto reads = [&] { return ipmiseltest::CountOf(ipmi::kReadFruData, requests); };
    Collect(ServerWithInventory(), {"IPMI_FRU"});
    const auto once = reads();
    requests.clear();
    const auto instances = Collect(ServerWithInventory(),
                                   {"IPMI_Controller", "IPMI_Sensor", "IPMI_FRU", "IPMI_Event"});
    EXPECT_EQ(instances[0].at("SystemManufacturer"), "Acme Systems");
    EXPECT_EQ(instances[0].at("SystemProduct"), "S-1");
    EXPECT_EQ(instances[0].at("SystemSerialNumber"), "SN01");
    EXPECT_EQ(reads(), once);
    requests.clear();
    Collect(ServerWithInventory(), {"IPMI_Controller"});
    EXPECT_EQ(ipmiseltest::CountOf(ipmi::kGetSdr, requests), 0) << "no repository for device 0";
}

/// A controller with a log of 512 temperature events, all taken back but those of sensor 1, and 100
/// sensors with thresholds.
std::string LargeServer() {
    std::string entries, sensors;
    for (int i = 1; i <= 512; ++i) {
        const int number = i <= 2 ? 1 : 2 + (i - 3) / 2 % 99;
        const bool back = i > 2 && i % 2 == 0;
        entries += ipmisel::Format("%s\"%02x%02x 02 b0e5e665 2000 04 01 %02x %02x 595a50\"",
                                   i == 1 ? "" : ", ", i & 0xFF, i >> 8, number, back ? 0x81 : 1);
    }
    for (int i = 1; i <= 100; ++i) {
        sensors += ipmisel::Format(
            "%s\"%02x00 51 01 2d 2000%02x 0301 7f680101 00000000 3f00 800100 00 0100 00 00 00 00 "
            "00 "
            "000000 0000 645f5a050a0f 0203 000000 c2 4130\"",
            i == 1 ? "" : ", ", i, i);
    }
    return "{\"bmcs\": [{\"sel\": {\"entries\": [" + entries + "]}, \"sdr\": {\"records\": [" +
           sensors + "]}}]}";
}

TEST_F(StandardClasses, EachRecordIsReadOnceForAllClasses) {
    const auto sent = [&](ipmi::CommandCode code) { return ipmiseltest::CountOf(code, requests); };
    std::vector<const char*> all;
    for (std::uint32_t i = 0; i < fdrPluginClasses.classCount; ++i) {
        all.push_back(fdrPluginClasses.classes[i].name);
    }
    Collect(LargeServer(), all);
    EXPECT_EQ(sent(ipmi::kGetSelEntry), 512);
    EXPECT_EQ(sent(ipmi::kGetSdr), 100);
    EXPECT_EQ(sent(ipmi::kGetSensorReading), 100);
    EXPECT_EQ(sent(ipmi::kGetSensorThresholds), 100);
    EXPECT_LE(requests.size(), 512u + 100 + 100 + 100 + 24);
    // For the events alone only the sensor is read whose problem is open.
    requests.clear();
    EXPECT_THAT(Collect(LargeServer(), {"IPMI_Event"}), SizeIs(512));
    EXPECT_EQ(sent(ipmi::kGetSensorReading), 1);
    EXPECT_LE(requests.size(), 512u + 100 + 2 + 24);
}

TEST_F(StandardClasses, AHostThatRefusesEndsThePass) {
    written.refusedProperty = "Number";
    EXPECT_EQ(Pass(kServer, {"IPMI_Sensor"}), NQORTQR20::kStatusFailed);
    EXPECT_EQ(Pass(kServer, {}), NQORTQR20::kStatusOk);
}

TEST(SensorStatus, StatesAreJudgedByTheirSeverity) {
    const auto status = [](std::uint8_t eventType, std::uint8_t sensorType,
                           std::optional<std::uint16_t> states) {
        ipmi::Sensor sensor;
        sensor.eventType = eventType;
        sensor.sensorType = sensorType;
        SensorState state;
        state.reading = ipmi::SensorReading{.raw = 0, .scanningEnabled = true, .states = states};
        return StatusOf(sensor, state);
    };
    EXPECT_EQ(status(0x01, 0x01, 0xC0), "ok");  // reserved bits of a threshold sensor
    EXPECT_EQ(status(0x01, 0x01, 0xC9), "warning");
    EXPECT_EQ(status(0x01, 0x01, 0xC1 | 0x20), "critical");
    EXPECT_EQ(status(0x01, 0x01, std::nullopt), "");
    EXPECT_EQ(status(0x6F, 0x08, 0x0001), "ok");
    EXPECT_EQ(status(0x6F, 0x08, 0x0003), "critical");
    EXPECT_EQ(status(0x6F, 0x0C, 0x0001), "warning");
    EXPECT_EQ(status(0x0B, 0x08, 0x0001), "ok");
    EXPECT_EQ(status(0x03, 0x01, 0x0002), "");  // "state asserted" tells neither
    // Nothing is asserted: of types whose states tell neither that says nothing.
    EXPECT_EQ(status(0x6F, 0x08, 0x0000), "ok");
    EXPECT_EQ(status(0x03, 0x01, 0x0000), "");
    EXPECT_EQ(status(0x6F, 0x0A, 0x0000), "");
    EXPECT_EQ(status(0x70, 0x01, 0x0000), "");
    EXPECT_EQ(status(0x6F, 0xC0, 0x0000), "");
}

TEST(GuidReading, SmbiosDecidesTheOrderWhereItHasTheSameIdentity) {
    const ipmi::Guid wire{0x0F, 0x0E, 0x0D, 0x0C, 0x0B, 0x0A, 9, 8, 7, 6, 5, 4, 3, 2, 1, 0};
    const ipmi::Guid smbios{3, 2, 1, 0, 5, 4, 7, 6, 8, 9, 0x0A, 0x0B, 0x0C, 0x0D, 0x0E, 0x0F};
    EXPECT_EQ(ReadGuid(smbios, smbios).text, "00010203-0405-0607-0809-0a0b0c0d0e0f");
    EXPECT_EQ(ReadGuid(smbios, smbios).order, "SMBIOS");
    EXPECT_EQ(ReadGuid(wire, ipmi::Guid{1}).order, "IPMI");  // another system: the standard's
    EXPECT_EQ(ReadGuid(std::nullopt, smbios).text, "");
}

TEST(EnterpriseName, IsFoundByItsNumberAlone) {
    const ipmiseltest::TemporaryFolder folder;
    const std::string file = folder.Write("numbers",
                                          "Decimal\n| Organization\n10\n  NSC\n    A Person\n"
                                          "1\n  One, Inc. \r\n7\nbroken\n12\n");
    EXPECT_EQ(EnterpriseName(1, file), "One, Inc.");
    EXPECT_EQ(EnterpriseName(10, file), "NSC");
    EXPECT_EQ(EnterpriseName(0, file), "");
    EXPECT_EQ(EnterpriseName(7, file), "");
    EXPECT_EQ(EnterpriseName(12, file), "");
    EXPECT_EQ(EnterpriseName(1, file + "x"), "");
    // Anywhere in a long list, and behind its order.
    std::string list = "Decimal\n";
    for (unsigned number = 0; number < 6000; number += 2) {
        list += std::to_string(number) + "\n  N" + std::to_string(number) +
                std::string(number % 50, '.') + "\n    7\n";
    }
    folder.Write("numbers", list + "7\n  Late\n");
    for (unsigned number = 0; number < 6000; number += 2) {
        EXPECT_EQ(EnterpriseName(number, file),
                  "N" + std::to_string(number) + std::string(number % 50, '.'));
    }
    EXPECT_EQ(EnterpriseName(7, file), "Late");
    EXPECT_EQ(EnterpriseName(3001, file), "");
}

// An event of the temperature of kServer, one of its BIOS, an OEM record, and a supply that is
// gone.
constexpr const char* kEvents = R"({"local_time": "20240305130000.000000+000", "bmcs": [{
  "guid": "00000000000000000000000000000001",
  "sel": {"utc_offset_minutes": 60, "time": 1709643598, "entries": [
    "0100 02 b0e5e665 2000 04 01 30 01 57 64 5f",
    "0200 04 00000020 0100 04 0f 02 ef c0 ff ff",
    "0300 c1 b1e5e665 d97e00 010203040506",
    "0400 02 ffffffff 2000 04 08 40 ef 00 ff ff"]},
  "sdr": {"records": [
    "0100 51 01 32 20 00 30 03 01 7f 68 01 01 00 00 00 70 3f 00 00 01 00 00 01 00 f6 c0 00 00 00 00 00 00 00 00 64 5f 5a 0f 0a 05 00 00 00 00 00 c7 43505520546d70"]},
  "sensors": {"30": {"reading": "69", "states": "c0 c8"}}
}]})";

TEST_F(StandardClasses, AnEventHasWhatIsKnownOfItAndNothingElse) {
    const auto all = Collect(kEvents, {"IPMI_Event"});
    ASSERT_EQ(all.size(), 4u);
    EXPECT_EQ(Told(all[0]),
              "Direction=asserted; Entity=Processor; "
              "EntityID=3; EntityInstance=1; EventType=Threshold; EventTypeCode=1; "
              "Generator=controller 20h, LUN 0, channel 0; "
              "Key=5aefe2327ab937fd255c0868af88ec2b; Node=1; Offset=7; Part=Processor 1; "
              "PartCertain=true; Raw=010002b0e5e66520000401300157645f; Reading=90; RecordID=1; "
              "RecordType=2; Sensor=CPU Tmp; SensorNumber=48; SensorType=Temperature; "
              "SensorTypeCode=1; Sentence=Processor 1, CPU Tmp: above the upper non-critical "
              "threshold (reading 90 degrees C, threshold 85 degrees C); Severity=warning; "
              "SeverityFrom=standard; State=open; StillPresent=true; Text=above the upper "
              "non-critical threshold; Threshold=85; Time=2024-03-05T08:28:16Z; "
              "TimeKind=clock; TimeZoneKnown=true; Unit=degrees C; ");
    EXPECT_EQ(all[1].at("NonStandardRecord"), "true");
    EXPECT_EQ(all[1].at("TimeKind"), "since start");
    EXPECT_EQ(all[1].at("SecondsSinceStart"), "536870912");
    EXPECT_EQ(all[1].at("Direction"), "deasserted");
    EXPECT_EQ(all[1].count("Time") + all[1].count("Sensor") + all[1].count("State"), 0u);

    EXPECT_EQ(all[2].at("ManufacturerID"), "32473");
    EXPECT_EQ(all[2].at("CorrectedTime"), "2024-03-05T09:28:19Z");  // the clock runs again
    EXPECT_EQ(all[2].at("MakerData"), "010203040506");
    EXPECT_EQ(all[2].count("Severity") + all[2].count("Direction") + all[2].count("Offset"), 0u);

    EXPECT_EQ(all[3].at("TimeKind"), "none");
    EXPECT_EQ(all[3].at("State"), "open");
}

TEST_F(StandardClasses, AFindingNamesItsEventsAndWhatItIsConcludedFrom) {
    const auto events = Collect(kEvents, {"IPMI_Event"});
    const auto all = Collect(kEvents, {"IPMI_Finding"});
    ASSERT_EQ(all.size(), 2u);
    EXPECT_EQ(all[0].at("Severity"), "warning");
    EXPECT_EQ(all[0].at("State"), "open");
    EXPECT_EQ(all[0].at("Events"), "[" + events[0].at("Key") + "]");
    EXPECT_EQ(all[0].at("FirstCause"), events[0].at("Key"));
    EXPECT_EQ(all[0].at("FirstTime"), events[0].at("Time"));
    EXPECT_EQ(all[0].at("Count"), "1");
    EXPECT_EQ(all[0].at("StillPresent"), "true");
    EXPECT_THAT(all[0].at("Evidence"), HasSubstr("CPU Tmp reads 95 "));
    EXPECT_EQ(all[1].at("Title"), "Power Supply sensor 40h: no longer: power supply present");
    EXPECT_EQ(all[1].count("FirstTime") + all[1].count("StillPresent"), 0u);
}

TEST_F(StandardClasses, TheControllersFiltersGradeASensorWithoutAnEventToo) {
    const auto all = Collect(R"({"bmcs": [{
  "pef": {"filters": ["01 80 00 00 10 ff ff 01 ff 01 ff 0f 000000 000000 000000"]},
  "sdr": {"records": [
    "0100 51 01 32 20 00 30 03 01 7f 68 01 01 00 00 00 70 3f 00 00 01 00 00 01 00 f6 c0 00 00 00 00 00 00 00 00 64 5f 5a 0f 0a 05 00 00 00 00 00 c7 43505520546d70"]},
  "sensors": {"30": {"reading": "69", "states": "c0 c8"}}
}]})",
                             {"IPMI_Finding"});
    ASSERT_EQ(all.size(), 1u);
    EXPECT_EQ(all[0].at("Severity"), "critical");  // of itself a warning
    EXPECT_EQ(all[0].at("Count"), "0");
}

}  // namespace
}  // namespace standard
