#include "plugins/ipmisel/inventory/spd.h"

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

// A damaged image is told with a line of the log; what it says is no string of another layout.
TEST(Spd, ChecksumCoversWhatTheKindSays) {
    auto whole = Ddr3Image();
    whole[0] &= 0x7F;  // bytes 117 to 125 too
    PutCrc(&whole, 0x7623);
    const std::tuple<std::vector<std::uint8_t>, std::size_t, bool> cases[] = {
        {Ddr2Image(), 5, true}, {Ddr2Image(), 63, true},  {Ddr2Image(), 66, false},
        {Ddr3Image(), 5, true}, {Ddr3Image(), 127, true}, {Ddr3Image(), 120, false},
        {whole, 120, true},     {whole, 130, false},
    };
    for (const auto& [good, at, covered] : cases) {
        auto image = good;
        const LogRecorder log;
        Told(image);
        EXPECT_TRUE(log.All().empty());
        image[at] ^= 0x01;
        Told(image);
        const auto lines = log.Lines(2);
        EXPECT_EQ(std::count(lines.begin(), lines.end(),
                             "The checksum of the memory module's data does not match."),
                  covered)
            << int{image[2]} << " at " << at;
    }
}

TEST(Spd, OtherDataIsNotRecognised) {
    for (const auto& good : {Ddr2Image(), Ddr3Image(), Ddr4Image()}) {
        for (const std::size_t at : {0, 2}) {  // sizes, type
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
        {95, {0, 0, 0, 0}, "Ramaxel Technology, Not Available, RML1520"},
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
