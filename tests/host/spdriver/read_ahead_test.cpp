#include "host/spdriver/read_ahead.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "host/spdriver/send_window.h"
#include "tests/support/wire.h"

namespace {

using ipmiseltest::High;
using ipmiseltest::Low;
using ::testing::IsEmpty;
using namespace tqrhost;

Ask SelAsk(std::uint16_t record) {
    return {0x0A, 0, 0x43, {0, 0, Low(record), High(record), 0, 0xFF}};
}

Ask SdrAsk(std::uint16_t record, std::uint8_t offset, std::uint8_t count,
           std::uint8_t reservation = 7) {
    return {0x0A, 0, 0x23, {reservation, 0, Low(record), High(record), offset, count}};
}

Response Next(std::uint16_t record, std::vector<std::uint8_t> rest = {}) {
    rest.insert(rest.begin(), {0, Low(record), High(record)});
    return rest;
}

/// The header of a record: ID, version, type, length, and so on to its sixth byte.
Response Header(std::uint16_t record, std::uint16_t next, std::uint8_t type) {
    return Next(next, {static_cast<std::uint8_t>(record), 0, 0x51, type, 40, 0x20, 3});
}

TEST(ReadAhead, TakesTheNextEventFromTheAnswersAndBeyondThemByTheStride) {
    ReadAhead ahead;
    ahead.Asked({0x0A, 0, 0x40, {}});
    EXPECT_EQ(ahead.Next(2), std::vector<Ask>{SelAsk(0)});
    ahead.Answered(SelAsk(0), Next(5));
    ahead.Asked(SelAsk(0));
    EXPECT_EQ(ahead.Next(1), std::vector<Ask>{SelAsk(5)});
    ahead.Asked(SelAsk(0));
    EXPECT_EQ(ahead.Next(2), (std::vector<Ask>{SelAsk(1), SelAsk(2)}));
    ahead.Answered(SelAsk(0), Next(0x10));
    ahead.Asked(SelAsk(0x10));
    ahead.Answered(SelAsk(0x10), Next(0x18));
    EXPECT_EQ(ahead.Next(3), (std::vector<Ask>{SelAsk(0x18), SelAsk(0x20), SelAsk(0x28)}));
    // The answer to a guess sets the chain right.
    ahead.Answered(SelAsk(0x18), Next(0x19));
    EXPECT_EQ(ahead.Next(3), (std::vector<Ask>{SelAsk(0x18), SelAsk(0x19), SelAsk(0x1A)}));
    ahead.Answered(SelAsk(0x19), Next(0xFFFF));
    EXPECT_EQ(ahead.Next(3), (std::vector<Ask>{SelAsk(0x18), SelAsk(0x19)}));
}

TEST(ReadAhead, FollowsTheSensorWalkThroughTheParts) {
    ReadAhead ahead;
    ahead.Asked(SdrAsk(0, 0, 10));
    EXPECT_EQ(ahead.Next(2), (std::vector<Ask>{SdrAsk(1, 0, 10), SdrAsk(2, 0, 10)}));
    ahead.Answered(SdrAsk(0, 0, 10), Header(1, 2, 0x01));
    EXPECT_EQ(ahead.Next(3),
              (std::vector<Ask>{SdrAsk(0, 20, 10), SdrAsk(0, 47, 0xFF), SdrAsk(2, 0, 10)}));
    ahead.Answered(SdrAsk(2, 0, 10), Header(2, 3, 0x02));
    ahead.Answered(SdrAsk(3, 0, 10), Header(3, 0xFFFF, 0x12));
    ahead.Asked(SdrAsk(0, 20, 10));
    EXPECT_EQ(ahead.Next(9),
              (std::vector<Ask>{SdrAsk(0, 47, 0xFF), SdrAsk(2, 0, 10), SdrAsk(2, 20, 10),
                                SdrAsk(2, 31, 0xFF), SdrAsk(3, 0, 10)}));
    // Another reservation is another request.
    ahead.Asked(SdrAsk(2, 0, 10, 8));
    EXPECT_EQ(ahead.Next(1), (std::vector<Ask>{SdrAsk(2, 20, 10, 8)}));
}

TEST(ReadAhead, FollowsTheLocatorWalkAndTheInventory) {
    ReadAhead ahead;
    ahead.Asked(SdrAsk(0, 0, 15));
    ahead.Answered(SdrAsk(0, 0, 15), Header(1, 2, 0x11));
    EXPECT_EQ(ahead.Next(2), (std::vector<Ask>{SdrAsk(0, 15, 0xFF), SdrAsk(2, 0, 15)}));
    const Ask chunk{0x0A, 0, 0x11, {3, 0xE0, 0, 16}};
    ahead.Asked(chunk);
    EXPECT_EQ(ahead.Next(4), (std::vector<Ask>{{0x0A, 0, 0x11, {3, 0xF0, 0, 16}}}));
}

TEST(ReadAhead, GuessesNothingButTheReadsOfTheThreeWalks) {
    for (const Ask& ask : {Ask{0x0A, 0, 0x41, {}}, Ask{0x0A, 0, 0x22, {}}, Ask{0x0A, 0, 0x43, {1}},
                           Ask{0x06, 0, 0x43, {0, 0, 0, 0, 0, 0xFF}},
                           Ask{0x0A, 0, 0x11, {3, 0, 0, 8}}, SdrAsk(1, 3, 4)}) {
        ReadAhead ahead;
        ahead.Asked(ask);
        EXPECT_THAT(ahead.Next(8), IsEmpty());
    }
}

TEST(SendWindow, GrowsWhenCleanAndStaysAtOneAfterThreeCollapses) {
    SendWindow window(std::nullopt);
    EXPECT_EQ(window.Size(), 2u);
    for (int i = 0; i < 100; ++i) window.Answered();
    EXPECT_EQ(window.Size(), 8u);
    std::uint64_t sent = 10;
    window.Lost(sent, sent + 5);
    EXPECT_EQ(window.Size(), 4u);
    window.Lost(sent + 3, sent + 5);  // was out when the window was halved: the same loss
    EXPECT_EQ(window.Size(), 4u);
    for (int collapse = 0; collapse < 3; ++collapse) {
        while (window.Size() > 1) {
            sent += 10;
            window.Lost(sent, sent);
        }
        for (int i = 0; i < 100 && collapse < 2; ++i) window.Answered();
    }
    for (int i = 0; i < 100; ++i) window.Answered();
    EXPECT_EQ(window.Size(), 1u);
}

TEST(SendWindow, KeepsAGivenSize) {
    SendWindow window(15);
    window.Lost(1, 1);
    EXPECT_EQ(window.Size(), 15u);
    EXPECT_EQ(SendWindow(99).Size(), 15u);
}

TEST(RoundTrip, RetriesAfterTheMeasuredTimeAndItsSpread) {
    using std::chrono::milliseconds;
    RoundTrip trip;
    EXPECT_EQ(trip.RetryTime(), milliseconds(1000));
    trip.Measured(milliseconds(300));
    EXPECT_EQ(trip.RetryTime(), milliseconds(900));  // 300 + 4 * 150
    trip.Measured(milliseconds(300));
    EXPECT_EQ(trip.RetryTime(), milliseconds(750));  // 300 + 4 * 112.5
    for (int i = 0; i < 100; ++i) trip.Measured(milliseconds(1));
    EXPECT_EQ(trip.RetryTime(), milliseconds(200));
}

}  // namespace
