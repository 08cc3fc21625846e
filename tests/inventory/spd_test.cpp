#include "inventory/spd.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <string>
#include <vector>

#include "tests/support/bmc_fixture.h"
#include "tests/support/spd_image.h"

namespace {

using namespace ipmisel;
using namespace ipmiseltest;

/// Vendor, serial number and part number.
std::string Told(const std::vector<std::uint8_t>& image) {
    const auto kind = RecogniseSpd(image);
    if (!kind) return "not recognised";
    const auto module = DecodeSpd(*kind, image);
    if (!module) return "not decoded";
    return module->vendor + ", " + module->serialNumber + ", " + module->partNumber;
}

TEST(Spd, TellsMakerAndNumbers) {
    EXPECT_EQ(Told(Ddr2Image()), "Ramaxel Technology, 01020304, RML1520");
    EXPECT_EQ(Told(Ddr3Image()), "Micron Technology, A1B2C3D4, 18JSF1G72PZ-1G6");
    EXPECT_EQ(Told(Ddr4Image()), "not decoded") << "its identity lies beyond 256 bytes";
}

TEST(Spd, CrcOfDdr3CoversWhatByte0Says) {
    auto image = Ddr3Image();
    image[120] ^= 0x01;  // programmed with the module, after the checksum
    EXPECT_EQ(RecogniseSpd(image), SpdKind::kDdr3);
    image[120] ^= 0x01;
    image[0] &= 0x7F;
    PutCrc(&image, 0x7623);
    EXPECT_EQ(RecogniseSpd(image), SpdKind::kDdr3);
    image[120] ^= 0x01;
    EXPECT_EQ(RecogniseSpd(image), std::nullopt);
}

TEST(Spd, OtherDataIsNotRecognised) {
    for (const auto& good : {Ddr2Image(), Ddr3Image(), Ddr4Image()}) {
        // One broken byte of the sizes, the type, what the checksum covers, the checksum.
        for (const std::size_t at : {0, 2, 5, good[2] == 0x08 ? 63 : 127}) {
            auto image = good;
            image[at] ^= 0x08;
            EXPECT_EQ(RecogniseSpd(image), std::nullopt) << int{good[2]} << " at " << at;
        }
        EXPECT_EQ(RecogniseSpd(std::span(good).first(255)), std::nullopt);
    }
}

// The identity stands outside what a checksum of DDR2 covers, so anything may be there.
TEST(Spd, WhatCannotBeShownIsNotAvailable) {
    const struct {
        std::size_t at;
        std::vector<std::uint8_t> bytes;
        const char* told;
    } cases[] = {
        {64, std::vector<std::uint8_t>(8, 0x7F), "Not Available, 01020304, RML1520"},
        {64, {0x7F, 0x7F, 0x00}, "Not Available, 01020304, RML1520"},
        {74, {0x80}, "Ramaxel Technology, 01020304, Not Available"},
        {73, {0x00}, "Ramaxel Technology, 01020304, Not Available"},
        {73, std::vector<std::uint8_t>(18, ' '), "Ramaxel Technology, 01020304, Not Available"},
        {75, {0x00}, "Ramaxel Technology, 01020304, RM"},
        {73, std::vector<std::uint8_t>(18, 'X'),
         "Ramaxel Technology, 01020304, XXXXXXXXXXXXXXXXXX"},
    };
    for (const auto& c : cases) {
        auto image = Ddr2Image();
        std::copy(c.bytes.begin(), c.bytes.end(), image.begin() + static_cast<long>(c.at));
        const LogRecorder log;
        EXPECT_EQ(Told(image), c.told);
        EXPECT_EQ(log.All().size(), c.at == 64 ? 1U : 0U);
    }
}

}  // namespace
