#include "ipmi/fru_device_reader.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <numeric>
#include <vector>

namespace {

using namespace ipmi;
using Bytes = std::vector<std::uint8_t>;

/// A device that answers as IPMI 2.0 has it, and how it differs.
struct Device {
    Bytes bytes;
    bool byWords = false;
    std::size_t most = 255;    ///< units in one answer
    std::uint8_t tooMany = 0;  ///< completion code for more; 0: gives as much as it can
    unsigned requests = 0;

    explicit Device(std::size_t size) : bytes(size) {
        std::iota(bytes.begin(), bytes.end(), std::uint8_t{0});
    }

    void Answer(FruDeviceReader* reader, const Command& command) {
        ++requests;
        EXPECT_EQ(command.data.at(0), 0x07);
        const std::size_t unit = byWords ? 2 : 1;
        const std::size_t offset = (command.data.at(1) | command.data.at(2) << 8) * unit;
        const std::size_t wanted = command.data.at(3);
        if (wanted > most && tooMany != 0) return reader->TakeAnswer(tooMany, {});
        if (offset >= bytes.size()) return reader->TakeAnswer(kParameterOutOfRange, {});
        const std::size_t count = std::min(std::min(wanted, most) * unit, bytes.size() - offset);
        Bytes data{static_cast<std::uint8_t>(count / unit)};
        const auto begin = bytes.begin() + static_cast<long>(offset);
        data.insert(data.end(), begin, begin + static_cast<long>(count));
        reader->TakeAnswer(kCompleted, data);
    }

    FruDeviceReader ReadAll(std::uint16_t claimed) {
        FruDeviceReader reader(7, {claimed, byWords});
        while (const auto command = reader.NextRequest()) {
            Answer(&reader, *command);
            if (requests > 1000) break;
        }
        return reader;
    }
};

TEST(FruAreaInfo, SizeAndAccess) {
    const auto info = ParseFruAreaInfo(Bytes{0x34, 0x12, 0xFE});
    ASSERT_TRUE(info);
    EXPECT_EQ(info->size, 0x1234);
    EXPECT_FALSE(info->byWords);
    EXPECT_TRUE(ParseFruAreaInfo(Bytes{0x00, 0x01, 0x01})->byWords);
    EXPECT_FALSE(ParseFruAreaInfo(Bytes{0x00, 0x01}));
}

TEST(FruDeviceReader, ReadsAllOfADevice) {
    Device bytes(300);
    EXPECT_EQ(bytes.ReadAll(300).bytes(), bytes.bytes);
    EXPECT_EQ(bytes.requests, 10u);

    Device words(300);
    words.byWords = true;
    EXPECT_EQ(words.ReadAll(300).bytes(), words.bytes);
    EXPECT_EQ(words.requests, 10u);

    Device none(0);
    EXPECT_TRUE(none.ReadAll(0).complete());
    EXPECT_EQ(none.requests, 0u);
}

TEST(FruDeviceReader, AsksForLessWhereTheDeviceGivesLess) {
    for (const std::uint8_t code : {0x00, 0xC7, 0xC8, 0xCA}) {
        for (const bool words : {false, true}) {
            Device device(100);
            device.most = 5;
            device.byWords = words;
            device.tooMany = code;
            const FruDeviceReader reader = device.ReadAll(100);
            EXPECT_EQ(reader.bytes(), device.bytes) << int{code} << words;
        }
    }
    Device stubborn(100);
    stubborn.most = 0;
    stubborn.tooMany = kCannotReturnBytes;
    EXPECT_FALSE(stubborn.ReadAll(100).complete());
    EXPECT_LT(stubborn.requests, 8u);
}

TEST(FruDeviceReader, ADeviceShorterThanItClaimsEndsTheReading) {
    Device device(100);
    const FruDeviceReader reader = device.ReadAll(256);
    EXPECT_EQ(reader.bytes(), device.bytes);
    EXPECT_FALSE(reader.complete());
}

TEST(FruDeviceReader, NoAnswerGivesMoreThanItHolds) {
    const struct {
        Bytes data;
        std::size_t read;
        bool goesOn;
    } cases[] = {
        {{}, 0, false},
        {{4}, 0, false},
        {{0, 1, 2}, 0, false},      // a count of nothing
        {{4, 1, 2}, 2, true},       // fewer than counted
        {{2, 1, 2, 3}, 2, true},    // more than counted
        {Bytes(60, 59), 32, true},  // more than wanted
    };
    for (const auto& c : cases) {
        FruDeviceReader reader(0, {64, false});
        reader.TakeAnswer(kCompleted, c.data);
        EXPECT_EQ(reader.bytes().size(), c.read) << c.data.size();
        EXPECT_EQ(reader.NextRequest().has_value(), c.goesOn) << c.data.size();
    }
    FruDeviceReader odd(0, {5, true});
    odd.TakeAnswer(kCompleted, Bytes{3, 1, 2, 3, 4, 5, 6});
    EXPECT_EQ(odd.bytes(), (Bytes{1, 2, 3, 4, 5})) << "not past the size";
    EXPECT_TRUE(odd.complete());
}

}  // namespace
