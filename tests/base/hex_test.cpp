#include "base/hex.h"

#include <gtest/gtest.h>

#include <array>

namespace ipmisel {

TEST(Hex, WritesBytesWithTwoDigitsEach) {
    EXPECT_EQ(HexText(std::array<std::uint8_t, 3>{0x0A, 0xFF, 0x30}), "0aff30");
    EXPECT_EQ(HexText({}), "");
    EXPECT_EQ(HexByte(0x0A), "0Ah");
    EXPECT_EQ(HexByte(0xF1), "F1h");
}

}  // namespace ipmisel
