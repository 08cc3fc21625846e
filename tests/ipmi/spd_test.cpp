#include "ipmi/spd.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "tests/support/spd_image.h"

namespace {

using namespace ipmi;
using ipmiseltest::Ddr2Image;
using ipmiseltest::Ddr3Image;
using ipmiseltest::PutText;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

using Image = std::vector<std::uint8_t>;

/// 32 GiB: two ranks of 8 Gb devices, 4 bits wide, on 64 bits.
Image WholeDdr4() {
    Image image(512);
    image[0] = 0x23;
    image[2] = 0x0C;
    image[4] = 0x85;   // 8 Gb
    image[12] = 0x08;  // two ranks of devices of 4 bits
    image[13] = 0x0B;  // 64 bits and 8 for error correction
    image[126] = 0x24;
    image[127] = 0x71;
    image[320] = 0x80;
    image[321] = 0xAD;
    image[323] = 0x17;
    image[324] = 0x09;
    for (std::uint8_t i = 0; i < 4; ++i) image[325U + i] = static_cast<std::uint8_t>(0xA0 + i);
    PutText(&image, 329, "HMA82GR7AFR4N-UH", 20);
    return image;
}

TEST(Spd, ReadsIdentityAndDateOfEachKind) {
    const auto told = [](const Image& image) {
        const auto module = ReadSpd(image);
        if (!module) return std::string("not read");
        return module->type + ", " + module->manufacturer + ", " + module->partNumber + ", " +
               module->serialNumber + ", " + YearWeekText(*module->manufactured);
    };
    Image ddr2 = Ddr2Image();
    ddr2[93] = 0x08;
    ddr2[94] = 0x52;
    EXPECT_EQ(told(ddr2), "DDR2, Ramaxel Technology, RML1520, 01020304, 2008-W52");
    Image ddr3 = Ddr3Image();
    ddr3[120] = 0x12;
    ddr3[121] = 0x34;
    EXPECT_EQ(told(ddr3), "DDR3, Micron Technology, 18JSF1G72PZ-1G6, A1B2C3D4, 2012-W34");
    EXPECT_EQ(
        told(WholeDdr4()),
        "DDR4, Hynix Semiconductor (Hyundai Electronics), HMA82GR7AFR4N-UH, A0A1A2A3, 2017-W09");
    EXPECT_THAT(ReadSpd(WholeDdr4())->problems, IsEmpty());
}

// Worked from the annexes: ranks times devices in a rank times the capacity of a device.
TEST(Spd, SizeIsThatOfAllRanks) {
    const struct {
        Image image;
        std::vector<std::pair<std::size_t, std::uint8_t>> bytes;
        std::optional<std::uint32_t> mebibytes;
    } cases[] = {
        {Ddr2Image(), {{5, 0x61}, {31, 0x01}}, 2048},  // two ranks of 1 GB
        {Ddr2Image(), {{5, 0x60}, {31, 0x20}}, 128},
        {Ddr2Image(), {{5, 0x60}, {31, 0x10}}, 16384},
        {Ddr2Image(), {{31, 0x00}}, std::nullopt},
        {Ddr2Image(), {{31, 0x03}}, std::nullopt},               // two densities
        {Ddr3Image(), {{4, 0x03}, {7, 0x09}, {8, 0x0B}}, 4096},  // 2 Gb x 8, two ranks
        {Ddr3Image(), {{4, 0x04}, {7, 0x00}, {8, 0x03}}, 8192},  // 4 Gb x 4, one rank
        {Ddr3Image(), {{4, 0x07}, {7, 0x00}, {8, 0x03}}, std::nullopt},
        {Ddr3Image(), {{4, 0x04}, {7, 0x04}, {8, 0x03}}, std::nullopt},
        {WholeDdr4(), {}, 32768},                   // 8 Gb x 4, two ranks
        {WholeDdr4(), {{12, 0x01}}, 8192},          // x 8, one rank
        {WholeDdr4(), {{4, 0x88}}, 49152},          // 12 Gb
        {WholeDdr4(), {{6, 0xB2}}, 131072},         // four dies, 3DS
        {WholeDdr4(), {{6, 0x91}}, 32768},          // two dies, one load
        {WholeDdr4(), {{12, 0x48}}, std::nullopt},  // ranks differ
        {WholeDdr4(), {{4, 0x8A}}, std::nullopt},
    };
    for (const auto& c : cases) {
        Image image = c.image;
        for (const auto& [at, byte] : c.bytes) image[at] = byte;
        const auto module = ReadSpd(image);
        ASSERT_TRUE(module);
        EXPECT_EQ(module->sizeMiB, c.mebibytes) << module->type << " case " << &c - cases;
    }
}

TEST(Spd, DamageAndCutsAreProblemsAndLeaveTheRest) {
    Image damaged = WholeDdr4();
    damaged[20] ^= 0x01;
    EXPECT_THAT(ReadSpd(damaged)->problems, ElementsAre("memory module: checksum is wrong"));
    EXPECT_EQ(ReadSpd(damaged)->serialNumber, "A0A1A2A3");

    const Image whole = WholeDdr4();
    for (std::size_t length = 0; length <= whole.size(); ++length) {
        const auto module = ReadSpd(std::span(whole).first(length));
        ASSERT_EQ(module.has_value(), length >= 3) << length;
        if (!module) continue;
        EXPECT_EQ(module->sizeMiB.has_value(), length >= 128) << length;
        EXPECT_EQ(module->partNumber.empty(), length < 349) << length;
        EXPECT_EQ(module->problems.size(), length < 349 ? 1U : 0U) << length;
    }
    EXPECT_THAT(ReadSpd(std::span(whole).first(256))->problems,
                ElementsAre(HasSubstr("after 256 bytes")));
}

TEST(Spd, WhatIsNotProgrammedIsLeftOut) {
    const struct {
        std::size_t at;
        Image bytes;
        std::string MemoryModule::*field;
    } cases[] = {
        {325, Image(4, 0x00), &MemoryModule::serialNumber},
        {325, Image(4, 0xFF), &MemoryModule::serialNumber},
        {329, Image(20, 0xFF), &MemoryModule::partNumber},
        {329, Image(20, ' '), &MemoryModule::partNumber},
        {320, {0x07, 0x01}, &MemoryModule::manufacturer},
    };
    for (const auto& c : cases) {
        Image image = WholeDdr4();
        std::copy(c.bytes.begin(), c.bytes.end(), image.begin() + static_cast<long>(c.at));
        EXPECT_EQ((*ReadSpd(image)).*c.field, "") << c.at << " " << int{c.bytes[0]};
    }
    for (const auto& [year, week] : {std::pair{0x00, 0x00}, {0x17, 0x54}, {0x1A, 0x09}}) {
        Image image = WholeDdr4();
        image[323] = static_cast<std::uint8_t>(year);
        image[324] = static_cast<std::uint8_t>(week);
        EXPECT_FALSE(ReadSpd(image)->manufactured) << year << " " << week;
    }
}

}  // namespace
