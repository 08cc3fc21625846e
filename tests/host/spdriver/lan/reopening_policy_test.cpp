#include "host/spdriver/lan/reopening_policy.h"

#include <gtest/gtest.h>

namespace {

using namespace tqrhost;
using std::chrono::milliseconds;
using std::chrono::seconds;

constexpr Clock::time_point kHeard{seconds(1000)};
constexpr Clock::time_point kSince{seconds(1001)};

TEST(ReopeningPolicy, AsksOfASilentBmcMoreTheLessSpeaksAgainstIt) {
    using Notes = void (*)(ReopeningPolicy*);
    const Notes nothing = [](ReopeningPolicy*) {};
    const Notes idle = [](ReopeningPolicy* policy) { policy->NoteIdle(milliseconds(30001)); };
    const Notes busy = [](ReopeningPolicy* policy) { policy->NoteIdle(seconds(30)); };
    const Notes refused = [](ReopeningPolicy* policy) { policy->NoteRefusal(); };
    const Notes answered = [](ReopeningPolicy* policy) {
        policy->NoteIdle(seconds(60));
        policy->NoteRefusal();
        policy->NoteAnswer();
    };
    const struct {
        const char* what;
        Notes notes;
        unsigned tries;
        milliseconds expected;  // time of an answer
        milliseconds timeout;
        std::optional<milliseconds> after;
    } cases[] = {
        {"two tries", nothing, 2, milliseconds(100), seconds(20), {}},
        {"three tries", nothing, 3, milliseconds(100), seconds(20), milliseconds(1500)},
        {"a short timeout", nothing, 3, milliseconds(100), seconds(3), milliseconds(1000)},
        {"a slow BMC", nothing, 3, milliseconds(900), seconds(20), milliseconds(1800)},
        {"not idle long enough", busy, 2, milliseconds(100), seconds(20), {}},
        {"idle, one try", idle, 1, milliseconds(100), seconds(20), {}},
        {"idle, two tries", idle, 2, milliseconds(100), seconds(20), milliseconds(200)},
        {"refused", refused, 1, milliseconds(100), seconds(20), milliseconds(250)},
        {"idle and refused, answered", answered, 2, milliseconds(100), seconds(20), {}},
    };
    for (const auto& c : cases) {
        ReopeningPolicy policy(c.timeout);
        c.notes(&policy);
        const auto at = policy.At({kSince, c.tries, c.expected}, kHeard);
        EXPECT_EQ(at.has_value(), c.after.has_value()) << c.what;
        if (at && c.after) {
            EXPECT_EQ(*at, kSince + *c.after) << c.what;
        }
    }
}

TEST(ReopeningPolicy, OneTryUntilTheNewSessionHasAnsweredUnlessAnotherIsWorthIt) {
    ReopeningPolicy policy(seconds(20));
    policy.NoteRefusal();
    const SessionRequests::Silence silence{kSince, 5, milliseconds(100)};
    policy.NoteReopening(kSince, true);
    EXPECT_EQ(policy.At(silence, kHeard), kSince + milliseconds(500));
    policy.NoteReopening(kSince, false);
    EXPECT_EQ(policy.At(silence, kSince), std::nullopt);
    EXPECT_EQ(policy.At(silence, kSince + milliseconds(1)), kSince + milliseconds(1500))
        << "the refusal was of the old one";
}

}  // namespace
