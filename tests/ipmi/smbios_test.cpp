#include "ipmi/smbios.h"

#include <gtest/gtest.h>

#include <vector>

#include "tests/support/wire.h"

namespace {

using namespace ipmi;
using ipmiseltest::SmbiosStructure;
using Bytes = std::vector<std::uint8_t>;

/// A memory device of SMBIOS 2.8: 16 GiB in a slot.
Bytes MemoryDevice() {
    return SmbiosStructure(17, {0x00, 0x10, 0xFE, 0xFF, 0x48, 0x00, 0x40, 0x00, 0x00, 0x40,
                                0x09, 0x00, 0x01, 0x02, 0x1A, 0x80, 0x20, 0x60, 0x09, 0x03,
                                0x04, 0x05, 0x06, 0x02, 0x00, 0x00, 0x02, 0x00, 0x60, 0x09},
                           {"DIMM_A1", "BANK 0", "Acme Memory", "1A2B3C4D", "ASSET", "AM-16G  "});
}

TEST(Smbios, StringsAreFoundByTheirNumber) {
    const Bytes system = SmbiosStructure(1, {0x01, 0x02, 0x09, 0x00}, {"Acme", "S1  "});
    EXPECT_EQ(SmbiosString(system, 1), "Acme");
    EXPECT_EQ(SmbiosString(system, 2), "S1  ");
    for (const std::size_t number : {0, 3, 4, 255}) EXPECT_EQ(SmbiosString(system, number), "");
    EXPECT_EQ(SmbiosString(SmbiosStructure(1, {}, {}), 1), "");
    EXPECT_EQ(SmbiosStringAt(system, 4), "Acme");
    EXPECT_EQ(SmbiosStringAt(system, 6), "");  // no string 9
    EXPECT_EQ(SmbiosStringAt(system, 8), "");  // past the formatted area
    for (std::size_t length = 0; length < system.size() - 1; ++length) {
        EXPECT_EQ(SmbiosStringAt(std::span(system).first(length), 5), "") << length;
    }
}

TEST(Smbios, ReadsASystem) {
    const Bytes structure = SmbiosStructure(
        1, {0x01, 0x02, 0x00, 0x03, 0, 1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11, 12, 13, 14, 15, 6},
        {"Acme Systems", " S-1 ", "SN01"});
    const auto system = ReadSmbiosSystem(structure);
    ASSERT_TRUE(system);
    EXPECT_EQ(system->manufacturer, "Acme Systems");
    EXPECT_EQ(system->product, "S-1");
    EXPECT_EQ(system->serialNumber, "SN01");
    ASSERT_TRUE(system->uuid);
    EXPECT_EQ((*system->uuid)[0], 0);
    EXPECT_EQ((*system->uuid)[15], 15);
    Bytes unset = structure;
    for (std::size_t at = 8; at < 24; ++at) unset[at] = 0xFF;
    EXPECT_FALSE(ReadSmbiosSystem(unset)->uuid);
}

TEST(Smbios, ReadsAMemoryDevice) {
    const auto device = ReadSmbiosMemoryDevice(MemoryDevice());
    ASSERT_TRUE(device);
    EXPECT_EQ(device->slot, "DIMM_A1");
    EXPECT_EQ(device->bank, "BANK 0");
    EXPECT_EQ(device->type, "DDR4");
    EXPECT_EQ(device->sizeMiB, 16384u);
    EXPECT_EQ(device->manufacturer, "Acme Memory");
    EXPECT_EQ(device->serialNumber, "1A2B3C4D");
    EXPECT_EQ(device->partNumber, "AM-16G");

    const struct {
        std::uint8_t low, high;
        std::optional<std::uint32_t> mebibytes;
        bool installed;
    } sizes[] = {{0x00, 0x00, 0, false},
                 {0xFF, 0xFF, std::nullopt, true},
                 {0xFF, 0x7F, 131072, true},  // the extended size
                 {0x00, 0xA0, 8, true}};      // 8192 KiB
    for (const auto& size : sizes) {
        Bytes structure = MemoryDevice();
        structure[0x0C] = size.low;
        structure[0x0D] = size.high;
        EXPECT_EQ(ReadSmbiosMemoryDevice(structure)->sizeMiB, size.mebibytes) << int{size.high};
        EXPECT_EQ(ReadSmbiosMemoryDevice(structure)->isInstalled(), size.installed);
    }
}

TEST(Smbios, ReadsAProcessorAndASlot) {
    const auto processor = ReadSmbiosProcessor(
        SmbiosStructure(4, {1, 0, 0, 2, 0, 0, 0, 0, 0, 0, 0, 0, 3, 0, 0, 0, 0, 0, 0,
                            0, 0, 0, 0, 0, 0, 0, 0, 0, 4, 0, 5, 0, 0, 0, 0, 0, 0, 0},
                        {"CPU1", "Acme", "Model 7", "PS1", "PP1"}));
    ASSERT_TRUE(processor);
    EXPECT_EQ(processor->socket, "CPU1");
    EXPECT_EQ(processor->manufacturer, "Acme");
    EXPECT_EQ(processor->version, "Model 7");
    EXPECT_EQ(processor->serialNumber, "PS1");
    EXPECT_EQ(processor->partNumber, "PP1");

    const Bytes slotBytes = SmbiosStructure(
        9, {0x01, 0xA5, 0x0D, 0x04, 0x04, 0x02, 0x01, 0x0C, 0x01, 0x00, 0x00, 0x3B, 0x0A},
        {"PCIe Slot 2"});
    const auto slot = ReadSmbiosSlot(slotBytes);
    ASSERT_TRUE(slot);
    EXPECT_EQ(slot->designation, "PCIe Slot 2");
    EXPECT_EQ(slot->id, 0x0102);
    EXPECT_TRUE(slot->inUse);
    ASSERT_TRUE(slot->address);
    EXPECT_EQ(slot->address->bus, 0x3B);
    EXPECT_EQ(slot->address->device, 1);
    EXPECT_EQ(slot->address->function, 2);
    Bytes without = slotBytes;
    for (std::size_t at = 0x0D; at < 0x11; ++at) without[at] = 0xFF;
    EXPECT_FALSE(ReadSmbiosSlot(without)->address);
}

TEST(Smbios, TellsWhereTheBmcIs) {
    using enum SmbiosIpmiDevice::Interface;
    // Interface, revision, slave address, NVRAM, base address, modifier, interrupt.
    const struct {
        std::initializer_list<std::uint8_t> fields;
        SmbiosIpmiDevice::Interface interface;
        bool isIo;
        std::uint64_t address;
    } cases[] = {
        {{1, 0x20, 0x20, 0xFF, 0xA3, 0x0C, 0, 0, 0, 0, 0, 0, 0x00, 0}, kKcs, true, 0xCA2},
        {{3, 0x20, 0x20, 0xFF, 0xE5, 0, 0, 0, 0, 0, 0, 0, 0x10, 0}, kBlockTransfer, true, 0xE5},
        {{1, 0x20, 0x20, 0xFF, 0x00, 0x10, 0, 0xF0, 1, 0, 0, 0}, kKcs, false, 0x1F0001000},
        {{4, 0x20, 0x20, 0xFF, 0x21, 0, 0, 0, 0, 0, 0, 0, 0x00, 0}, kSsif, false, 0x21},
        {{9, 0x20, 0x20, 0xFF, 0xA3, 0x0C, 0, 0, 0, 0, 0, 0}, kUnknown, true, 0xCA2},
    };
    for (const auto& c : cases) {
        const auto device = ReadSmbiosIpmiDevice(SmbiosStructure(38, c.fields, {}));
        ASSERT_TRUE(device);
        EXPECT_EQ(device->interface, c.interface);
        EXPECT_EQ(device->isIo, c.isIo) << c.address;
        EXPECT_EQ(device->address, c.address);
    }
    EXPECT_FALSE(
        ReadSmbiosIpmiDevice(SmbiosStructure(38, {1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11}, {})));
}

TEST(Smbios, WhatFirmwareWritesForUnknownIsEmpty) {
    for (const std::string_view text :
         {"Not Specified", "NO DIMM", "unknown", "   ", "To Be Filled By O.E.M."}) {
        const Bytes structure = SmbiosStructure(
            1, {0x01, 0x01, 0x00, 0x01, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 6}, {text});
        const auto system = ReadSmbiosSystem(structure);
        EXPECT_EQ(system->serialNumber, "") << text;
        EXPECT_FALSE(system->uuid);
    }
}

TEST(Smbios, StructuresThatAreShortOrOfAnotherTypeAreNone) {
    const Bytes whole = MemoryDevice();
    for (std::size_t length = 0; length < whole[1]; ++length) {
        EXPECT_FALSE(ReadSmbiosMemoryDevice(std::span(whole).first(length))) << length;
    }
    for (std::uint8_t length = 4; length < whole[1]; ++length) {
        Bytes old = whole;  // an earlier version, whose strings follow sooner
        old[1] = length;
        EXPECT_EQ(ReadSmbiosMemoryDevice(old).has_value(), length >= 0x15) << int{length};
    }
    EXPECT_FALSE(ReadSmbiosSlot(whole));
    EXPECT_FALSE(ReadSmbiosSystem(whole));
    EXPECT_FALSE(ReadSmbiosProcessor(whole));
}

}  // namespace
