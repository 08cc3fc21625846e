#include "ipmi/fru_inventory.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "tests/support/fru_image.h"

namespace {

using namespace ipmi;
using namespace ipmiseltest;
using testing::Contains;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::StartsWith;

FruInventory Read(const FruBytes& image) { return ReadFruInventory(image, image.size()); }
FruInventory Read(const FruImage& image) { return Read(image.Bytes()); }

/// The board's area with these fields and no others, and what is read of it.
FruInventory ReadBoard(std::uint8_t language, const std::vector<FruBytes>& fields) {
    return Read({.chassis = {},
                 .board = Area({language, 0, 0, 0}, fields),
                 .product = {},
                 .multiRecords = {}});
}

TEST(FruInventory, FieldsAreReadInEveryEncoding) {
    const struct {
        std::uint8_t language;
        FruBytes field;
        const char* text;
    } cases[] = {
        {25, Field(0, {0x0A, 0xFF}), "0x0aff"},
        {25, Field(0, {}), ""},
        {25, Field(1, {0x00, 0x12, 0xB3, 0xCA}), "0012-3."},
        {25, Field(2, {0x29, 0xDC, 0xA6}), "IPMI"},  // the definition's own example
        {25, Field(3, {'5', 0xB5, 'A'}), "5\u00B5A"},
        {0, Field("plain"), "plain"},
        {1, Field(3, {'A', 0, 0xB5, 0x03}), "A\xCE\xB5"},  // not English: UTF-16
        {25, Field("padded  "), "padded"},
        {25, Field("    "), ""},
        {25, Field(3, {'A', 'B', 0, 'x'}), "AB"},
        {25, Field(""), ""},
    };
    for (const auto& c : cases) {
        const FruInventory inventory =
            ReadBoard(c.language, {c.field, Field("next"), Field("ss"), Field("pp"), Field("ff")});
        ASSERT_TRUE(inventory.board);
        EXPECT_EQ(inventory.board->manufacturer, c.text);
        EXPECT_EQ(inventory.board->product, c.language == 1 ? "\xE6\x95\xAE\xE7\x91\xB8" : "next");
        EXPECT_THAT(inventory.problems, IsEmpty()) << c.text;
    }
    const FruInventory reserved =
        ReadBoard(25, {Field(1, {0x1D}), Field("bb"), Field("ss"), Field("pp"), Field("ff")});
    EXPECT_EQ(reserved.board->manufacturer, "0x1d");
    EXPECT_THAT(reserved.problems, ElementsAre("board area: field 1 is no BCD plus"));
}

TEST(FruInventory, TheEndMarkEndsTheFieldsWhereverItStands) {
    const FruInventory inventory =
        ReadBoard(25, {Field("Acme"), Field("Board"), {0xC1}, Field("not read")});
    EXPECT_EQ(inventory.board->product, "Board");
    EXPECT_EQ(inventory.board->serialNumber, "");
    EXPECT_THAT(inventory.board->custom, IsEmpty());
    EXPECT_THAT(inventory.problems, ElementsAre("board area: fields end before the serial number"));
}

TEST(FruInventory, AFieldPastItsAreaEndsIt) {
    FruBytes board = Area({25, 0, 0, 0}, {Field("Acme"), Field("Board")});
    board[11] = 0xFF;  // the product name's length
    board.back() = 0;
    board.back() = ZeroChecksum(board);
    const FruInventory inventory = Read({{}, board, {}, {}});
    EXPECT_EQ(inventory.board->manufacturer, "Acme");
    EXPECT_EQ(inventory.board->product, "");
    EXPECT_THAT(inventory.problems, ElementsAre("board area: field 2 runs past the area"));
}

TEST(FruInventory, AnAreaFullOfEmptyFieldsEndsWithItself) {
    FruBytes product(248, 0x00);
    product[0] = 1;
    product[1] = 31;
    product.back() = ZeroChecksum(product);
    const FruInventory inventory = Read({{}, {}, product, {}});
    EXPECT_THAT(inventory.product->custom, IsEmpty());
    EXPECT_THAT(inventory.problems,
                ElementsAre("product area: the mark at the end of the fields is missing"));
}

// Each with a single byte changed, and the header's checksum put right where it is the header.
TEST(FruInventory, DamageIsToldAndTheRestIsRead) {
    const FruImage whole = WholeFruImage();
    const std::size_t chassis = 8;
    const std::size_t board = chassis + whole.chassis.size();
    const std::size_t product = board + whole.board.size();
    const std::size_t records = product + whole.product.size();
    const struct {
        std::size_t at;
        std::uint8_t byte;
        const char* problem;
        bool chassis, board, product;
        std::size_t multiRecords;
    } cases[] = {
        {1, 0x40, "internal use area: begins at byte 512, past the end (", true, true, true, 1},
        {2, 0x7F, "chassis area: begins at byte 1016, past the end", false, true, true, 1},
        {5, 0x7F, "multi-record area: begins at byte 1016, past the end", true, true, true, 0},
        {2, 0x00, "", false, true, true, 1},
        {3, 0x01, "board area: overlaps the chassis area", true, true, true, 1},
        {4, 0xF0, "product area: begins at byte 1920, past", true, true, false, 1},
        {chassis + 4, 'X', "chassis area: checksum is wrong", true, true, true, 1},
        {chassis, 2, "chassis area: format version is 2, not 1", false, true, true, 1},
        {chassis + 1, 0, "chassis area: length is 0", false, true, true, 1},
        {chassis + 1, 200, "chassis area: runs past the end (", true, true, true, 1},
        {board + 20, 'X', "board area: checksum is wrong", true, true, true, 1},
        {product + 4, 'X', "product area: checksum is wrong", true, true, true, 1},
        {records + 5, 0, "multi-record 1: checksum is wrong", true, true, true, 1},
        {records, 0xC1, "multi-record 1: checksum of the header is wrong", true, true, true, 0},
    };
    for (const auto& c : cases) {
        FruBytes image = whole.Bytes();
        image[c.at] = c.byte;
        if (c.at < 7) {
            image[7] = 0;
            image[7] = ZeroChecksum(FruBytes(image.begin(), image.begin() + 8));
        }
        const FruInventory inventory = Read(image);
        if (*c.problem != 0) {
            EXPECT_THAT(inventory.problems, Contains(StartsWith(c.problem))) << c.at;
        } else {
            EXPECT_THAT(inventory.problems, IsEmpty());
        }
        EXPECT_EQ(inventory.chassis.has_value(), c.chassis) << c.problem;
        EXPECT_EQ(inventory.board.has_value(), c.board) << c.problem;
        EXPECT_EQ(inventory.product.has_value(), c.product) << c.problem;
        EXPECT_EQ(inventory.multiRecords.size(), c.multiRecords) << c.problem;
    }
}

// One whose length or fields lead somewhere else holds no fields at all.
TEST(FruInventory, AnAreaWhoseChecksumAndFieldsAreWrongIsNotRead) {
    const FruBytes whole = WholeFruImage().Bytes();
    for (const std::size_t at : {9, 11}) {  // length of the area, length of its first field
        FruBytes image = whole;
        image[at] = 0xFF;
        const FruInventory inventory = Read(image);
        EXPECT_FALSE(inventory.chassis && at == 11);
        EXPECT_TRUE(inventory.board && inventory.product);
        EXPECT_FALSE(inventory.sound);
    }
    FruBytes image(256, 0x41);  // something else, behind a header that fits
    const FruBytes header{1, 0, 0, 1, 0, 0, 0, 0xFE, 1, 0x25};
    std::copy(header.begin(), header.end(), image.begin());
    const FruInventory inventory = Read(image);
    EXPECT_FALSE(inventory.board);
    EXPECT_THAT(inventory.problems,
                ElementsAre("board area: runs past the end (256 bytes)",
                            "board area: its fields are not read, they are damaged too"));
}

// Where the header cannot be believed, an area is taken that proves itself by its own checksum.
TEST(FruInventory, AHeaderWithAWrongChecksumLeavesTheSoundAreas) {
    FruBytes image = WholeFruImage().Bytes();
    image[7] ^= 0x01;
    image[8 + 4] ^= 0x01;  // the chassis area too
    const FruInventory inventory = Read(image);
    EXPECT_FALSE(inventory.chassis);
    EXPECT_TRUE(inventory.board && inventory.product);
    EXPECT_THAT(inventory.problems,
                ElementsAre("header: checksum is wrong", "chassis area: checksum is wrong"));
}

TEST(FruInventory, WhatIsNoInventoryHasProblemsAlone) {
    const struct {
        FruBytes image;
        const char* problem;
    } cases[] = {
        {{}, "header: is cut after 0 of 8 bytes"},
        {FruBytes(7, 1), "header: is cut after 7 of 8 bytes"},
        {FruBytes(256, 0x00), "header: every byte is 00h"},
        {FruBytes(256, 0xFF), "header: every byte is ffh"},
        {FruBytes{0x82, 0x08, 0x08, 0, 0, 0, 0, 0}, "header: format version is 2, not 1"},
    };
    for (const auto& c : cases) {
        const FruInventory inventory = Read(c.image);
        EXPECT_THAT(inventory.problems, ElementsAre(c.problem));
        EXPECT_FALSE(inventory.chassis || inventory.board || inventory.product);
    }
}

TEST(FruInventory, AnImageCutAtAnyLengthKeepsWhatIsWhole) {
    const FruBytes whole = WholeFruImage().Bytes();
    for (std::size_t length = 8; length < whole.size(); ++length) {
        const FruInventory inventory =
            ReadFruInventory(std::span(whole).first(length), whole.size());
        EXPECT_FALSE(inventory.problems.empty()) << length;
        if (inventory.chassis) {
            EXPECT_THAT("CH-1", StartsWith(inventory.chassis->partNumber)) << length;
        }
        if (inventory.product) {
            EXPECT_THAT("Acme Systems", StartsWith(inventory.product->manufacturer)) << length;
        }
    }
}

TEST(FruInventory, MultiRecordsEndWithTheDevice) {
    FruBytes records = MultiRecord(0xC0, false, {});
    for (int i = 0; i < 20; ++i) {
        const FruBytes next = MultiRecord(0xC1, false, {});
        records.insert(records.end(), next.begin(), next.end());
    }
    const FruInventory inventory = Read({{}, {}, {}, records});
    EXPECT_EQ(inventory.multiRecords.size(), 21u);
    EXPECT_THAT(inventory.problems,
                ElementsAre("multi-record 22: the device ends before the last record"));

    // Zeros add up to zero, and are no records.
    EXPECT_THAT(
        Read({{}, {}, {}, FruBytes(64, 0)}).problems,
        ElementsAre("multi-record 1: format version is 0, not 2; what follows is not read"));

    records = MultiRecord(0xC0, false, {1, 2, 3, 4});
    records.resize(8);
    EXPECT_THAT(Read({{}, {}, {}, records}).problems,
                ElementsAre(HasSubstr("multi-record 1: runs past the end")));
}

}  // namespace
