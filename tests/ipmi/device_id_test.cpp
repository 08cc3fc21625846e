#include "ipmi/device_id.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <vector>

namespace ipmi {

// Device 20h, revision 1 with SDRs, firmware 2.15, IPMI 2.0, manufacturer 32473, product 0101h.
const std::vector<std::uint8_t> kAnswer{0x20, 0x81, 0x02, 0x15, 0x02, 0xBF, 0xD9, 0x7E,
                                        0x00, 0x01, 0x02, 0x0A, 0x00, 0xFF, 0x03};

TEST(DeviceId, KeepsFlagsAndReservedBitsOutOfTheNumbers) {
    EXPECT_TRUE(ParseDeviceId(kAnswer)->providesSdrs);
    EXPECT_FALSE(ParseDeviceId(kAnswer)->updateInProgress);
    auto answer = kAnswer;
    answer[1] = 0x01;  // no SDRs of its own
    answer[2] = 0x8A;  // update in progress, major 10
    answer[3] = 0x05;
    answer[4] = 0x51;
    answer[8] = 0xF1;
    const auto id = ParseDeviceId(answer);
    ASSERT_TRUE(id);
    EXPECT_FALSE(id->providesSdrs);
    EXPECT_TRUE(id->updateInProgress);
    EXPECT_EQ(FirmwareVersionText(*id), "10.05");
    EXPECT_EQ(IpmiVersionText(*id), "1.5");
    EXPECT_EQ(id->manufacturerId, 0x17ED9u);
}

TEST(DeviceId, UnspecifiedAndReservedNumbersNameNobody) {
    const struct {
        std::array<std::uint8_t, 5> numbers;  // manufacturer ID, product ID
        bool manufacturer, product;
    } cases[] = {{{0, 0, 0, 0, 0}, false, false},
                 {{0xFF, 0xFF, 0x0F, 0xFF, 0xFF}, false, false},
                 {{0, 0, 1, 0, 1}, true, true},
                 {{0xFF, 0xFF, 0x0E, 0xFF, 0xFE}, true, true}};
    for (const auto& c : cases) {
        auto answer = kAnswer;
        std::ranges::copy(c.numbers, answer.begin() + 6);
        const auto id = ParseDeviceId(answer);
        ASSERT_TRUE(id);
        EXPECT_EQ(id->HasManufacturer(), c.manufacturer) << id->manufacturerId;
        EXPECT_EQ(id->HasProduct(), c.product) << id->productId;
    }
}

TEST(DeviceId, IsWholeWithoutTheAuxiliaryRevisionAndNothingWhenCutBefore) {
    for (std::size_t length = 0; length <= kAnswer.size(); ++length) {
        const auto id = ParseDeviceId(std::span(kAnswer).first(length));
        EXPECT_EQ(id.has_value(), length >= 11) << length;
        if (id) {
            EXPECT_EQ(AuxiliaryRevisionText(*id).empty(), length < 15) << length;
        }
    }
}

}  // namespace ipmi
