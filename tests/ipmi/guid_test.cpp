#include "ipmi/guid.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <vector>

namespace ipmi {

// f81d4fae-7dec-11d0-a765-00a0c91e6bf6, the example of RFC 4122.
constexpr Guid kAsText{0xF8, 0x1D, 0x4F, 0xAE, 0x7D, 0xEC, 0x11, 0xD0,
                       0xA7, 0x65, 0x00, 0xA0, 0xC9, 0x1E, 0x6B, 0xF6};
constexpr Guid kAsSmbios{0xAE, 0x4F, 0x1D, 0xF8, 0xEC, 0x7D, 0xD0, 0x11,
                         0xA7, 0x65, 0x00, 0xA0, 0xC9, 0x1E, 0x6B, 0xF6};
constexpr Guid kAsIpmi{0xF6, 0x6B, 0x1E, 0xC9, 0xA0, 0x00, 0x65, 0xA7,
                       0xD0, 0x11, 0xEC, 0x7D, 0xAE, 0x4F, 0x1D, 0xF8};

TEST(Guid, ReadsTheSameInEachOrderOfItsBytes) {
    const struct {
        Guid bytes;
        GuidOrder order;
    } cases[] = {{kAsText, GuidOrder::kRfc4122},
                 {kAsSmbios, GuidOrder::kSmbios},
                 {kAsIpmi, GuidOrder::kIpmi}};
    for (const auto& c : cases) {
        EXPECT_EQ(GuidText(c.bytes, c.order), "f81d4fae-7dec-11d0-a765-00a0c91e6bf6");
        EXPECT_EQ(GuidOrderBySmbios(c.bytes, kAsSmbios), c.order);
    }
}

TEST(Guid, HasNoOrderWhenSmbiosNamesAnotherSystem) {
    Guid other = kAsSmbios;
    other[15] ^= 1;
    EXPECT_EQ(GuidOrderBySmbios(kAsIpmi, other), std::nullopt);
}

TEST(Guid, IsNoneWhenUnsetOrShort) {
    EXPECT_EQ(ParseGuid(std::vector<std::uint8_t>(16, 0x00)), std::nullopt);
    EXPECT_EQ(ParseGuid(std::vector<std::uint8_t>(16, 0xFF)), std::nullopt);
    EXPECT_EQ(ParseGuid(std::span(kAsIpmi).first(15)), std::nullopt);
    EXPECT_EQ(ParseGuid(kAsIpmi), kAsIpmi);
}

}  // namespace ipmi
