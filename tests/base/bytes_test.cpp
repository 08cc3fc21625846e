#include "base/bytes.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace ipmisel {
namespace {

using namespace ::testing;

TEST(ByteReader, ReadsLittleEndianAndStaysNotOkPastTheEnd) {
    const std::vector<std::uint8_t> bytes{1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11};
    ByteReader in(bytes);
    EXPECT_EQ(in.U8(), 0x01);
    EXPECT_EQ(in.U16(), 0x0302);
    EXPECT_EQ(in.U32(), 0x07060504U);
    EXPECT_EQ(in.U24(), 0x0A0908U);
    EXPECT_TRUE(in.ok());
    EXPECT_EQ(in.U16(), 0x000B);
    EXPECT_FALSE(in.ok());
    in.Skip(0);
    EXPECT_EQ(in.U8(), 0);
    EXPECT_FALSE(in.ok());
}

TEST(Dump, WritesEveryByteWithABlank) {
    const std::vector<std::uint8_t> bytes{0x00, 0x0A, 0xFF, 0x10, 0x05, 0x06};
    EXPECT_EQ(DumpBytes(bytes, Digits::kUpperHex), "00 0A FF 10 05 06 ");
    EXPECT_EQ(DumpBytes(bytes, Digits::kDecimal), "0 10 255 16 5 6 ");
    EXPECT_EQ(DumpBytes({}, Digits::kUpperHex), "");
    EXPECT_EQ(DumpFrame(bytes, Digits::kLowerHex), "\n\t00 0a ff 10 05 \n\t06 ");
}

TEST(ScanHexRow, ReadsBackWhatADumpWrote) {
    std::vector<std::uint8_t> bytes(256);
    std::vector<unsigned> numbers(256);
    for (unsigned i = 0; i < 256; ++i) bytes[i] = static_cast<std::uint8_t>(numbers[i] = i);
    EXPECT_EQ(ScanHexRow(DumpBytes(bytes, Digits::kUpperHex), 256), numbers);
}

TEST(ScanHexRow, StopsWhereTheNumbersDo) {
    EXPECT_EQ(ScanHexRow("", 4), std::nullopt);
    EXPECT_EQ(ScanHexRow(" \n\t ", 4), std::nullopt);
    EXPECT_THAT(ScanHexRow("zz", 4), Optional(IsEmpty()));
    EXPECT_THAT(ScanHexRow("01 2a\n ff", 2), Optional(ElementsAre(0x01, 0x2A)));
    EXPECT_THAT(ScanHexRow("01 2A zz 03", 4), Optional(ElementsAre(0x01, 0x2A)));
    EXPECT_THAT(ScanHexRow("1FFFFFFFFF 2", 4), Optional(ElementsAre(0xFFFFFFFFU, 2)));
}

}  // namespace
}  // namespace ipmisel
