#include "ipmi/id_string.h"

#include <gtest/gtest.h>

#include <vector>

namespace ipmi {
namespace {

TEST(IdString, AllFourEncodingsGiveUtf8) {
    const struct {
        std::uint8_t typeLength;
        std::vector<std::uint8_t> bytes;
        const char* text;
    } cases[] = {
        {0xC3, {'F', 'a', 'n', 'X'}, "Fan"},
        {0xC3, {'T', 0xB0, 'C'}, "T\u00B0C"},
        {0xC1, {'A'}, "A"},  // one character is a name, not an end mark
        {0xDF, {'b', 'o', 't', 'h'}, "both"},
        {0xC6, {'U', 'p', 0, 'x', 'y', 'z'}, "Up"},
        {0xC4, {'A', 'B', ' ', ' '}, "AB"},
        {0xC0, {'A'}, ""},
        // The standard's own example of packing: "IPMI" is 29h DCh A6h.
        {0x84, {0x29, 0xDC, 0xA6}, "IPMI"},
        {0x83, {0x29, 0xDC, 0xA6}, "IPM"},
        {0x81, {0x29, 0xDC}, "I"},
        {0x85, {0x29, 0xDC, 0xA6, 0x3F, 0xFF}, "IPMI_"},
        {0x84, {0x29, 0xDC}, "IP"},  // cut: two characters are whole
        {0x46, {0x01, 0x2B, 0x9C}, "012-9."},
        {0x45, {0x01, 0x2A, 0xDE, 0xF0}, "012 :"},
        {0x45, {0x01}, "01"},
        {0x03, {'1', 0, 0xE9, 0, 0xAC, 0x20, 'x', 0}, "1\xC3\xA9\xE2\x82\xAC"},
        {0x02, {0x3D, 0xD8, 0x25, 0xDD}, "\xF0\x9F\x94\xA5"},
        {0x02, {0x3D, 0xD8, 'A', 0}, "\uFFFDA"},
        {0x03, {'A', 0, 'B'}, "A"},
        {0x02, {'A', 0, 0, 0}, "A"},
        {0x00, {'A', 0}, ""},
    };
    for (const auto& c : cases) {
        EXPECT_EQ(DecodeIdString(c.typeLength, c.bytes), c.text) << int{c.typeLength};
    }
}

TEST(IdString, TheClaimedLengthIsInCharacters) {
    EXPECT_EQ(TypeLength::FromByte(0x10).Bytes(), 32u);
    EXPECT_EQ(TypeLength::FromByte(0x43).Bytes(), 2u);
    EXPECT_EQ(TypeLength::FromByte(0x85).Bytes(), 4u);
    EXPECT_EQ(TypeLength::FromByte(0xF0).Bytes(), 16u);  // bit 5 is reserved
}

TEST(IdString, AnInventoryFieldIsDecodedToItsLastByte) {
    EXPECT_EQ(DecodeSixBit(std::vector<std::uint8_t>{0x29, 0xDC, 0xA6, 0x00}, 99), "IPMI ");
    EXPECT_EQ(DecodeBcdPlus(std::vector<std::uint8_t>{0x00, 0x12}, 99), "0012");
}

}  // namespace
}  // namespace ipmi
