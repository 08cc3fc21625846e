#include "base/hex.h"

#include <gmock/gmock.h>

#include <array>

namespace ipmisel {

using namespace ::testing;

TEST(Hex, WritesBytesWithTwoDigitsEach) {
    constexpr std::array<std::uint8_t, 3> kBytes{0x0A, 0xFF, 0x30};
    EXPECT_EQ(HexText(kBytes), "0aff30");
    EXPECT_EQ(HexText(kBytes, HexCase::kUpper), "0AFF30");
    EXPECT_EQ(HexText({}), "");
    EXPECT_EQ(HexByte(0x0A), "0Ah");
    EXPECT_EQ(HexByte(0xF1), "F1h");
}

TEST(Hex, ReadsPairsOfDigitsOfEitherCase) {
    EXPECT_THAT(ParseHex("09afAF"), Optional(ElementsAre(0x09, 0xAF, 0xAF)));
    EXPECT_THAT(ParseHex(""), Optional(IsEmpty()));
}

TEST(Hex, ReadsNothingElse) {
    for (const std::string_view text :
         {"9", "09a", "0 9a", "0/", "0:", "0@", "0G", "0`", "0g", "g0", "+1"}) {
        EXPECT_EQ(ParseHex(text), std::nullopt) << text;
    }
    EXPECT_EQ(ParseHex(std::string_view("0123").substr(0, 3)), std::nullopt);
}

}  // namespace ipmisel
