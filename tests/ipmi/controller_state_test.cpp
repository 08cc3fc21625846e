// Small answers of the controller about itself.

#include <gmock/gmock.h>

#include <vector>

#include "ipmi/chassis_status.h"
#include "ipmi/sdr_info.h"
#include "ipmi/self_test.h"

namespace ipmi {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using Bytes = std::vector<std::uint8_t>;

TEST(ChassisStatus, PowerFaultsAndIntrusion) {
    const auto status = ChassisStatus::Parse(Bytes{0x0B, 0x11, 0x05, 0xFF}).value();
    EXPECT_TRUE(status.powerOn);
    EXPECT_THAT(status.powerFaults, ElementsAre("power overload", "power fault"));
    EXPECT_THAT(status.lastPowerEvent, ElementsAre("AC failed", "power on by IPMI command"));
    EXPECT_TRUE(status.chassisIntrusion && status.driveFault);
    EXPECT_FALSE(status.frontPanelLockout || status.coolingFault);

    // The restore policy and reserved bits are no faults.
    const auto well = ChassisStatus::Parse(Bytes{0xE0, 0xE0, 0x7A}).value();
    EXPECT_FALSE(well.powerOn || well.chassisIntrusion || well.driveFault);
    EXPECT_TRUE(well.frontPanelLockout && well.coolingFault);
    EXPECT_THAT(well.powerFaults, IsEmpty());
    EXPECT_THAT(well.lastPowerEvent, IsEmpty());
    EXPECT_FALSE(ChassisStatus::Parse(Bytes{0x01, 0x00}).has_value());
}

TEST(SelfTest, EveryResultHasWords) {
    const struct {
        Bytes data;
        const char* text;
    } cases[] = {
        {{0x55, 0x00}, "passed"},
        {{0x56, 0x00}, "not implemented"},
        {{0x57, 0x48}, "cannot access SDR repository, SDR repository empty"},
        {{0x57, 0x81}, "cannot access SEL device, controller operational firmware corrupted"},
        {{0x57, 0x00}, "corrupted or inaccessible data or devices"},
        {{0x58, 0x12}, "fatal hardware error, device-specific code 12h"},
        {{0x7A, 0x0B}, "device-specific failure, codes 7ah 0bh"},
        {{0xFF, 0x00}, "reserved result ffh"},
    };
    for (const auto& c : cases) EXPECT_EQ(SelfTestText(c.data), c.text);
    EXPECT_EQ(SelfTestText(Bytes{0x55}), std::nullopt);
}

TEST(SdrRepositoryInfo, IsReadWholeOrNotAtAll) {
    const Bytes answer{0x51, 0x02, 0x01, 0x04, 0x03, 1, 2, 3, 4, 5, 6, 7, 8, 0x22};
    EXPECT_EQ(SdrRepositoryInfo::Parse(answer),
              (SdrRepositoryInfo{0x51, 0x0102, 0x0304, 0x04030201, 0x08070605, 0x22}));
    EXPECT_FALSE(SdrRepositoryInfo::Parse(std::span(answer).first(13)).has_value());
}

}  // namespace
}  // namespace ipmi
