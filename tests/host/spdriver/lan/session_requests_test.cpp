#include "host/spdriver/lan/session_requests.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <functional>
#include <map>
#include <random>
#include <string>

#include "simulator/rmcp_bmc.h"

namespace {

using namespace tqrhost;
using std::chrono::milliseconds;
using std::chrono::seconds;
using ::testing::ElementsAre;
using Bytes = std::vector<std::uint8_t>;

constexpr std::size_t kRecords = 300;

/// A BMC and the line to it, with a clock of its own. Time passes only from event to event.
class Line {
public:
    struct Character {
        milliseconds roundTrip{20};
        milliseconds service{0};
        bool oneAtATime = false;
        bool slowerTogether = false;
        unsigned maxOutstanding = 1000;  ///< the rest is dropped
        unsigned sequenceWindow = 15;
        /// Whether a packet is lost, by its number; requests and answers are numbered together.
        std::function<bool(unsigned number, Clock::time_point now)> isLost{};
        std::function<milliseconds(unsigned number)> extra{};  ///< on the way back
    };

    Clock::time_point now{seconds(1000)};
    unsigned packets = 0;  ///< requests that were sent
    unsigned outside = 0;  ///< of them, outside the BMC's window

    Line(Character character, SessionRequests::Options options)
        : character_(std::move(character)),
          bmc_(Bmc(), {.sequenceWindow = character_.sequenceWindow}),
          codec_(credentials_, *rmcpplus::FindCipherSuite(17)),
          requests(std::move(options)) {
        Open();
        requests.Start(&codec_, 0, {}, character_.roundTrip, now);
    }

    /// Until nothing is pending; false when that takes longer than `most`.
    bool Run(Clock::duration most = std::chrono::hours(2)) {
        const auto end = now + most;
        while (requests.Pending() > 0) {
            Send();
            if (requests.Pending() == 0) break;
            auto next = requests.NextTimer(now);
            if (!answers_.empty()) next = std::min(next, answers_.begin()->first);
            if (next > end) return false;
            now = std::max(now, next);
            Deliver();
        }
        return true;
    }
    void Send() {
        std::vector<rmcpplus::Packet> out;
        requests.Send(now, &out);
        for (const rmcpplus::Packet& packet : out) Take(packet);
    }
    /// Hands in what has come by now.
    void Deliver() {
        while (!answers_.empty() && answers_.begin()->first <= now) {
            const Bytes packet = std::move(answers_.extract(answers_.begin()).mapped());
            if (const auto answer = codec_.ParseAnswer(packet)) requests.Handle(*answer, now);
        }
    }
    /// The BMC has been opened anew, with what is pending.
    void Restart(SessionRequests* pending) {
        std::swap(requests, *pending);
        requests.Start(&codec_, 0, {}, character_.roundTrip, now);
    }

private:
    static ipmisim::BmcDescription Bmc() {
        ipmisim::BmcDescription bmc;
        for (std::size_t i = 1; i <= kRecords; ++i) {
            std::array<std::uint8_t, 16> record{};
            record[0] = static_cast<std::uint8_t>(i & 0xFF);
            record[1] = static_cast<std::uint8_t>(i >> 8);
            bmc.selEntries.push_back(record);
        }
        return bmc;
    }
    void Open() {
        const auto ask = [this](const rmcpplus::Packet& packet) {
            return bmc_.Answer({packet.bytes().begin(), packet.bytes().end()});
        };
        codec_.ParseOpenSession(ask(codec_.OpenSessionRequest(1)), 1);
        codec_.ParseRakp2(ask(codec_.Rakp1(2)), 2);
        codec_.ParseRakp4(ask(codec_.Rakp3(3)), 3);
    }
    bool IsLost() {
        ++number_;
        return character_.isLost && character_.isLost(number_ - 1, now);
    }
    void Take(const rmcpplus::Packet& packet) {
        ++packets;
        if (IsLost()) return;
        const auto arrives = now + character_.roundTrip / 2;
        const auto served = [&](const auto& other) { return other > arrives; };
        std::erase_if(inService_, [&](const auto& other) { return !served(other); });
        if (inService_.size() >= character_.maxOutstanding) return;
        const Bytes answer = bmc_.Answer({packet.bytes().begin(), packet.bytes().end()});
        outside = bmc_.OutsideWindow();
        if (answer.empty()) return;
        auto time = character_.service;
        if (character_.slowerTogether) time *= inService_.size() + 1;
        const auto begins = character_.oneAtATime ? std::max(arrives, busyUntil_) : arrives;
        busyUntil_ = begins + time;
        inService_.push_back(busyUntil_);
        if (IsLost()) return;
        auto back = character_.roundTrip / 2;
        if (character_.extra) back += character_.extra(number_);
        answers_.emplace(busyUntil_ + back, answer);
    }

    Character character_;
    ipmisim::RmcpBmc bmc_;
    rmcpplus::Credentials credentials_{.user = "root", .password = "secret", .kg = {}};
    rmcpplus::Codec codec_;
    std::multimap<Clock::time_point, Bytes> answers_;
    std::vector<Clock::time_point> inService_;
    Clock::time_point busyUntil_{};
    unsigned number_ = 0;

public:
    SessionRequests requests;
};

/// A whole log, read in the order of its records with as many outstanding as there is room for.
struct LogRead {
    unsigned right = 0, failed = 0, packets = 0, outside = 0;
    double seconds = 0;
};
LogRead ReadLog(const Line::Character& character, std::optional<unsigned> window = {},
                seconds timeout = seconds(20)) {
    Line line(character, {.window = window, .timeout = timeout});
    LogRead read;
    const auto began = line.now;
    for (std::uint16_t id = 1; id <= kRecords; ++id) {
        line.requests.Submit(ipmi::GetSelEntry(id), [&read, id](std::optional<Response> response) {
            const bool right = response && response->size() == 19 &&
                               (*response)[3] == (id & 0xFF) && (*response)[4] == id >> 8;
            ++(right ? read.right : read.failed);
        });
    }
    EXPECT_TRUE(line.Run());
    read.packets = line.packets;
    read.outside = line.outside;
    read.seconds = std::chrono::duration<double>(line.now - began).count();
    return read;
}

std::function<bool(unsigned, Clock::time_point)> Lost(double share, unsigned seed = 1) {
    return [share, random = std::mt19937(seed)](unsigned, Clock::time_point) mutable {
        return std::uniform_real_distribution<>(0, 1)(random) < share;
    };
}

TEST(SessionRequests, ACleanLineCostsOnePacketARecordAndFewRoundTrips) {
    const LogRead read = ReadLog({});
    EXPECT_EQ(read.right, kRecords);
    EXPECT_EQ(read.packets, kRecords);
    EXPECT_LT(read.seconds, 0.020 * (5 + kRecords / 15.0));
}

/// The controller's own pace is the limit: asking more often would only make it slower.
TEST(SessionRequests, ASlowBmcIsAskedHardlyMoreThanOnceARecord) {
    for (const int service : {50, 250, 600, 1000}) {
        for (const bool oneAtATime : {false, true}) {
            const LogRead read = ReadLog({.roundTrip = milliseconds(1),
                                          .service = milliseconds(service),
                                          .oneAtATime = oneAtATime});
            EXPECT_EQ(read.right, kRecords) << service << oneAtATime;
            EXPECT_LE(read.packets, 1.1 * kRecords) << service << oneAtATime;
            EXPECT_LE(read.seconds, 1.1 * kRecords * service / 1000) << service << oneAtATime;
        }
    }
}

TEST(SessionRequests, WhateverABmcOrALineDoesItIsNotSlowerThanOneAtATime) {
    const struct {
        const char* what;
        Line::Character character;
        unsigned outside = 0;
    } cases[] = {
        {"takes 1", {.maxOutstanding = 1}},
        {"takes 1, slowly", {.service = milliseconds(5), .maxOutstanding = 1}},
        {"takes 2", {.service = milliseconds(5), .maxOutstanding = 2}},
        {"takes 4", {.service = milliseconds(5), .maxOutstanding = 4}},
        {"takes 8", {.service = milliseconds(5), .maxOutstanding = 8}},
        {"slower together",
         {.service = milliseconds(200), .oneAtATime = true, .slowerTogether = true}},
        {"window of 8", {.sequenceWindow = 8, .isLost = Lost(0.02)}, 50},
        {"window of 16", {.sequenceWindow = 16, .isLost = Lost(0.02)}},
        {"2 % lost", {.isLost = Lost(0.02)}},
        {"20 % lost", {.isLost = Lost(0.2)}, 50},
        {"disorder",
         {.extra = [random = std::mt19937(1)](
                       unsigned) mutable { return milliseconds(random() % 32); }}},
        {"round trips that jump",
         {.roundTrip = milliseconds(2),
          .extra = [](unsigned number) { return milliseconds(number / 100 % 2 == 0 ? 0 : 198); }}},
    };
    for (const auto& c : cases) {
        constexpr seconds kLong(6000);  // that nothing fails is the question here
        const LogRead adaptive = ReadLog(c.character, {}, kLong);
        const LogRead one = ReadLog(c.character, 1, kLong);
        EXPECT_EQ(adaptive.right, kRecords) << c.what;
        EXPECT_EQ(one.right, kRecords) << c.what;
        EXPECT_LE(adaptive.seconds, 1.1 * one.seconds) << c.what;
        EXPECT_LE(adaptive.outside, c.outside) << c.what;
        const LogRead wide = ReadLog(c.character, 15, kLong);
        EXPECT_EQ(wide.right, kRecords) << c.what;
    }
}

TEST(SessionRequests, BurstsOfFiftyLostPacketsCostNoRecord) {
    const LogRead read =
        ReadLog({.isLost = [](unsigned number, Clock::time_point) { return number % 400 >= 350; }});
    EXPECT_EQ(read.right, kRecords);
    EXPECT_LE(read.outside, 20u);
}

TEST(SessionRequests, OnlyTheOldestAreTriedAgainWhileNothingIsAnswered) {
    bool gone = false;
    Line line({.isLost = [&gone](unsigned, Clock::time_point) { return gone; }}, {});
    std::vector<int> answered;
    const auto submit = [&](int count) {
        for (int i = 0; i < count; ++i) {
            line.requests.Submit(
                ipmi::GetSelEntry(static_cast<std::uint16_t>(i + 1)),
                [&answered, i](const auto& response) { answered.push_back(response ? i : -1); });
        }
    };
    submit(40);
    ASSERT_TRUE(line.Run());
    gone = true;
    submit(10);
    const unsigned before = line.packets;
    EXPECT_FALSE(line.Run(seconds(3)));
    EXPECT_GE(line.packets, before + 10 + 4);
    EXPECT_LE(line.packets, before + 10 + 40);
    const auto silence = line.requests.SilentSince();
    ASSERT_TRUE(silence);
    EXPECT_GE(line.now - silence->since, milliseconds(1500));
    EXPECT_GE(silence->tries, 4u);
    gone = false;
    answered.clear();
    EXPECT_TRUE(line.Run(seconds(3)));
    EXPECT_THAT(answered, ElementsAre(0, 1, 2, 3, 4, 5, 6, 7, 8, 9));
}

TEST(SessionRequests, WhatGetsNoAnswerFailsAfterTheTimeoutAndNothingElseWaitsForIt) {
    const auto began = Clock::time_point(seconds(1000));
    Line line({.isLost = [](unsigned, Clock::time_point) { return true; }},
              {.timeout = seconds(5)});
    int empty = 0;
    for (int i = 0; i < 3; ++i) {
        line.requests.Submit(ipmi::GetSelTime(), [&](const auto& response) { empty += !response; });
    }
    EXPECT_TRUE(line.Run());
    EXPECT_EQ(empty, 3);
    EXPECT_GE(line.now - began, seconds(5));
    EXPECT_LE(line.now - began, seconds(11));  // the third had its first try after the others
    EXPECT_TRUE(line.requests.HeardNothing());
}

TEST(SessionRequests, ANewSessionTakesTheOutstandingWithIt) {
    bool gone = true;
    Line::Character character{.isLost = [&gone](unsigned, Clock::time_point) { return gone; }};
    Line line(character, {});
    int right = 0;
    for (int i = 0; i < 5; ++i) {
        line.requests.Submit(ipmi::GetSelInfo(),
                             [&](const auto& response) { right += !!response; });
    }
    EXPECT_FALSE(line.Run(seconds(1)));
    Line fresh(character, {});
    gone = false;
    fresh.Restart(&line.requests);
    EXPECT_TRUE(fresh.Run());
    EXPECT_EQ(right, 5);
}

}  // namespace
