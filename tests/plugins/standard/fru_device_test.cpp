#include "plugins/standard/fru_device.h"

#include <gmock/gmock.h>

#include "tests/support/bmc_fixture.h"
#include "tests/support/fru_image.h"
#include "tests/support/fru_inventory.h"
#include "tests/support/spd_image.h"

namespace standard {
namespace {

using namespace ::testing;
using namespace ipmiseltest;

/// A FRU device locator of a logical device.
ipmi::SdrRecord Locator(std::uint8_t device, std::uint8_t entity, std::uint8_t instance,
                        std::string_view name, std::uint8_t address = 0x20,
                        std::uint8_t access = 0x80) {
    std::vector<std::uint8_t> bytes = FruLocator(1, device, name);
    bytes[5] = address;
    bytes[7] = access;
    bytes[12] = entity;
    bytes[13] = instance;
    return *ipmi::SdrRecord::Parse(bytes);
}

/// A management controller locator (table 43-8) of the BMC.
ipmi::SdrRecord ControllerRecord(std::uint8_t entity) {
    const std::vector<std::uint8_t> bytes{0x02, 0, 0x51,   0x12, 0x0E, 0x20, 0,   0,   0xBF, 0,
                                          0,    0, entity, 0x01, 0,    0xC3, 'B', 'M', 'C'};
    return *ipmi::SdrRecord::Parse(bytes);
}

class FruDeviceTest : public BmcTest {
protected:
    std::vector<FruDevice> Read(const std::vector<ipmi::SdrRecord>& repository) {
        Controller controller(*FreshLibrary());
        return ReadFruDevices(controller, repository, ReadOwnFruDevice(controller));
    }
};

TEST_F(FruDeviceTest, ReadsDeviceZeroAndEveryLogicalDeviceOfTheLocators) {
    FruBytes large = WholeFruImage().Bytes();
    large.resize(600, 0xFF);
    bmc.fru[0] = large;
    bmc.fru[2] = Ddr3Image();
    const auto devices =
        Read({ControllerRecord(0x07), Locator(2, 0x08, 1, "DIMM 1"), Locator(2, 0x20, 1, "again"),
              Locator(0xA0, 0x03, 1, "not logical", 0x20, 0x00), Locator(9, 0x0A, 1, "absent")});
    ASSERT_THAT(devices, SizeIs(2));
    EXPECT_EQ(devices[0].deviceId, 0);
    EXPECT_EQ(devices[0].name, "");
    EXPECT_EQ(devices[0].SerialNumber(), "SN01");
    EXPECT_THAT(devices[0].entities, ElementsAre(EntityKey({0x07, 1}, 0x20, 0)));
    EXPECT_THAT(devices[0].problems, IsEmpty());
    EXPECT_EQ(devices[1].name, "DIMM 1");
    EXPECT_EQ(devices[1].PartNumber(), "18JSF1G72PZ-1G6");
    EXPECT_EQ(devices[1].Manufacturer(), "Micron Technology");
    EXPECT_THAT(devices[1].entities,
                ElementsAre(EntityKey({0x08, 1}, 0x20, 0), EntityKey({0x20, 1}, 0x20, 0)));
}

TEST_F(FruDeviceTest, ALocatorOfDeviceZeroIsNearerThanThatOfTheController) {
    bmc.fru[0] = WholeFruImage().Bytes();
    const auto devices = Read({ControllerRecord(0x2E), Locator(0, 0x07, 1, "Baseboard")});
    ASSERT_THAT(devices, SizeIs(1));
    EXPECT_EQ(devices[0].name, "Baseboard");
    EXPECT_EQ(devices[0].entities.front(), EntityKey({0x07, 1}, 0x20, 0));
}

TEST_F(FruDeviceTest, AnotherControllersDeviceIsNotReadByItsNumber) {
    bmc.fru[3] = WholeFruImage().Bytes();
    const auto devices = Read({Locator(3, 0xC2, 0x61, "satellite", 0x82)});
    ASSERT_THAT(devices, SizeIs(1));
    EXPECT_EQ(devices[0].controllerAddress, 0x82);
    EXPECT_EQ(devices[0].SerialNumber(), "");
    EXPECT_THAT(devices[0].problems, ElementsAre("behind the controller at 82h: not read"));
}

TEST_F(FruDeviceTest, WhatFailsIsToldAndWhatWasReadIsUsed) {
    const std::size_t size = WholeFruImage().Bytes().size();
    const auto read = [&](const ipmisim::Fault& fault) {
        bmc.faults = {fault};
        return Read({});
    };
    bmc.fru[0] = WholeFruImage().Bytes();
    EXPECT_THAT(read(CompletionCode(ipmi::kGetFruInventoryAreaInfo, 0, 0xD5))[0].problems,
                ElementsAre("Get FRU Inventory Area Info: completion code d5h"));
    EXPECT_THAT(read(CompletionCode(ipmi::kGetFruInventoryAreaInfo, 0, 0xCB)), IsEmpty());
    EXPECT_THAT(read(CompletionCode(ipmi::kReadFruData, 0, 0xCB)), IsEmpty());
    const auto cut = read(NoResponse(ipmi::kReadFruData, 3));
    ASSERT_THAT(cut, SizeIs(1));
    EXPECT_EQ(cut[0].inventory->chassis->serialNumber, "CHS01");
    EXPECT_THAT(cut[0].problems,
                Contains("64 of " + std::to_string(size) + " bytes could be read: no answer"));
}

TEST_F(FruDeviceTest, ADeviceThatIsBusyForAWhileIsReadWhole) {
    bmc.fru[0] = WholeFruImage().Bytes();
    bmc.faults = {CompletionCode(ipmi::kGetFruInventoryAreaInfo, 1, 0xC0),
                  CompletionCode(ipmi::kReadFruData, 1, 0x81),
                  CompletionCode(ipmi::kReadFruData, 3, 0xC0)};
    const auto devices = Read({});
    ASSERT_THAT(devices, SizeIs(1));
    EXPECT_THAT(devices[0].problems, IsEmpty());
    EXPECT_EQ(devices[0].SerialNumber(), "SN01");
    bmc.faults = {CompletionCode(ipmi::kReadFruData, 0, 0x81)};
    EXPECT_THAT(Read({})[0].problems,
                ElementsAre(HasSubstr("bytes could be read: completion code 81h")));
}

TEST(FruDevice, NumbersToOrderByAreTheProductsElseTheBoards) {
    FruDevice device;
    const FruBytes image = WholeFruImage().Bytes();
    device.inventory = ipmi::ReadFruInventory(image, image.size());
    EXPECT_EQ(device.PartNumber(), "P-1");
    EXPECT_EQ(device.SerialNumber(), "SN01");
    EXPECT_EQ(device.Manufacturer(), "Acme Systems");
    EXPECT_EQ(device.Product(), "S-1");
    device.inventory->product->serialNumber = "000000";  // nobody wrote it
    device.inventory->product->partNumber.clear();
    EXPECT_EQ(device.PartNumber(), "BP-1");
    EXPECT_EQ(device.SerialNumber(), "BS01");
    device.inventory->board->serialNumber = "......";
    EXPECT_EQ(device.SerialNumber(), "");
    device.inventory->product.reset();
    EXPECT_EQ(device.Product(), "Mainboard");
}

}  // namespace
}  // namespace standard
