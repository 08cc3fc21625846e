#include "plugins/ipmisel/inventory/vpd_entry.h"

#include <gtest/gtest.h>

#include <array>
#include <string>

#include "host/core/host.h"
#include "tests/support/bmc_fixture.h"

namespace {

using Code = std::array<unsigned char, 8>;

TEST(MemoryMaker, FollowsBankAndCode) {
    const struct {
        Code code;
        bool twoBytes;
        const char* maker;
    } cases[] = {
        {{0x01}, false, "AMD"},
        {{0x81}, false, "AMD"},  // parity bit
        {{0xFE}, false, "Numonyx Corporation"},
        {{0x7F, 0x01}, false, "Cirrus Logic"},
        {{0x7F, 0x7F, 0x7F, 0x7F, 0x7F, 0x7F, 0x02}, false, "Mavrix Technology, Inc"},
        {{0x7F, 0x7F, 0x7F, 0x7F, 0x7F, 0x7F, 0x7F, 0x01}, false, ""},  // no eighth bank
        {{0x7F, 0x7F, 0x7F, 0x7F, 0x7F, 0x7F, 0x7E}, false, ""},        // code not assigned
        {{0x00}, false, ""},
        {{0xFF}, false, ""},
        {{0x80, 0x01}, true, "AMD"},
        {{0x01, 0x01}, true, "Cirrus Logic"},
        {{0x06, 0x82}, true, "Mavrix Technology, Inc"},
        {{0x07, 0x01}, true, ""},
        {{0x86, 0xFE}, true, ""},  // code not assigned
        {{0x00, 0x7F}, true, ""},
        {{0x00, 0x80}, true, ""},
    };
    for (const auto& c : cases) {
        EXPECT_EQ(IPMIVPDEntry::getMDManufacturer(c.code.data(), c.twoBytes), c.maker)
            << std::hex << int{c.code[0]} << " " << int{c.code[1]} << " " << c.twoBytes;
    }
    EXPECT_EQ(IPMIVPDEntry::getMDManufacturer(nullptr, true), "");
}

TEST(MemoryModuleText, IsShownOnlyWhenItIsPlainAscii) {
    const struct {
        const char* text;
        bool shown;
    } cases[] = {{"", false},       {"ABC 123", true},  {"~", true},
                 {"AB\x7F", false}, {"\xFF AB", false}, {"A\tB", false}};
    for (const auto& c : cases) {
        EXPECT_EQ(IPMIVPDEntry::IsASCIIStr(reinterpret_cast<const unsigned char*>(c.text)), c.shown)
            << c.text;
    }
}

TEST(KeptInstances, OneThatTheHostRefusesLeavesTheOthers) {
    IPMIVPDEntry entries;
    entries.AddInstance();  // nothing added: no instance
    entries.AddProperty("Vendor", "dropped");
    entries.DropInstance();
    entries.AddProperty("PartNumber", "1");
    entries.AddInstance();
    entries.AddProperty("Vendor", "Second");
    entries.AddInstance();

    ipmiseltest::InstanceRecorder sink;
    sink.refusedProperty = "PartNumber";
    const ipmiseltest::LogRecorder log;
    const NQORTQR20::OutputHandle output(sink);
    EXPECT_EQ(entries.GenerateCIMInstance(output.get(), "QORSG_IPMIFRU"), 1u);
    ASSERT_EQ(sink.instances.size(), 1u);
    EXPECT_EQ(log.Lines(1), std::vector<std::string>{"Error adding QORSG_IPMIFRU."});
}

}  // namespace
