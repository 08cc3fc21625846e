#include "host/spdriver/lan/session_opening.h"

#include <gmock/gmock.h>

#include <deque>
#include <functional>

#include "simulator/rmcp_bmc.h"

namespace {

using namespace tqrhost;
using ipmisim::RmcpBmc;
using std::chrono::milliseconds;
using std::chrono::seconds;
using Bytes = std::vector<std::uint8_t>;
using State = SessionOpening::State;

/// An opening and a BMC 10 ms away, with a clock of their own.
struct Opening {
    rmcpplus::Credentials credentials{.user = "root", .password = "secret", .kg = {}};
    RmcpBmc::Options bmc{};
    SessionOpening::Options options{.cipherSuites = {17, 3}};
    std::function<bool(unsigned number)> isLost{};  ///< both ways together
    std::function<void(Bytes* answer)> change{};
    bool refuses = false;
    unsigned sent = 0;
    Clock::time_point now{seconds(1000)};
    SessionOpening::Session session{};

    /// What came of it: empty when it is open.
    std::optional<OpeningError> Run() {
        RmcpBmc controller({}, bmc);
        options.deadline = now + seconds(20);
        SessionOpening opening(credentials, options);
        opening.Start(now);
        unsigned number = 0;
        std::deque<std::pair<Clock::time_point, Bytes>> answers;
        while (opening.state() == State::kOpening) {
            std::vector<rmcpplus::Packet> packets;
            opening.TakePackets(&packets);
            for (const auto& packet : packets) {
                ++sent;
                if (refuses) opening.HandleRefusal(now);
                if (refuses || (isLost && isLost(number++))) continue;
                Bytes answer = controller.Answer({packet.bytes().begin(), packet.bytes().end()});
                if (change) change(&answer);
                if (!isLost || !isLost(number++))
                    answers.emplace_back(now + milliseconds(10), answer);
            }
            const auto timer = opening.NextTimer();
            if (!answers.empty() && answers.front().first < timer) {
                now = answers.front().first;
                opening.Handle(answers.front().second, now);
                answers.pop_front();
            } else {
                now = timer;
                opening.HandleTimer(now);
            }
        }
        if (opening.state() == State::kFailed) return opening.error();
        session = opening.TakeSession();
        return std::nullopt;
    }
};

TEST(SessionOpening, TakesFourRoundTripsAndKnowsTheTime) {
    Opening opening;
    const auto began = opening.now;
    EXPECT_EQ(opening.Run(), std::nullopt);
    EXPECT_EQ(opening.now - began, milliseconds(40));
    EXPECT_EQ(opening.session.roundTrip, milliseconds(10));
    EXPECT_EQ(opening.session.sequence, 1u);
    EXPECT_EQ(opening.sent, 5u);
}

TEST(SessionOpening, TriesTheSuitesThatAreAllowedInTheirOrderAndNoOther) {
    const struct {
        int bmc;
        std::vector<int> allowed;
        std::optional<OpeningError> error;
    } cases[] = {{17, {17, 3}, {}},
                 {3, {17, 3}, {}},
                 {3, {17}, OpeningError::kNoCipherSuite},
                 {2, {17, 3}, OpeningError::kNoCipherSuite},
                 {2, {2}, {}},
                 {17, {3}, OpeningError::kNoCipherSuite}};
    for (const auto& c : cases) {
        Opening opening;
        opening.bmc.cipherSuite = c.bmc;
        opening.options.cipherSuites = c.allowed;
        EXPECT_EQ(opening.Run(), c.error) << c.bmc;
    }
}

// Each other reason is provoked with its line of the manual.
TEST(SessionOpening, AStatusThatIsNoOtherReasonIsARefusal) {
    Opening opening;
    opening.change = [](Bytes* answer) {  // the status code of RAKP 2
        if (answer->size() > 17 && (*answer)[5] == 0x13) (*answer)[17] = 0x02;
    };
    EXPECT_EQ(opening.Run(), OpeningError::kRefused);
}

TEST(SessionOpening, DeniedIpmi20IsPassedOverWhenAskedTo) {
    Opening opening;
    opening.bmc.deviations.noIpmi20 = true;
    opening.credentials.deviations.capabilities = true;
    EXPECT_EQ(opening.Run(), std::nullopt);
}

TEST(SessionOpening, EveryLossIsMadeGood) {
    // Each packet alone, and pairs of them.
    for (unsigned first = 0; first < 10; ++first) {
        for (unsigned second = first; second < 10; ++second) {
            Opening opening;
            opening.isLost = [&](unsigned number) { return number == first || number == second; };
            const auto began = opening.now;
            EXPECT_EQ(opening.Run(), std::nullopt) << first << " " << second;
            EXPECT_LT(opening.now - began, seconds(4)) << first << " " << second;
        }
    }
}

TEST(SessionOpening, AClosedPortIsToldAtOnceAndWaitedForWhenASessionWasOpenBefore) {
    Opening first;
    first.refuses = true;
    auto began = first.now;
    EXPECT_EQ(first.Run(), OpeningError::kPortClosed);
    EXPECT_LT(first.now - began, seconds(1));
    Opening again;
    again.refuses = again.options.again = true;
    began = again.now;
    EXPECT_EQ(again.Run(), OpeningError::kPortClosed);
    EXPECT_EQ(again.now - began, seconds(20));
}

}  // namespace
