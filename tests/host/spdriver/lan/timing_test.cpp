#include <gmock/gmock.h>

#include "host/spdriver/lan/command_timing.h"
#include "host/spdriver/lan/received_numbers.h"
#include "host/spdriver/lan/send_window.h"

namespace {

using namespace tqrhost;
using std::chrono::milliseconds;

void Answer(SendWindow* window, int count, Delay delay = Delay::kUsual) {
    for (int i = 0; i < count; ++i) window->Answered(delay, 1000, 1000);
}

TEST(SendWindow, GrowsByOneWithEveryAnswerAndPastFifteenOnlyAfterALongCleanStretch) {
    SendWindow window(std::nullopt);
    EXPECT_EQ(window.Size(), 2u);
    Answer(&window, 13);
    EXPECT_EQ(window.Size(), 15u);
    Answer(&window, 46);  // the sixtieth may be the first of a window that is answered whole
    EXPECT_EQ(window.Size(), 15u);
    Answer(&window, 15);
    EXPECT_EQ(window.Size(), 16u);
    Answer(&window, 2000);
    EXPECT_EQ(window.Size(), 32u);
}

TEST(SendWindow, ALossTakesAThirdOnceARoundTripAndGrowthIsSlowerThen) {
    SendWindow window(std::nullopt);
    Answer(&window, 13);
    window.Lost(10, 15);
    EXPECT_EQ(window.Size(), 10u);
    window.Lost(15, 20);  // was out when the first was lost
    EXPECT_EQ(window.Size(), 10u);
    Answer(&window, 9);
    EXPECT_EQ(window.Size(), 10u);
    Answer(&window, 1);
    EXPECT_EQ(window.Size(), 11u);
    window.Lost(16, 20);
    EXPECT_EQ(window.Size(), 7u);
}

TEST(SendWindow, AtOneItStaysForAStretchThatDoublesUntilFourForgivesIt) {
    SendWindow window(std::nullopt);
    std::uint64_t sent = 0;
    const auto stretch = [&] {  // answers until it grows, after it has fallen to 1
        while (window.Size() > 1) {
            window.Lost(sent + 1, sent + 1);
            ++sent;
        }
        int answers = 0;
        for (; window.Size() == 1; ++answers) Answer(&window, 1);
        return answers;
    };
    EXPECT_EQ(stretch(), 8);
    EXPECT_EQ(stretch(), 16);
    EXPECT_EQ(stretch(), 32);
    Answer(&window, 20);
    EXPECT_GE(window.Size(), 4u);
    EXPECT_EQ(stretch(), 8);
}

TEST(SendWindow, WhenNothingIsAnsweredItBeginsAnewAndIsBackAtHalfQuickly) {
    SendWindow window(std::nullopt);
    Answer(&window, 13);
    window.Stalled(15);
    EXPECT_EQ(window.Size(), 1u);
    Answer(&window, 6);
    EXPECT_EQ(window.Size(), 7u);
    Answer(&window, 6);
    EXPECT_EQ(window.Size(), 7u);
}

TEST(SendWindow, AnswersThatQueueHoldItAndLongWaitsHalveIt) {
    SendWindow window(std::nullopt);
    Answer(&window, 6);
    Answer(&window, 50, Delay::kQueued);
    EXPECT_EQ(window.Size(), 8u);
    window.Answered(Delay::kCongested, 5, 10);
    EXPECT_EQ(window.Size(), 4u);
    window.Answered(Delay::kCongested, 9, 12);  // sent before that
    EXPECT_EQ(window.Size(), 4u);
}

TEST(SendWindow, KeepsAGivenSize) {
    SendWindow window(20);
    window.Lost(1, 1);
    window.Stalled(1);
    EXPECT_EQ(window.Size(), 20u);
    EXPECT_EQ(SendWindow(99).Size(), 32u);
}

TEST(ReceivedNumbers, EachCountsOnceAndZeroNever) {
    ReceivedNumbers numbers;
    EXPECT_FALSE(numbers.IsNew(0));
    EXPECT_TRUE(numbers.IsNew(0xFFFFFFF0));  // wherever a BMC begins
    EXPECT_FALSE(numbers.IsNew(0xFFFFFFF0));
    EXPECT_TRUE(numbers.IsNew(0xFFFFFFFF));
    EXPECT_TRUE(numbers.IsNew(1));  // wrapped
    EXPECT_TRUE(numbers.IsNew(0xFFFFFFFE));
    EXPECT_FALSE(numbers.IsNew(0xFFFFFFFE));
    EXPECT_TRUE(numbers.IsNew(100));
    EXPECT_TRUE(numbers.IsNew(69));
    EXPECT_FALSE(numbers.IsNew(68));  // too long ago to be told from a replay
}

TEST(CommandTiming, RetriesAfterTheMeasuredTimeAndItsSpread) {
    CommandTiming timing(std::nullopt);
    EXPECT_EQ(timing.RetryTime(), milliseconds(1000));
    timing.Measured(milliseconds(300), true);
    EXPECT_EQ(timing.RetryTime(), milliseconds(900));  // 300 + 4 * 150, RFC 6298, 2.2
    timing.Measured(milliseconds(300), true);
    EXPECT_EQ(timing.RetryTime(), milliseconds(750));  // 300 + 4 * 112.5, 2.3
    for (int i = 0; i < 100; ++i) timing.Measured(milliseconds(1), true);
    EXPECT_EQ(timing.RetryTime(), milliseconds(30));
}

TEST(CommandTiming, TheOpeningGivesTheFirstTimeWithinBounds) {
    const struct { int roundTrip, time; } cases[] = {{1, 250}, {100, 300}, {2000, 1000}};
    for (const auto& c : cases) {
        EXPECT_EQ(CommandTiming(milliseconds(c.roundTrip)).RetryTime(), milliseconds(c.time));
    }
}

TEST(CommandTiming, BacksOffOnceARoundTripAndKeepsThatUntilAMeasurement) {
    CommandTiming timing(std::nullopt);
    timing.Measured(milliseconds(100), true);
    timing.BackOff(5, 8);
    EXPECT_EQ(timing.RetryTime(), milliseconds(600));
    timing.BackOff(8, 9);  // was out then
    EXPECT_EQ(timing.RetryTime(), milliseconds(600));
    timing.BackOff(9, 9);
    EXPECT_EQ(timing.RetryTime(), milliseconds(1200));
    EXPECT_EQ(timing.Expected(), milliseconds(300));
    for (std::uint64_t i = 10; i < 30; ++i) timing.BackOff(i, i);
    EXPECT_EQ(timing.RetryTime(), milliseconds(10000));
    timing.Measured(milliseconds(100), true);
    EXPECT_EQ(timing.RetryTime(), milliseconds(250));
}

TEST(CommandTiming, TellsAQueueFromALineThatIsSlow) {
    CommandTiming timing(std::nullopt);
    EXPECT_EQ(timing.Measured(milliseconds(100), true), Delay::kUsual);
    EXPECT_EQ(timing.Measured(milliseconds(250), false), Delay::kUsual);
    EXPECT_EQ(timing.Measured(milliseconds(251), false), Delay::kQueued);
    EXPECT_EQ(timing.Measured(milliseconds(401), false), Delay::kCongested);
    EXPECT_EQ(timing.Measured(milliseconds(400), true), Delay::kUsual);  // alone: so long it takes
    EXPECT_EQ(timing.Measured(milliseconds(800), false), Delay::kUsual);
}

}  // namespace
