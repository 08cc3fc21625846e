// One session at a time over a loopback port, against BMCs that go away and come back.

#include <gmock/gmock.h>
#include <poll.h>

#include <chrono>
#include <condition_variable>
#include <mutex>
#include <thread>

#include "host/spdriver/lan/lan_place.h"
#include "host/spdriver/lan/lan_session.h"
#include "host/spdriver/lan/name_lookup.h"
#include "host/spdriver/pipeline.h"
#include "host/spdriver/source.h"
#include "host/spdriver/stop.h"
#include "simulator/network_bmc.h"

namespace {

using namespace tqrhost;
using ipmisim::NetworkBmc;
using std::chrono::milliseconds;
using std::chrono::seconds;
using ::testing::HasSubstr;

class Session : public ::testing::Test {
protected:
    SourceOptions options;
    ipmisim::BmcDescription bmc;

    Session() {
        options.user = "root";
        options.password = [] { return std::string("secret"); };
        options.timeoutSeconds = 5;
        bmc.deviceId = ipmisim::Bytes{0x20, 1, 2, 0x15, 2, 0xBF, 0x57, 1, 0, 0, 1};
    }
    void TearDown() override { ClearStop(); }

    std::unique_ptr<LanSession> Open(const NetworkBmc& peer) {
        const Access access = ParseAccess(options);
        const LanPlace place = ParseLanPlace(peer.Place().substr(4));
        auto session = std::make_unique<LanSession>(
            peer.Place(), LanSessionOptions{{.user = access.user,
                                             .password = access.password(),
                                             .kg = {},
                                             .privilege = access.privilege,
                                             .deviations = access.deviations},
                                            access.cipherSuites,
                                            access.window,
                                            access.timeout});
        const auto found = NameLookup(place.host, place.port).Wait(Clock::now());
        session->Open(found->endpoints, Clock::now(), Clock::now() + access.timeout);
        LanSession* const opening[] = {session.get()};
        OpenTogether(opening);
        EXPECT_EQ(session->error(), std::nullopt);
        return session;
    }
    static bool Answers(LanSession* session) {
        return ExchangeOver(*session, ipmi::GetDeviceId()).has_value();
    }
    static double SecondsOf(const std::function<void()>& what) {
        const auto began = Clock::now();
        what();
        return std::chrono::duration<double>(Clock::now() - began).count();
    }
};

TEST_F(Session, ABmcThatRestartsAndRefusesForAWhileIsReachedAgain) {
    auto peer = std::make_unique<NetworkBmc>(bmc, NetworkBmc::Character{});
    const std::string place = peer->Place();
    const auto port = static_cast<std::uint16_t>(std::stoi(place.substr(place.rfind(':') + 1)));
    const auto session = Open(*peer);
    EXPECT_TRUE(Answers(session.get()));
    peer.reset();
    std::thread restart([&] {
        std::this_thread::sleep_for(milliseconds(3000));
        peer = std::make_unique<NetworkBmc>(bmc, NetworkBmc::Character{}, port);
    });
    const double took = SecondsOf([&] { EXPECT_TRUE(Answers(session.get())); });
    restart.join();
    EXPECT_LT(took, 5);
    EXPECT_TRUE(Answers(session.get()));
}

TEST_F(Session, OneThatTheBmcDroppedIsOpenedAnew) {
    NetworkBmc peer(bmc, {});
    const auto session = Open(peer);
    peer.bmc().Expire();
    EXPECT_LT(SecondsOf([&] { EXPECT_TRUE(Answers(session.get())); }), 4);
}

TEST_F(Session, OneThatWasDroppedWhileIdleIsOpenedAnewAfterTheFirstSilence) {
    NetworkBmc peer(bmc, {});
    const auto session = Open(peer);
    peer.bmc().Expire();
    const auto later = seconds(40);
    bool answered = false;
    session->Submit(ipmi::GetDeviceId(), [&](const auto& response) { answered = !!response; });
    const double took = SecondsOf([&] {
        while (session->Pending() > 0) {
            session->Advance(Clock::now() + later);
            pollfd wait{session->Descriptor(), POLLIN, 0};
            poll(&wait, 1, 10);
        }
    });
    EXPECT_TRUE(answered);
    EXPECT_LT(took, 1.2);
}

TEST_F(Session, APasswordThatNoLongerHoldsIsNotTriedAgainAndAgain) {
    unsigned logIns = 0;
    bool changed = false;
    NetworkBmc peer(bmc, {.send = [&](NetworkBmc&, ipmisim::Packet answer) {
                        constexpr std::uint8_t kRakp2 = 0x13;
                        if (changed && answer[4] == 6 && answer[5] == kRakp2) {
                            ++logIns;
                            ++answer.back();
                        }
                        return std::vector<ipmisim::Packet>{answer};
                    }});
    const auto session = Open(peer);
    changed = true;
    peer.bmc().Expire();
    EXPECT_FALSE(Answers(session.get()));
    EXPECT_GE(logIns, 1u);
    EXPECT_LE(logIns, 2u);  // the packet may have been sent twice
}

TEST_F(Session, ABmcThatIsGoneCostsOneTimeoutHoweverMuchIsAskedOfIt) {
    options.timeoutSeconds = 1;
    auto peer = std::make_unique<NetworkBmc>(bmc, NetworkBmc::Character{});
    const auto session = Open(*peer);
    peer.reset();
    const double took = SecondsOf([&] {
        for (int i = 0; i < 20; ++i) EXPECT_FALSE(Answers(session.get()));
    });
    EXPECT_TRUE(session->Dead());
    EXPECT_LT(took, 2);
}

TEST_F(Session, WhateverNumbersABmcGivesItsAnswersTheyAreTakenWhenAskedFor) {
    using enum ipmisim::RmcpDeviations::Numbers;
    for (const auto numbers : {kStandStill, kZero, kStartOver}) {
        NetworkBmc peer(bmc, {.options = {.deviations = {.numbers = numbers}}});
        options.workarounds = {"sessionnumbers"};
        const auto session = Open(peer);
        for (int i = 0; i < 100; ++i) EXPECT_TRUE(Answers(session.get()));
        EXPECT_EQ(peer.bmc().SessionsOpened(), 1u);
    }
}

TEST_F(Session, TheDeadlineHoldsWhileASessionIsOpenedAndAllThatFailedAreNamed) {
    const auto silent = [](NetworkBmc&, std::vector<ipmisim::Packet>* packets) {
        packets->clear();
    };
    const NetworkBmc one(bmc, {.receive = silent}), other(bmc, {.receive = silent});
    options.timeoutSeconds = 20;
    StopAt(Clock::now() + milliseconds(500));
    std::string reason;
    const double took = SecondsOf([&] {
        try {
            OpenSources({one.Place(), other.Place()}, options);
        } catch (const SourceError& error) {
            reason = error.what();
        }
    });
    EXPECT_LT(took, 1.2);
    EXPECT_THAT(reason,
                AllOf(HasSubstr(one.Place() + ": "), HasSubstr("; " + other.Place() + ": ")));
}

TEST_F(Session, OneOfTwoThatIsSilentLeavesHalfOfTheDeadlineToTheOther) {
    const NetworkBmc good(bmc, {});
    const NetworkBmc silent(
        bmc,
        {.receive = [](NetworkBmc&, std::vector<ipmisim::Packet>* packets) { packets->clear(); }});
    options.timeoutSeconds = 20;
    const auto deadline = Clock::now() + milliseconds(1000);
    StopAt(deadline);
    const NQORTQR20::Source source = OpenSources({good.Place(), silent.Place()}, options);
    EXPECT_LT(Clock::now(), deadline);
    ASSERT_EQ(source.nodes.size(), 1u);
    ASSERT_EQ(source.unreachable.size(), 1u);
    EXPECT_THAT(source.unreachable[0].reason, HasSubstr(silent.Place() + ": no answer"));
}

TEST_F(Session, AFloodOfPacketsHoldsNoDeadlineUp) {
    NetworkBmc peer(bmc, {.send = [](NetworkBmc&, const ipmisim::Packet& answer) {
                        if (!ipmisim::RmcpBmc::IsOfSession(answer)) {
                            return std::vector<ipmisim::Packet>{answer};
                        }
                        return std::vector<ipmisim::Packet>(20000, ipmisim::Packet(60, 6));
                    }});
    options.timeoutSeconds = 20;
    StopAt(Clock::now() + milliseconds(700));
    const double took = SecondsOf([&] {
        try {
            OpenSources({peer.Place()}, options);
        } catch (const SourceError&) {
        }
    });
    EXPECT_LT(took, 1.7);
}

TEST(NameLookup, ASilentNameServerIsLeftBehind) {
    std::mutex mutex;
    std::condition_variable asked;
    bool ended = false;
    const auto silent = [&](const std::string&, const std::string&) {
        std::unique_lock lock(mutex);
        asked.wait(lock, [&] { return ended; });
        ended = false;
        asked.notify_all();
        return LookupResult{{}, OpeningError::kNameServerSilent};
    };
    const auto began = Clock::now();
    EXPECT_EQ(NameLookup("bmc.example", "623", silent).Wait(began + milliseconds(200)),
              std::nullopt);
    EXPECT_LT(Clock::now() - began, seconds(1));
    EXPECT_EQ(NameLookup("::1", "623", silent).Wait(began)->endpoints.size(), 1u);
    std::unique_lock lock(mutex);  // the thread uses what is ours
    ended = true;
    asked.notify_all();
    asked.wait(lock, [&] { return !ended; });
}

}  // namespace
