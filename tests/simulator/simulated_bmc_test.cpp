#include "simulator/simulated_bmc.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <array>
#include <chrono>
#include <numeric>
#include <string>

namespace ipmisim {
namespace {

using ::testing::ElementsAre;
using ::testing::Optional;

constexpr std::uint8_t kStorage = 0x0A;
constexpr std::uint8_t kReserve = 0x22, kGetSdr = 0x23, kGetSelInfo = 0x40, kGetSelEntry = 0x43;

/// 16 bytes that all differ, with the record ID in front.
std::array<std::uint8_t, 16> Entry(std::uint16_t id) {
    std::array<std::uint8_t, 16> entry{};
    std::iota(entry.begin(), entry.end(), std::uint8_t{0xA0});
    entry[0] = static_cast<std::uint8_t>(id);
    entry[1] = static_cast<std::uint8_t>(id >> 8);
    entry[2] = 0x02;
    return entry;
}

Fault MakeFault(std::uint8_t command, std::optional<unsigned> call, Fault::Kind kind) {
    Fault fault;
    fault.netFn = kStorage;
    fault.command = command;
    fault.call = call;
    fault.kind = kind;
    return fault;
}

class Bmc : public ::testing::Test {
protected:
    BmcDescription description;

    std::optional<Bytes> Storage(std::uint8_t command, const Bytes& data = {}) {
        if (!bmc_) bmc_.emplace(description);
        return bmc_->Execute(kStorage, 0, command, data);
    }
    /// Get SEL Entry or Get SDR.
    Bytes Read(std::uint8_t command, std::uint16_t id, std::uint8_t offset, std::uint8_t count,
               std::uint16_t reservation = 0) {
        return Storage(command,
                       {static_cast<std::uint8_t>(reservation),
                        static_cast<std::uint8_t>(reservation >> 8), static_cast<std::uint8_t>(id),
                        static_cast<std::uint8_t>(id >> 8), offset, count})
            .value_or(Bytes{});
    }

private:
    std::optional<SimulatedBmc> bmc_;
};

TEST_F(Bmc, SelEntryIsFoundByIdFirstAndLastAndChained) {
    description.selEntries = {Entry(0x0010), Entry(0x0203), Entry(0x0005)};
    const struct {
        std::uint16_t asked, own, next;
    } cases[] = {{0x0000, 0x0010, 0x0203},
                 {0x0010, 0x0010, 0x0203},
                 {0x0203, 0x0203, 0x0005},
                 {0x0005, 0x0005, 0xFFFF},
                 {0xFFFF, 0x0005, 0xFFFF}};
    for (const auto& c : cases) {
        Bytes expected{0x00, static_cast<std::uint8_t>(c.next),
                       static_cast<std::uint8_t>(c.next >> 8)};
        const auto entry = Entry(c.own);
        expected.insert(expected.end(), entry.begin(), entry.end());
        EXPECT_EQ(Read(kGetSelEntry, c.asked, 0, 0xFF), expected) << c.asked;
    }
    EXPECT_THAT(Read(kGetSelEntry, 0x0011, 0, 0xFF), ElementsAre(0xCB));
}

TEST_F(Bmc, SelEntryHonoursOffsetAndCount) {
    description.selEntries = {Entry(1)};
    EXPECT_THAT(Read(kGetSelEntry, 1, 7, 3), ElementsAre(0, 0xFF, 0xFF, 0xA7, 0xA8, 0xA9));
    EXPECT_THAT(Read(kGetSelEntry, 1, 14, 9), ElementsAre(0, 0xFF, 0xFF, 0xAE, 0xAF));
    EXPECT_THAT(Read(kGetSelEntry, 1, 15, 0xFF), ElementsAre(0, 0xFF, 0xFF, 0xAF));
    EXPECT_THAT(Read(kGetSelEntry, 1, 16, 1), ElementsAre(0xC9));
    EXPECT_THAT(Read(kGetSelEntry, 1, 0, 0), ElementsAre(0, 0xFF, 0xFF));
}

TEST_F(Bmc, EmptyLogAndRepositoryHaveNoFirstRecord) {
    EXPECT_THAT(Read(kGetSelEntry, 0x0000, 0, 0xFF), ElementsAre(0xCB));
    EXPECT_THAT(Read(kGetSdr, 0xFFFF, 0, 0xFF), ElementsAre(0xCB));
    EXPECT_THAT(Storage(kGetSelInfo), Optional(ElementsAre(0, 0x51, 0, 0, 0xFF, 0xFF, 0xFF, 0xFF,
                                                           0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0)));
}

TEST_F(Bmc, InfosCountAndSayTheNewestTime) {
    description.selVersion = 0x02;
    description.sdrVersion = 0x15;
    description.selEntries.assign(0x1234, Entry(7));
    description.selEntries.back()[2] = 0xE0;  // has no time stamp
    description.sdrRecords.assign(0x0102, Bytes(300));
    EXPECT_THAT(Storage(kGetSelInfo),
                Optional(ElementsAre(0, 0x02, 0x34, 0x12, 0xFF, 0xFF, 0xA3, 0xA4, 0xA5, 0xA6, 0xFF,
                                     0xFF, 0xFF, 0xFF, 0)));
    EXPECT_THAT(Storage(0x20), Optional(ElementsAre(0, 0x15, 0x02, 0x01, 0, 0, 0xFF, 0xFF, 0xFF,
                                                    0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0x02)));
}

TEST_F(Bmc, SdrWantsTheLatestReservationForReadsWithAnOffset) {
    description.sdrRecords = {{0x03, 0x00, 0x51, 0x01, 0x02, 0xB5, 0xB6}, {0x04, 0x01, 0x51}};
    EXPECT_THAT(Read(kGetSdr, 0, 0, 2), ElementsAre(0, 0x04, 0x01, 0x03, 0x00));
    EXPECT_THAT(Read(kGetSdr, 0, 5, 2), ElementsAre(0xC5));  // none made yet, and 0 is none
    EXPECT_THAT(Storage(kReserve), Optional(ElementsAre(0, 1, 0)));
    EXPECT_THAT(Storage(kReserve), Optional(ElementsAre(0, 2, 0)));
    EXPECT_THAT(Read(kGetSdr, 3, 5, 2, 1), ElementsAre(0xC5));
    EXPECT_THAT(Read(kGetSdr, 3, 5, 9, 2), ElementsAre(0, 0x04, 0x01, 0xB5, 0xB6));
    EXPECT_THAT(Read(kGetSdr, 3, 2, 0xFF, 2), ElementsAre(0, 4, 1, 0x51, 1, 2, 0xB5, 0xB6));
    EXPECT_THAT(Read(kGetSdr, 3, 7, 1, 2), ElementsAre(0xC9));
    EXPECT_THAT(Read(kGetSdr, 0x0104, 2, 4, 2), ElementsAre(0, 0xFF, 0xFF, 0x51));
}

TEST_F(Bmc, RecordsOfNoLengthOrOfOneIdDoNoHarm) {
    description.sdrRecords = {{}, {0x07}, {0x09, 0x00, 0xA2}, {0x09, 0x00, 0xB2}};
    EXPECT_THAT(Read(kGetSdr, 0x0000, 0, 0xFF), ElementsAre(0xC9));
    EXPECT_THAT(Read(kGetSdr, 0x0007, 0, 0xFF), ElementsAre(0, 0x09, 0x00, 0x07));
    EXPECT_THAT(Read(kGetSdr, 0x0009, 0, 0xFF), ElementsAre(0, 0x09, 0x00, 0x09, 0x00, 0xA2));
}

TEST_F(Bmc, FruAnswersItsSizeAndAtMostTheCount) {
    description.fru[3] = {0xD0, 0xD1, 0xD2, 0xD3};
    description.fru[4] = Bytes(0x0102);
    EXPECT_THAT(Storage(0x10, {3}), Optional(ElementsAre(0, 4, 0, 0)));
    EXPECT_THAT(Storage(0x10, {4}), Optional(ElementsAre(0, 0x02, 0x01, 0)));
    EXPECT_THAT(Storage(0x10, {9}), Optional(ElementsAre(0xCB)));
    EXPECT_THAT(Storage(0x11, {3, 1, 0, 2}), Optional(ElementsAre(0, 2, 0xD1, 0xD2)));
    EXPECT_THAT(Storage(0x11, {3, 3, 0, 16}), Optional(ElementsAre(0, 1, 0xD3)));
    EXPECT_THAT(Storage(0x11, {3, 4, 0, 16}), Optional(ElementsAre(0xC9)));
    EXPECT_THAT(Storage(0x11, {3, 0, 1, 16}), Optional(ElementsAre(0xC9)));
    EXPECT_THAT(Storage(0x11, {4, 0, 1, 16}), Optional(ElementsAre(0, 2, 0, 0)));
    EXPECT_THAT(Storage(0x11, {0, 0, 0, 16}), Optional(ElementsAre(0xCB)));
}

TEST_F(Bmc, WhatIsNotDescribedIsNoCommand) {
    description.replies = {{kStorage, 0x5B, {0x01}, {0x12, 0x34}}, {0x2E, 0x00, {}, {0x56}}};
    SimulatedBmc bmc(description);
    const struct {
        std::uint8_t netFn, command;
        Bytes data, answer;
    } cases[] = {
        {0x06, 0x01, {}, {0xC1}},
        {kStorage, 0x5A, {0x01}, {0xC1}},
        {kStorage, 0x42, {}, {0xC1}},
        {0x06, 0x40, {}, {0xC1}},  // of another NetFn
        {kStorage, 0x5B, {0x01, 0x77}, {0x00, 0x12, 0x34}},
        {kStorage, 0x5B, {0x02}, {0xC1}},
        {kStorage, 0x5B, {}, {0xC1}},
        {0x2E, 0x00, {0x99}, {0x00, 0x56}},
        {kStorage, kGetSelEntry, {0, 0, 0, 0, 0}, {0xC7}},
    };
    for (const auto& c : cases) {
        EXPECT_EQ(bmc.Execute(c.netFn, 0, c.command, c.data), c.answer)
            << int{c.netFn} << " " << int{c.command};
    }
}

TEST_F(Bmc, DescribedValuesAreAnswered) {
    description.deviceId = {0x20, 0x01, 0x02};
    description.selTime = 0x65E70340;
    description.auxLogCount = 0x1234;
    EXPECT_THAT(Storage(0x48), Optional(ElementsAre(0, 0x40, 0x03, 0xE7, 0x65)));
    // Bytes 16 and 17 of the reply frame, whose byte 8 is the completion code.
    EXPECT_THAT(Storage(0x5A, {1}), Optional(ElementsAre(0, 0, 0, 0, 0, 0, 0, 0, 0x34, 0x12)));
    EXPECT_THAT(SimulatedBmc(description).Execute(0x06, 0, 0x01, {}),
                Optional(ElementsAre(0, 0x20, 0x01, 0x02)));
}

TEST_F(Bmc, FaultsStrikeTheCallTheyName) {
    description.selEntries = {Entry(1)};
    description.selTime = 0x44332211;
    auto code = MakeFault(0x48, 2, Fault::Kind::kCompletionCode);
    code.completionCode = 0xC3;
    auto cut = MakeFault(0x48, 3, Fault::Kind::kTruncate);
    cut.truncate = 2;
    auto data = MakeFault(0x48, 4, Fault::Kind::kData);
    data.data = {0x99};
    auto wide = MakeFault(0x48, 5, Fault::Kind::kTruncate);
    wide.truncate = 99;
    description.faults = {
        MakeFault(0x48, 1, Fault::Kind::kNoResponse),        code, cut, data, wide,
        MakeFault(kGetSelInfo, {}, Fault::Kind::kNoResponse)};
    EXPECT_EQ(Storage(0x48), std::nullopt);
    EXPECT_THAT(Storage(0x48), Optional(ElementsAre(0xC3)));
    EXPECT_EQ(Storage(kGetSelInfo), std::nullopt);
    EXPECT_THAT(Storage(0x48), Optional(ElementsAre(0, 0x11, 0x22)));
    EXPECT_THAT(Storage(0x48), Optional(ElementsAre(0, 0x99)));
    EXPECT_THAT(Storage(0x48), Optional(ElementsAre(0, 0x11, 0x22, 0x33, 0x44)));
    EXPECT_THAT(Storage(0x48), Optional(ElementsAre(0, 0x11, 0x22, 0x33, 0x44)));
    EXPECT_EQ(Storage(kGetSelInfo), std::nullopt);
}

TEST_F(Bmc, LatencyIsKept) {
    description.latencyMicroseconds = 20'000;
    const auto before = std::chrono::steady_clock::now();
    Storage(kGetSelInfo);
    EXPECT_GE(std::chrono::steady_clock::now() - before, std::chrono::milliseconds(20));
}

TEST_F(Bmc, TheLargestLogIsReadToItsEnd) {
    for (unsigned id = 1; id <= 0xFFFE; ++id) {
        description.selEntries.push_back(Entry(static_cast<std::uint16_t>(id)));
    }
    unsigned reads = 0;
    for (std::uint16_t next = 0; next != 0xFFFF; ++reads) {
        const Bytes answer = Read(kGetSelEntry, next, 0, 0xFF);
        ASSERT_EQ(answer.size(), 19u) << next;
        next = static_cast<std::uint16_t>(answer[1] | answer[2] << 8);
    }
    EXPECT_EQ(reads, 0xFFFEu);
}

}  // namespace
}  // namespace ipmisim
