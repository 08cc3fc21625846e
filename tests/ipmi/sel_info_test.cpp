#include "ipmi/sel_info.h"

#include <gtest/gtest.h>

#include <vector>

#include "ipmi/timestamp.h"

namespace ipmi {

TEST(SelInfo, NamesEveryFieldAndIsNoneWhenCut) {
    const std::vector<std::uint8_t> answer{0x51, 0x28, 0x01, 0x34, 0x12, 0x44, 0x33,
                                           0x22, 0x11, 0x88, 0x77, 0x66, 0x55, 0x8B};
    const auto info = ParseSelInfo(answer);
    ASSERT_TRUE(info);
    EXPECT_EQ(info->version, 0x51);
    EXPECT_EQ(info->records, 0x128);
    EXPECT_EQ(info->freeBytes, 0x1234);
    EXPECT_EQ(info->lastAddition, 0x11223344u);
    EXPECT_EQ(info->lastErase, 0x55667788u);
    EXPECT_TRUE(info->overflow);
    EXPECT_TRUE(info->deleteSupported);
    EXPECT_FALSE(info->partialAddSupported);
    EXPECT_TRUE(info->reserveSupported);
    EXPECT_TRUE(info->allocationSupported);
    auto other = answer;
    other.back() = 0x74;  // every flag the other way round
    const auto flags = ParseSelInfo(other);
    EXPECT_FALSE(flags->overflow || flags->deleteSupported || flags->reserveSupported ||
                 flags->allocationSupported);
    EXPECT_TRUE(flags->partialAddSupported);
    for (std::size_t length = 0; length < answer.size(); ++length) {
        EXPECT_FALSE(ParseSelInfo(std::span(answer).first(length))) << length;
    }
}

TEST(SelInfo, HasChangedWhenRecordsCameOrWent) {
    const SelInfo before{.records = 7, .freeBytes = 100, .lastAddition = 3, .lastErase = 2};
    const struct {
        SelInfo later;
        bool changed;
    } cases[] = {
        {before, false},
        {{.records = 7, .freeBytes = 99, .lastAddition = 3, .lastErase = 2}, false},
        {{.records = 8, .freeBytes = 100, .lastAddition = 3, .lastErase = 2}, true},
        {{.records = 7, .freeBytes = 100, .lastAddition = 4, .lastErase = 2}, true},
        {{.records = 7, .freeBytes = 100, .lastAddition = 3, .lastErase = 3}, true},
    };
    for (const auto& c : cases) {
        EXPECT_EQ(before.HasChanged(c.later), c.changed)
            << c.later.records << " " << c.later.lastAddition << " " << c.later.lastErase;
    }
}

TEST(SelAllocation, NamesEveryFieldAndIsNoneWhenCut) {
    const std::vector<std::uint8_t> answer{0x92, 0x0E, 0x12, 0x00, 0x4D, 0x0E, 0x3C, 0x0B, 0x01};
    const auto allocation = ParseSelAllocation(answer);
    ASSERT_TRUE(allocation);
    EXPECT_EQ(allocation->units, 0x0E92);
    EXPECT_EQ(allocation->unitSize, 18);
    EXPECT_EQ(allocation->freeUnits, 0x0E4D);
    EXPECT_EQ(allocation->largestFreeBlock, 0x0B3C);
    EXPECT_EQ(allocation->maxRecordSize, 1);
    EXPECT_FALSE(ParseSelAllocation(std::span(answer).first(8)));
}

TEST(SelTime, IsASignedNumberOfMinutesFromUtcWhereKnown) {
    const struct {
        std::vector<std::uint8_t> answer;
        std::optional<int> minutes;
    } cases[] = {
        {{0x3C, 0x00}, 60},           {{0xC4, 0xFF}, -60},          {{0x00, 0x00}, 0},
        {{0xA0, 0x05}, 1440},         {{0x60, 0xFA}, -1440},        {{0xA1, 0x05}, std::nullopt},
        {{0x5F, 0xFA}, std::nullopt}, {{0xFF, 0x07}, std::nullopt}, {{0x3C}, std::nullopt}};
    for (const auto& c : cases) EXPECT_EQ(ParseSelTimeUtcOffset(c.answer), c.minutes);
    EXPECT_EQ(ParseSelTime(std::vector<std::uint8_t>{0x0A, 0xF8, 0xAD, 0x69}), 0x69ADF80Au);
    EXPECT_EQ(ParseSelTime(std::vector<std::uint8_t>{0x0A, 0xF8, 0xAD}), std::nullopt);
}

TEST(TimeKind, IsDecidedByTheRangesOfTheStandard) {
    EXPECT_EQ(KindOfTime(0x00000000), TimeKind::kSinceStart);
    EXPECT_EQ(KindOfTime(0x20000000), TimeKind::kSinceStart);
    EXPECT_EQ(KindOfTime(0x20000001), TimeKind::kClock);
    EXPECT_EQ(KindOfTime(0xFFFFFFFE), TimeKind::kClock);
    EXPECT_EQ(KindOfTime(0xFFFFFFFF), TimeKind::kNone);
}

}  // namespace ipmi
