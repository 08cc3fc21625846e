#include "host/spdriver/loop_guard.h"

#include <gtest/gtest.h>

#include <map>
#include <memory>
#include <vector>

#include "tests/host/spdriver/requests.h"

namespace {

using ipmiseltest::ReadRequest;
using ipmiseltest::StorageRequest;
using tqrhost::Response;

constexpr std::uint8_t kSel = 0x43, kSdr = 0x23, kSelInfo = 0x40, kSdrInfo = 0x20, kReserve = 0x22;

/// What one read of a record gives: the ID that it has itself and the next.
struct Link {
    std::uint16_t own, next;
    std::uint8_t completionCode = 0;
    bool silent = false;
};

/// A BMC that chains its records as it is told, by the ID asked for.
class ChainedTransport : public tqrhost::Transport {
public:
    ChainedTransport(const std::map<std::uint16_t, Link>* links, unsigned* asked)
        : links_(links), asked_(asked) {}
    std::optional<Response> Exchange(const tqrhost::RequestFrame& request) override {
        ++*asked_;
        if (request.command() != kSel && request.command() != kSdr) return Response{0x00};
        const auto data = request.data();
        if (data.size() < 5) return Response{0xC7};
        const Link& link = links_->at(static_cast<std::uint16_t>(data[2] | data[3] << 8));
        if (link.silent) return std::nullopt;
        if (link.completionCode != 0) return Response{link.completionCode};
        const auto low = [](std::uint16_t id) { return static_cast<std::uint8_t>(id); };
        const auto high = [](std::uint16_t id) { return static_cast<std::uint8_t>(id >> 8); };
        return Response{0, low(link.next), high(link.next), low(link.own), high(link.own)};
    }

private:
    const std::map<std::uint16_t, Link>* links_;
    unsigned* asked_;
};

class Guard : public ::testing::TestWithParam<std::uint8_t> {
protected:
    std::map<std::uint16_t, Link> links;
    unsigned asked = 0;
    tqrhost::LoopGuard guard{std::make_unique<ChainedTransport>(&links, &asked)};

    std::optional<Response> Read(std::uint16_t id, std::uint8_t offset = 0) {
        return guard.Exchange(ReadRequest(GetParam(), id, offset));
    }
    void Send(std::uint8_t command) { guard.Exchange(StorageRequest(command)); }
    /// Reads along the chain; the number of records that were given.
    unsigned Walk(std::uint16_t id = 0) {
        for (unsigned given = 0; given < 10; ++given) {
            const auto answer = Read(id);
            if (!answer || answer->front() != 0) return given;
            id = static_cast<std::uint16_t>((*answer)[1] | (*answer)[2] << 8);
            if (id == 0xFFFF) return given + 1;
        }
        return 10;
    }
};

INSTANTIATE_TEST_SUITE_P(Commands, Guard, ::testing::Values(kSel, kSdr));

TEST_P(Guard, ACircleIsCutAtTheFirstRecordGivenTwice) {
    const struct {
        const char* what;
        std::map<std::uint16_t, Link> links;
        unsigned given;
    } cases[] = {
        {"back to the middle", {{0, {1, 2}}, {2, {2, 3}}, {3, {3, 2}}}, 3},
        {"back to the first by its own ID", {{0, {1, 2}}, {2, {2, 1}}, {1, {1, 2}}}, 2},
        {"back to the first by 0x0000", {{0, {1, 2}}, {2, {2, 0}}}, 2},
        {"on the spot", {{0, {1, 2}}, {2, {2, 2}}}, 2},
    };
    for (const auto& c : cases) {
        links = c.links;
        EXPECT_EQ(Walk(), c.given) << c.what;
        // A refused read ends the walk, so that the next one gets as far.
        EXPECT_EQ(Walk(), c.given) << c.what;
    }
}

TEST_P(Guard, AWholeWalkCanBeMadeAgain) {
    links = {{0, {1, 2}}, {2, {2, 3}}, {3, {3, 0xFFFF}}};
    EXPECT_EQ(Walk(), 3u);
    EXPECT_EQ(Walk(), 3u);
    EXPECT_EQ(asked, 6u);
}

TEST_P(Guard, AFailedReadEndsTheWalk) {
    for (const Link failure : {Link{0, 0, 0xCB}, Link{0, 0, 0, true}}) {
        links = {{0, {1, 2}}, {2, failure}};
        EXPECT_EQ(Walk(), 1u);
        EXPECT_EQ(Walk(), 1u);
    }
}

TEST_P(Guard, TheCommandThatBeginsAWalkForgetsTheLast) {
    links = {{0, {1, 2}}, {2, {2, 3}}};
    const bool isSel = GetParam() == kSel;
    EXPECT_TRUE(Read(0) && Read(2));
    Send(isSel ? kReserve : kSelInfo);  // the other walk's
    EXPECT_FALSE(Read(2));
    EXPECT_TRUE(Read(0) && Read(2));
    Send(isSel ? kSelInfo : kReserve);
    EXPECT_TRUE(Read(0) && Read(2));
    if (!isSel) {
        Send(kSdrInfo);
        EXPECT_TRUE(Read(0) && Read(2));
    }
}

TEST_P(Guard, PartsOfOneRecordAreReadsOfTheirOwn) {
    links = {{0, {1, 0xFFFF}}};
    EXPECT_TRUE(Read(0) && Read(0, 20) && Read(0, 47));
    EXPECT_FALSE(Read(0, 20));
}

TEST_P(Guard, WhatIsNoReadOfARecordGoesThrough) {
    links = {{0, {1, 2}}};
    for (int i = 0; i < 3; ++i) {
        EXPECT_TRUE(guard.Exchange(StorageRequest(0x11, {0, 0, 0, 16})));
        EXPECT_EQ(guard.Exchange(StorageRequest(GetParam(), {0, 0, 0})), Response{0xC7});
    }
}

// A walk over the event log ends at any next record ID of 0xFFxx; the locator walk goes on.
TEST(LoopGuard, OnlyTheEventLogEndsAtAnyHighByteFf) {
    const std::map<std::uint16_t, Link> links{{0, {1, 0xFF10}}, {0xFF10, {0xFF10, 0}}};
    unsigned asked = 0;
    tqrhost::LoopGuard guard(std::make_unique<ChainedTransport>(&links, &asked));
    EXPECT_TRUE(guard.Exchange(ReadRequest(kSel, 0)));
    EXPECT_TRUE(guard.Exchange(ReadRequest(kSel, 0)));
    EXPECT_TRUE(guard.Exchange(ReadRequest(kSdr, 0)));
    EXPECT_TRUE(guard.Exchange(ReadRequest(kSdr, 0xFF10)));
    EXPECT_FALSE(guard.Exchange(ReadRequest(kSdr, 0)));
}

}  // namespace
