#include "plugins/standard/parts.h"

#include <gmock/gmock.h>

#include <set>
#include <string>

#include "plugins/standard/event.h"
#include "tests/support/fru_image.h"
#include "tests/support/spd_image.h"

namespace standard {
namespace {

using namespace ::testing;
using namespace ipmiseltest;

constexpr std::uint8_t kFan = 0x1D, kDisk = 0x04, kSupply = 0x0A, kBoard = 0x07, kModule = 0x08;
constexpr std::uint8_t kMemorySensor = 0x0C, kSupplySensor = 0x08, kSlotSensor = 0x21;
constexpr std::uint32_t kTime = 1773000000;  // 2026-03-08

/// A compact record of a sensor that the BMC owns.
ipmi::SdrRecord SensorRecord(std::uint8_t number, std::uint8_t entity, std::uint8_t instance,
                             std::uint8_t type, std::uint8_t owner = 0x20) {
    std::vector<std::uint8_t> bytes{number, 0,      0x51,     2, 27, owner, 0,
                                    number, entity, instance, 0, 0,  type,  0x6F};
    bytes.resize(32);
    bytes[23] = 1;
    bytes[31] = 0xC0;
    return *ipmi::SdrRecord::Parse(bytes);
}

/// An entity association record (table 43-4): the container, then what it contains.
ipmi::EntityAssociation Association(ipmi::Entity container,
                                    std::initializer_list<ipmi::Entity> members) {
    std::vector<std::uint8_t> bytes{0x50, 0, 0x51, 0x08, 11, container.id, container.instance, 0};
    for (const ipmi::Entity& member : members) {
        bytes.push_back(member.id);
        bytes.push_back(member.instance);
    }
    bytes.resize(16);
    return std::get<ipmi::EntityAssociation>(ipmi::SdrRecord::Parse(bytes)->body);
}

FruDevice Device(std::string name, ipmi::Entity entity, const FruBytes& image) {
    FruDevice device;
    device.name = std::move(name);
    device.entities = {EntityKey(entity, 0x20, 0)};
    device.module = ipmi::ReadSpd(image);
    if (!device.module) device.inventory = ipmi::ReadFruInventory(image, image.size());
    return device;
}

ipmi::SmbiosMemoryDevice Module(std::string slot, std::string serial, std::uint32_t size = 16384) {
    ipmi::SmbiosMemoryDevice device;
    device.slot = std::move(slot);
    device.sizeMiB = size;
    if (size != 0) {
        device.serialNumber = std::move(serial);
        device.partNumber = "M16G";
    }
    return device;
}

/// How such a module is told of.
std::string Whole(const std::string& slot, const std::string& serial) {
    return slot + ", part number M16G, serial number " + serial;
}

class PartsTest : public Test {
protected:
    PartFacts facts;
    NodeFacts node;

    /// Adds a record of the log, by default of the controller itself.
    void Event(std::uint8_t sensorType, std::uint8_t sensor, std::uint8_t direction,
               std::uint8_t data1, std::uint8_t data2 = 0xFF, std::uint8_t data3 = 0xFF,
               std::uint8_t generator = 0x20, std::uint32_t time = kTime) {
        const auto byte = [&](int shift) { return static_cast<std::uint8_t>(time >> shift); };
        Record({static_cast<std::uint8_t>(node.log.size() + 1), 0, 0x02, byte(0), byte(8), byte(16),
                byte(24), generator, 0, 0x04, sensorType, sensor, direction, data1, data2, data3});
    }
    void Record(const ipmi::SelBytes& bytes) { node.log.push_back(*ipmi::ParseSelRecord(bytes)); }
    void Sensors(std::initializer_list<ipmi::SdrRecord> records) {
        node.sensors.clear();
        for (const ipmi::SdrRecord& record : records) {
            for (const ipmi::Sensor& sensor : record.Sensors()) {
                node.sensors.emplace_back().sensor = sensor;
            }
        }
    }
    PartEvidence OfEvent(std::size_t index = 0) {
        standard::Event event;
        event.record = node.log[index];
        event.data = ipmi::DecodeEventData(event.record);
        event.sensor = node.FindSensor(event.sensorKey());
        return Parts(facts, node).OfEvent(event);
    }
    PartEvidence OfSensor(std::size_t index = 0) {
        return Parts(facts, node).OfSensor(node.sensors[index].sensor);
    }
    static std::vector<std::string> Texts(const PartEvidence& evidence) {
        std::vector<std::string> texts;
        for (const Part& part : evidence.parts) texts.push_back(CandidateText(part));
        return texts;
    }
};

TEST_F(PartsTest, AnEntityHasTheNumbersOfItsFruDevice) {
    const FruBytes image = WholeFruImage().Bytes();
    facts.devices = {Device("", {kBoard, 1}, image), Device("PS 1", {kSupply, 1}, image)};
    Sensors({SensorRecord(1, kSupply, 1, kSupplySensor), SensorRecord(2, kBoard, 1, 0x01),
             SensorRecord(3, kSupply, 2, kSupplySensor), SensorRecord(4, 0x17, 1, 0x05),
             SensorRecord(5, kSupply, 0x61, kSupplySensor)});
    EXPECT_THAT(Texts(OfSensor(0)), ElementsAre("PS 1, part number P-1, serial number SN01"));
    EXPECT_TRUE(OfSensor(0).certain);
    // The product of device 0 is the server; its board has numbers of its own.
    EXPECT_THAT(Texts(OfSensor(1)),
                ElementsAre("System Board 1, part number BP-1, serial number BS01"));
    EXPECT_THAT(Texts(OfSensor(2)), ElementsAre("Power Supply 2"));
    EXPECT_THAT(Texts(OfSensor(3)), ElementsAre("System Chassis 1"));
    EXPECT_THAT(Texts(OfSensor(4)), ElementsAre("Power Supply 1")) << "relative to its device";
}

TEST_F(PartsTest, WhatIsNoThingIsNoPart) {
    for (const std::uint8_t entity : {0x00, 0x21, 0x22, 0x23, 0x2E}) {
        Sensors({SensorRecord(1, entity, 1, 0x20)});
        EXPECT_THAT(OfSensor().parts, IsEmpty()) << int{entity};
    }
    node.log.clear();
    Event(0x20, 1, 0x6F, 0x01);
    EXPECT_THAT(OfEvent().parts, IsEmpty());
}

TEST_F(PartsTest, WhatIsInAPartWithAnInventoryIsThatPart) {
    facts.devices = {Device("PS 1", {kSupply, 1}, WholeFruImage().Bytes()),
                     Device("Chassis", {0x17, 1}, WholeFruImage().Bytes()),
                     Device("Backplane", {0x0F, 1}, WholeFruImage().Bytes())};
    Sensors({SensorRecord(1, kFan, 1, 0x04), SensorRecord(2, kFan, 2, 0x04),
             SensorRecord(3, kDisk, 1, 0x0D)});
    facts.associations = {Association({kSupply, 1}, {{kFan, 1}}),
                          Association({0x17, 1}, {{kFan, 2}, {kSupply, 1}}),
                          Association({0x0F, 1}, {{kDisk, 1}})};
    EXPECT_THAT(Texts(OfSensor(0)), ElementsAre("PS 1, part number P-1, serial number SN01"));
    EXPECT_FALSE(OfSensor(0).certain);
    EXPECT_THAT(Texts(OfSensor(1)), ElementsAre("Fan 2")) << "not the chassis around it";
    EXPECT_THAT(Texts(OfSensor(2)), ElementsAre("Disk 1")) << "a part of its own";
}

TEST_F(PartsTest, ContainersThatContainEachOtherEnd) {
    Sensors({SensorRecord(1, kFan, 1, 0x04)});
    facts.associations = {Association({0x1E, 1}, {{kFan, 1}}), Association({kFan, 1}, {{0x1E, 1}})};
    EXPECT_THAT(Texts(OfSensor()), ElementsAre("Fan 1"));
}

TEST_F(PartsTest, SeveralDevicesOfOneEntityAreCandidates) {
    FruImage other = WholeFruImage();
    other.product =
        Area({0}, {Field("Acme"), Field("S-2"), Field("P-2"), Field("A0"), Field("SN02")});
    facts.devices = {Device("Riser 1", {0x10, 1}, WholeFruImage().Bytes()),
                     Device("Riser 2", {0x10, 1}, other.Bytes())};
    Sensors({SensorRecord(1, 0x10, 1, 0x01)});
    EXPECT_THAT(Texts(OfSensor()), ElementsAre("Riser 1, part number P-1, serial number SN01",
                                               "Riser 2, part number P-2, serial number SN02"));
    EXPECT_FALSE(OfSensor().certain);
}

TEST_F(PartsTest, AMemoryModuleIsFoundByTheLabelThatEndsInItsNumber) {
    const struct {
        std::vector<ipmi::SmbiosMemoryDevice> modules;
        std::uint8_t number;
        std::vector<std::string> parts;
        bool certain;
    } cases[] = {
        {{Module("DIMM_1", "S1"), Module("DIMM_2", "S2")}, 2, {Whole("DIMM_2", "S2")}, true},
        {{Module("DIMM_12", "S1"), Module("DIMM 02", "S2")}, 2, {Whole("DIMM 02", "S2")}, true},
        // Two labels end in 1: counted from 1 the first, from 0 the second.
        {{Module("A1", "S1"), Module("B1", "S2"), Module("A2", "S3")},
         1,
         {Whole("A1", "S1"), Whole("B1", "S2")},
         false},
        // No label ends in a number; an empty slot has no module to fail.
        {{Module("A", "S1"), Module("B", "", 0)}, 1, {Whole("A", "S1")}, false},
        {{Module("A", "S1"), Module("B", "S2")}, 2, {Whole("B", "S2")}, false},
        {{Module("A", "S1"), Module("B", "S2")}, 7, {"Memory Module 7"}, false},
        {{}, 4, {"Memory Module 4"}, false},
        // One module, told of twice; and two that are said to be in one slot.
        {{Module("DIMM_3", "S1"), Module("DIMM_3", "S1")}, 3, {Whole("DIMM_3", "S1")}, true},
        {{Module("DIMM_3", "S1"), Module("DIMM_3", "S2")},
         3,
         {Whole("DIMM_3", "S1"), Whole("DIMM_3", "S2")},
         false},
    };
    for (const auto& c : cases) {
        facts.smbios.memoryDevices = c.modules;
        node.log.clear();
        Event(kMemorySensor, 0x80, 0x6F, 0x30, 0xFF, c.number, 0x01);  // by the firmware
        EXPECT_EQ(Texts(OfEvent()), c.parts) << int{c.number};
        EXPECT_EQ(OfEvent().certain, c.certain) << c.parts[0];
    }
}

TEST_F(PartsTest, AMemoryModuleWithoutSmbiosIsFoundByItsLocator) {
    facts.devices = {Device("DIMM 4", {kModule, 1}, Ddr3Image()),
                     Device("PS 4", {kSupply, 1}, WholeFruImage().Bytes())};
    Event(kMemorySensor, 0x80, 0x6F, 0x30, 0xFF, 4);
    EXPECT_THAT(Texts(OfEvent()),
                ElementsAre("DIMM 4, part number 18JSF1G72PZ-1G6, serial number A1B2C3D4"));
    EXPECT_TRUE(OfEvent().certain);
    // The slot's label is the firmware's; the numbers are had from where they are.
    facts.smbios.memoryDevices = {Module("DIMM_B4", "")};
    facts.smbios.memoryDevices[0].partNumber.clear();
    EXPECT_THAT(Texts(OfEvent()),
                ElementsAre("DIMM_B4, part number 18JSF1G72PZ-1G6, serial number A1B2C3D4"));
}

TEST_F(PartsTest, EntitiesAreFoundInSmbiosWhereBothCountAlike) {
    ipmi::SmbiosProcessor first;
    first.socket = "CPU1";
    ipmi::SmbiosProcessor second;
    second.socket = "CPU2";
    second.serialNumber = "C2";
    facts.smbios.processors = {first, second};
    facts.smbios.memoryDevices = {Module("DIMM_1", "S1"), Module("DIMM_2", "S2")};
    Sensors({SensorRecord(1, 0x03, 2, 0x07), SensorRecord(2, kModule, 1, kMemorySensor)});
    EXPECT_THAT(Texts(OfSensor(0)), ElementsAre("CPU2, serial number C2"));
    EXPECT_FALSE(OfSensor(0).certain);
    EXPECT_THAT(Texts(OfSensor(1)), ElementsAre(Whole("DIMM_1", "S1")));
    // The controller counts from 0.
    Sensors({SensorRecord(1, 0x03, 2, 0x07), SensorRecord(3, 0x03, 0, 0x07)});
    EXPECT_THAT(Texts(OfSensor(0)), ElementsAre("Processor 2"));
}

TEST_F(PartsTest, ASlotIsFoundByItsLabelAndByItsAddress) {
    ipmi::SmbiosSlot slot2;
    slot2.designation = "PCIe Slot 2";
    slot2.address = {.segment = 0, .bus = 0x3B, .device = 0, .function = 0};
    ipmi::SmbiosSlot riser;
    riser.designation = "Riser";
    riser.id = 9;
    facts.smbios.slots = {slot2, riser};
    facts.smbios.memoryDevices = {Module("DIMM_2", "S2")};
    const struct {
        std::uint8_t type, number;
        std::vector<std::string> parts;
    } cases[] = {{0x09, 2, {"PCIe Slot 2"}},
                 {0x00, 9, {"Riser"}},
                 {0x09, 3, {}},
                 {0x07, 2, {Whole("DIMM_2", "S2")}}};
    for (const auto& c : cases) {
        node.log.clear();
        Event(kSlotSensor, 0x0C, 0x6F, 0xF0, c.type, c.number);
        EXPECT_EQ(Texts(OfEvent()), c.parts) << int{c.type} << " " << int{c.number};
    }
    // Records of a Linux host: segment, bus, device and function.
    for (const auto& [bus, function, found] :
         {std::tuple{0x3B, 0x03, true}, {0x3C, 0x00, false}, {0x3B, 0x08, false}}) {
        node.log.clear();
        Record({1, 0, 0xC0, 1, 2, 3, 0x69, 0x3A, 0xCD, 0x00, 0xC0, 0xCA, 0,
                static_cast<std::uint8_t>(bus), static_cast<std::uint8_t>(function)});
        EXPECT_EQ(Texts(OfEvent()).size(), found ? 1u : 0u) << bus << " " << function;
    }
}

TEST_F(PartsTest, AnEventFromBeforeAPartWasTakenOutHasNoNumbersOfTheNewOne) {
    facts.devices = {Device("PS 1", {kSupply, 1}, WholeFruImage().Bytes())};
    Sensors({SensorRecord(1, kSupply, 1, kSupplySensor), SensorRecord(2, kSupply, 1, 0x25),
             SensorRecord(3, kSupply, 2, 0x25)});
    const char* const kNew = "PS 1, part number P-1, serial number SN01";
    const struct {
        std::uint8_t type, sensor, direction, offset;
        bool gone;
    } cases[] = {
        {kSupplySensor, 1, 0xEF, 0x00, true},   // its presence deasserted
        {kSupplySensor, 1, 0x6F, 0x00, false},  // asserted: it is there
        {kSupplySensor, 1, 0xEF, 0x01, false},  // another offset
        {0x25, 2, 0x6F, 0x01, true},            // absent, by another sensor of the entity
        {0x25, 3, 0x6F, 0x01, false},           // of another entity
        {0x25, 2, 0xEF, 0x01, false},           // no longer absent
    };
    for (const auto& c : cases) {
        node.log.clear();
        Event(kSupplySensor, 1, 0x6F, 0x01);
        Event(c.type, c.sensor, c.direction, c.offset);
        Event(kSupplySensor, 1, 0x6F, 0x01);
        EXPECT_THAT(Texts(OfEvent(0)), ElementsAre(c.gone ? "PS 1" : kNew)) << int{c.sensor};
        if (c.gone) {
            EXPECT_THAT(Texts(OfEvent(1)), ElementsAre("PS 1")) << int{c.sensor};
        }
        EXPECT_THAT(Texts(OfEvent(2)), ElementsAre(kNew));
    }
}

TEST_F(PartsTest, ACardTakenOutOfABoardsSlotLeavesTheBoardItsNumbers) {
    facts.devices = {Device("Baseboard", {kBoard, 1}, WholeFruImage().Bytes())};
    Sensors({SensorRecord(1, kBoard, 1, 0x02), SensorRecord(2, kBoard, 1, kSlotSensor),
             SensorRecord(3, kBoard, 1, 0x25)});
    for (const auto& [type, sensor, gone] :
         {std::tuple{kSlotSensor, 2, false}, {std::uint8_t{0x25}, 3, true}}) {
        node.log.clear();
        Event(0x02, 1, 0x07, 0x02);
        Event(type, static_cast<std::uint8_t>(sensor), 0xEF, type == kSlotSensor ? 0x02 : 0x00);
        EXPECT_EQ(OfEvent().parts[0].serialNumber, gone ? "" : "BS01") << sensor;
    }
}

TEST_F(PartsTest, WhatIsTakenOutIsTheEntityWhereThatIsExchangedAsAWhole) {
    const std::set<unsigned> exchanged{3,    4,    5,    8,    9,    0x0A, 0x0B, 0x14, 0x1A, 0x1B,
                                       0x1C, 0x1D, 0x20, 0x28, 0x29, 0x2A, 0x2B, 0x2C, 0x2D};
    for (std::uint8_t entity = 1; entity < 0x43; ++entity) {
        facts.devices = {Device("", {entity, 1}, WholeFruImage().Bytes())};
        Sensors({SensorRecord(1, entity, 1, 0x02), SensorRecord(2, entity, 1, kSupplySensor)});
        node.log.clear();
        Event(0x02, 1, 0x07, 0x02);
        Event(kSupplySensor, 2, 0xEF, 0x00);
        const auto parts = OfEvent().parts;
        if (parts.empty()) continue;  // no thing
        EXPECT_EQ(parts[0].serialNumber.empty(), exchanged.contains(entity)) << int{entity};
    }
}

TEST_F(PartsTest, ASensorOfAnotherTypeThanItsEventsSaysNothingOfThePart) {
    Sensors({SensorRecord(1, kSupply, 1, kSupplySensor)});
    Event(kSupplySensor, 1, 0x6F, 0x01);
    Event(kMemorySensor, 1, 0x6F, 0x00);
    EXPECT_THAT(Texts(OfEvent(0)), ElementsAre("Power Supply 1"));
    EXPECT_THAT(OfEvent(1).parts, IsEmpty());
}

TEST_F(PartsTest, OneModuleTakenOutIsNotTheOthers) {
    facts.smbios.memoryDevices = {Module("DIMM_1", "S1"), Module("DIMM_2", "S2")};
    for (const std::uint8_t module : {1, 2}) Event(kMemorySensor, 9, 0x6F, 0x30, 0xFF, module);
    Event(kMemorySensor, 9, 0xEF, 0x36, 0xFF, 2);
    EXPECT_THAT(Texts(OfEvent(0)), ElementsAre(Whole("DIMM_1", "S1")));
    EXPECT_THAT(Texts(OfEvent(1)), ElementsAre("DIMM_2"));
}

TEST_F(PartsTest, AModuleIsTakenOutByWhateverSensorTellsOfIt) {
    facts.smbios.memoryDevices = {Module("DIMM_1", "S1"), Module("DIMM_2", "S2")};
    Sensors({SensorRecord(3, kModule, 2, 0x25), SensorRecord(4, kModule, 1, 0x25)});
    const struct {
        std::uint8_t type, sensor, direction, data1, data2, data3;
        bool gone;
    } cases[] = {
        {kMemorySensor, 9, 0xEF, 0x36, 0xFF, 2, true},  // by another sensor, its number
        {kMemorySensor, 9, 0xEF, 0x36, 0xFF, 1, false},
        {0x25, 3, 0x6F, 0x01, 0xFF, 0xFF, true},  // by the entity's presence
        {0x25, 4, 0x6F, 0x01, 0xFF, 0xFF, false},
    };
    for (const auto& c : cases) {
        node.log.clear();
        Event(kMemorySensor, 0x80, 0x6F, 0x30, 0xFF, 2, 0x01);  // by the firmware
        Event(c.type, c.sensor, c.direction, c.data1, c.data2, c.data3);
        EXPECT_THAT(Texts(OfEvent()), ElementsAre(c.gone ? "DIMM_2" : Whole("DIMM_2", "S2")))
            << int{c.sensor} << " " << int{c.data3};
    }
}

TEST_F(PartsTest, AnEventFromBeforeAPartWasMadeHasNotItsNumbers) {
    FruBytes module = Ddr3Image();
    module[120] = 0x26;  // 2026, week 20
    module[121] = 0x20;
    facts.devices = {Device("DIMM 4", {kModule, 1}, module)};
    Event(kMemorySensor, 0x80, 0x6F, 0x30, 0xFF, 4);
    Event(kMemorySensor, 0x80, 0x6F, 0x30, 0xFF, 4, 0x20, kTime + 100 * 86400);
    EXPECT_THAT(Texts(OfEvent(0)), ElementsAre("DIMM 4"));
    EXPECT_THAT(Texts(OfEvent(1)), ElementsAre(HasSubstr("serial number A1B2C3D4")));
}

TEST_F(PartsTest, ARecordWithoutASensorHasNoPart) {
    Event(0x01, 0x77, 0x01, 0x59);
    Record({1, 0, 0xE0, 1, 2, 3});
    EXPECT_THAT(OfEvent(0).parts, IsEmpty());
    EXPECT_THAT(OfEvent(1).parts, IsEmpty());
}

}  // namespace
}  // namespace standard
