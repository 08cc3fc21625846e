#include <algorithm>
#include <chrono>
#include <cstdlib>
#include <filesystem>
#include <functional>
#include <memory>
#include <optional>
#include <random>
#include <regex>
#include <set>
#include <sstream>
#include <string>
#include <vector>

#include "host/spdriver/capture.h"
#include "host/spdriver/reading.h"
#include "host/spdriver/stop.h"
#include "simulator/network_bmc.h"
#include "simulator/server_file.h"
#include "tests/support/described_classes.h"
#include "tests/support/ipmi_sim.h"
#include "tests/support/machine_fixture.h"
#include "tests/support/run_program.h"

namespace {

using ipmisim::Packet;
using Packets = std::vector<Packet>;
using ipmisim::ServerDescription;
using Peer = ipmisim::NetworkBmc;
using ::testing::HasSubstr;

/// What one collection brought.
struct Collected {
    std::vector<std::string> capture;  ///< line by line
    std::vector<std::string> report;   ///< what tells its instances apart
    bool whole = true;
    unsigned outsideWindow = 0, sessions = 0;
    double seconds = 0;
};

void ExpectSame(const Collected& found, const Collected& expected, const std::string& where) {
    const auto [one, other] = std::mismatch(found.capture.begin(), found.capture.end(),
                                            expected.capture.begin(), expected.capture.end());
    EXPECT_EQ(one == found.capture.end() ? "" : *one, other == expected.capture.end() ? "" : *other)
        << where;
    EXPECT_TRUE(found.report == expected.report) << where;
}

class Network : public ipmiseltest::MachineTest {
protected:
    ServerDescription server;
    NQORTQR20::SourceOptions options;

    Network() {
        options.user = "root";
        options.password = [] { return std::string("secret"); };
        options.timeoutSeconds = 12;
    }

    void Describe(const std::string& file) {
        server = ipmisim::ReadServerFile(file);
        for (ipmisim::BmcDescription& bmc : server.bmcs) {
            // What depends on how often something is asked is another thing with guesses.
            std::erase_if(bmc.faults, [](const ipmisim::Fault& f) { return f.call.has_value(); });
            if (!bmc.faults.empty()) options.timeoutSeconds = 0.5;
        }
    }
    /// A machine of 40 events, 25 sensors and FRU devices.
    void DescribeRack() { Describe(IPMISEL_EXAMPLES "/rack-server.json"); }

    Collected CollectFrom(NQORTQR20::Source source) {
        source.facts = {server.machineType, server.integratedBmc, server.ipmiDriver,
                        server.ipmiLan,     server.localTime,     server.smbios};
        const std::string file = (folder_.path() / "capture").string();
        NQORTQR20::ReadLiveNodes(source, {});
        const auto capture = NQORTQR20::RecordTo(file, source);
        ipmisel::ResetModuleState();
        IPMISELPluginInit(context.get());
        NQORTQR20::OpenMachine(std::move(source));
        std::vector<const char*> classes = ipmiseltest::DefaultClasses();
        ipmiseltest::InstanceRecorder report;
        const NQORTQR20::OutputHandle output(report);
        IPMISELGetData(context.get(), output.get(), classes.data(),
                       static_cast<int>(classes.size()));
        Collected collected;
        for (const auto& node : NQORTQR20::GetCompleteness()) collected.whole &= node.Whole();
        NQORTQR20::CloseMachine();
        capture->Finish();
        std::istringstream lines(ipmiseltest::ReadText(file));
        for (std::string line; std::getline(lines, line);) {
            // A reservation that was asked for twice is another one.
            static const std::regex reservation(
                R"re(("01200a0022.*"response": "00|"01200a002306000000)....)re");
            collected.capture.push_back(std::regex_replace(line, reservation, "$1"));
        }
        collected.report = report.Texts("Message");
        for (auto& text : report.Texts("SerialNumber")) collected.report.push_back(text);
        return collected;
    }
    Collected CollectDirectly() {
        NQORTQR20::Source source;
        for (const ipmisim::BmcDescription& bmc : server.bmcs) {
            source.nodes.push_back(
                {"", std::make_unique<ipmiseltest::SimulatedTransport>(bmc, &requests), nullptr});
        }
        return CollectFrom(std::move(source));
    }
    /// Every node behind a peer of that character.
    Collected CollectOver(const Peer::Character& character) {
        std::vector<std::unique_ptr<Peer>> peers;
        std::vector<std::string> places;
        for (const ipmisim::BmcDescription& bmc : server.bmcs) {
            peers.push_back(std::make_unique<Peer>(bmc, character));
            places.push_back(peers.back()->Place());
        }
        const auto began = std::chrono::steady_clock::now();
        Collected collected = CollectFrom(NQORTQR20::OpenSources(places, options));
        collected.seconds =
            std::chrono::duration<double>(std::chrono::steady_clock::now() - began).count();
        for (const auto& peer : peers) {
            collected.outsideWindow += peer->bmc().OutsideWindow();
            collected.sessions += peer->bmc().SessionsOpened();
        }
        return collected;
    }
    std::string Refusal(const Peer::Character& character) {
        const Peer peer({}, character);
        try {
            NQORTQR20::OpenSources({peer.Place()}, options);
        } catch (const NQORTQR20::SourceError& error) {
            return error.what();
        }
        return "";
    }

private:
    ipmiseltest::TemporaryFolder folder_;
};

/// True so many times of a hundred, the same every time.
std::function<bool()> Chance(unsigned percent) {
    return [percent, random = std::mt19937(percent)]() mutable { return random() % 100 < percent; };
}

/// True for 0.7 seconds from the hundredth packet on.
std::function<bool(unsigned)> Outage() {
    using Clock = std::chrono::steady_clock;
    return [end = std::optional<Clock::time_point>()](unsigned number) mutable {
        if (number >= 100 && !end) end = Clock::now() + std::chrono::milliseconds(700);
        return end && Clock::now() < *end;
    };
}

Peer::Character Losing(unsigned percent) {
    Peer::Character character;
    character.receive = [lost = Chance(percent)](Peer&, Packets* packets) mutable {
        std::erase_if(*packets, [&](const Packet&) { return lost(); });
    };
    character.send = [lost = Chance(percent + 1)](Peer&, const Packet& answer) mutable {
        return Packets(lost() ? 0 : 1, answer);
    };
    return character;
}

/// A line on which something comes before, after or instead of every answer of the session.
Peer::Character Sending(
    std::function<Packets(Peer&, const Packet& answer, unsigned number)> change) {
    Peer::Character character;
    character.send = [change = std::move(change), number = 0U](
                         Peer& peer, const Packet& answer) mutable -> Packets {
        if (!ipmisim::RmcpBmc::IsOfSession(answer)) return {answer};
        return change(peer, answer, number++);
    };
    return character;
}

Peer::Character Receiving(std::function<void(Peer&, Packets*, unsigned number)> change,
                          int gatherMilliseconds = 0) {
    Peer::Character character;
    character.gatherMilliseconds = gatherMilliseconds;
    character.receive = [change = std::move(change), number = 0U](Peer& peer,
                                                                  Packets* packets) mutable {
        number += static_cast<unsigned>(packets->size());
        change(peer, packets, number);
    };
    return character;
}

Packet Changed(Packet packet, std::size_t at, std::uint8_t value) {
    packet[at < packet.size() ? at : packet.size() - 1] = value;
    return packet;
}

TEST_F(Network, ALineThatSpoilsPacketsCostsNothingOfTheReport) {
    const struct {
        const char* fault;
        Peer::Character character;
        unsigned sessions = 1;
    } cases[] = {
        {"requests lost for a while",
         Receiving([gone = Outage()](Peer&, Packets* packets, unsigned number) mutable {
             if (gone(number)) packets->clear();
         })},
        {"answers lost for a while",
         Sending([gone = Outage()](Peer&, const Packet& answer, unsigned number) mutable {
             return Packets(gone(number) ? 0 : 1, answer);
         }),
         0},
        {"reordered", Receiving(
                          [](Peer&, Packets* packets, unsigned number) {
                              std::shuffle(packets->begin(), packets->end(), std::mt19937(number));
                          },
                          2)},
        {"late", Sending([held = Packets()](Peer&, const Packet& answer, unsigned number) mutable {
             held.push_back(answer);
             return number % 10 == 6 ? Packets() : std::exchange(held, {});
         })},
        {"a bit turned over", Sending([](Peer&, const Packet& answer, unsigned number) {
             Packet spoilt = answer;
             spoilt[number * 7 % answer.size()] ^= static_cast<std::uint8_t>(1U << number % 8);
             return number % 20 == 7 ? Packets{spoilt} : Packets{spoilt, answer};
         })},
        // The request numbers of IPMI come round after 64.
        {"replayed",
         Sending([sent = Packets()](Peer&, const Packet& answer, unsigned number) mutable {
             sent.push_back(answer);
             return Packets{sent[number < 64 ? number : number - 64], answer, sent[number / 2]};
         })},
        {"foreign", Sending([](Peer& peer, const Packet& answer, unsigned number) {
             const Packet noise(number % 200, static_cast<std::uint8_t>(number));
             const Packet presence{0x06, 0, 0xFF, 0x06, 0, 0, 0x11, 0xBE, 0x40, 0, 0, 0};
             const Packet otherSession = peer.bmc().Signed(Changed(peer.bmc().Lie(), 6, 0x77));
             return Packets{noise, presence, otherSession, Changed(answer, 4, 0), answer};
         })},
        {"wrong integrity code", Sending([](Peer& peer, const Packet& answer, unsigned number) {
             const Packet lie = peer.bmc().Lie();
             const std::size_t at = lie.size() - 1 - number % peer.bmc().CodeLength();
             Packet bare = Changed(lie, 5, 0x80);  // says that it is not protected
             bare.resize(bare.size() - peer.bmc().CodeLength() - 4);
             return Packets{Changed(lie, at, static_cast<std::uint8_t>(lie[at] + 1)), bare, answer};
         })},
        {"runts of 1 to 60 bytes", Sending([](Peer& peer, const Packet& answer, unsigned number) {
             const Packet runt(answer.begin(), answer.begin() + 1 + number % 60);
             return Packets{runt, peer.bmc().Signed(runt), answer};
         })},
        {"lengths past the packet", Sending([](Peer& peer, const Packet& answer, unsigned number) {
             const auto any = static_cast<std::uint8_t>(number % 2 == 0 ? 0xFF : 40 + number);
             const Packet payload = Changed(Changed(answer, 14, any), 15, number % 3 == 0 ? 1 : 0);
             const std::size_t end = answer.size() - peer.bmc().CodeLength();
             // Garbled padding may by chance say something, hence it comes last.
             return Packets{payload,
                            peer.bmc().Signed(payload),
                            peer.bmc().Signed(Changed(answer, 14, 0)),
                            peer.bmc().Signed(Changed(answer, end - 2, any)),
                            answer,
                            peer.bmc().Signed(Changed(answer, end - 5 - number % 16, 1))};
         })},
        {"one request at a time, the others dropped",
         Receiving([](Peer&, Packets* packets, unsigned) { packets->resize(1); }, 2)},
        {"one request at a time, busy for the others",
         {.service = {.maxOutstanding = 1, .refusesWhenFull = true}, .gatherMilliseconds = 2}},
        {"session that expires",
         Receiving([expired = false](Peer& peer, Packets*, unsigned number) mutable {
             if (!expired && number > 100) peer.bmc().Expire();
             expired |= number > 100;
         }),
         2},
    };
    DescribeRack();
    const Collected expected = CollectDirectly();
    EXPECT_TRUE(expected.whole);
    int suite = 3;
    for (const auto& c : cases) {
        Peer::Character character = c.character;
        character.options.cipherSuite = suite = 20 - suite;
        const Collected found = CollectOver(character);
        ExpectSame(found, expected, c.fault);
        EXPECT_TRUE(found.whole) << c.fault;
        EXPECT_LE(found.outsideWindow, 5u) << c.fault;  // what was overtaken by more than 16
        if (c.sessions != 0) {
            EXPECT_EQ(found.sessions, c.sessions) << c.fault;
        }
        EXPECT_LT(found.seconds, 20) << c.fault;
    }
}

TEST_F(Network, ASecondNodeThatDroppedItsIdleSessionIsReadWhole) {
    using Clock = std::chrono::steady_clock;
    Describe(IPMISEL_EXAMPLES "/two-node.json");
    ASSERT_EQ(server.bmcs.size(), 2u);
    const Collected expected = CollectDirectly();
    const Peer slow(server.bmcs[0],
                    {.service = {.perRequest = std::chrono::milliseconds(20), .oneAtATime = true}});
    // Its session is gone when it has heard nothing for a while.
    Peer idle(server.bmcs[1], Receiving([last = Clock::now(), expired = false](
                                            Peer& peer, Packets*, unsigned number) mutable {
                  const auto now = Clock::now();
                  if (!expired && number > 10 && now - last > std::chrono::milliseconds(300)) {
                      peer.bmc().Expire();
                      expired = true;
                  }
                  last = now;
              }));
    const Collected found =
        CollectFrom(NQORTQR20::OpenSources({slow.Place(), idle.Place()}, options));
    ExpectSame(found, expected, "idle");
    EXPECT_TRUE(found.whole);
    EXPECT_EQ(idle.bmc().SessionsOpened(), 2u);
}

bool HasNoResponse(const std::string& captureLine) {
    return captureLine.find("\"response\": null") != std::string::npos;
}

TEST_F(Network, ABmcThatIsGoneLeavesAPartialReport) {
    const struct {
        const char* fault;
        double timeout;
        Peer::Character character;
    } cases[] = {
        {"silent in the middle", 0.3, Receiving([](Peer&, Packets* packets, unsigned number) {
             if (number > 100) packets->clear();
         })},
        {"session that expires again and again", 4,
         Receiving([last = 0U](Peer& peer, Packets*, unsigned number) mutable {
             if (number - last < 14) return;
             peer.bmc().Expire();
             last = number;
         })},
    };
    DescribeRack();
    const Collected all = CollectDirectly();
    const std::set<std::string> known(all.capture.begin(), all.capture.end());
    for (const auto& c : cases) {
        options.timeoutSeconds = c.timeout;
        NQORTQR20::StopAt(std::chrono::steady_clock::now() + std::chrono::seconds(7));
        const Collected found = CollectOver(c.character);
        NQORTQR20::ClearStop();
        EXPECT_FALSE(found.whole) << c.fault;
        EXPECT_LT(found.seconds, 10) << c.fault;
        EXPECT_GT(found.capture.size(), 20u) << c.fault;
        for (const std::string& line : found.capture) {
            EXPECT_TRUE(known.count(line) == 1 || HasNoResponse(line)) << line;
        }
    }
}

TEST_F(Network, EveryWindowSeesWhatOneRequestAtATimeSees) {
    std::vector<std::filesystem::path> folders{IPMISEL_EXAMPLES};
    // More machines than may be part of the project.
    if (const char* const more = std::getenv("IPMISEL_MACHINES")) folders.emplace_back(more);
    for (const auto& folder : folders) {
        for (const auto& file : std::filesystem::directory_iterator(folder)) {
            if (file.path().extension() != ".json") continue;
            options.timeoutSeconds = 12;
            Describe(file.path().string());
            if (server.bmcs.empty()) continue;
            const Collected expected = CollectDirectly();
            const auto expectSame = [&](const char* way, const Peer::Character& character) {
                ExpectSame(CollectOver(character), expected, file.path().string() + way);
            };
            options.window = 1;
            expectSame(", one at a time", {});
            options.window = 15;
            expectSame(", window 15", {});
            options.window.reset();
            expectSame(", adaptive", {});
            if (options.timeoutSeconds > 1) expectSame(", adaptive with loss", Losing(2));
        }
    }
}

TEST_F(Network, TheBmcsOwnKeyOpensTheSession) {
    const struct {
        std::string bmc;
        const char* given;
        const char* refusal;
    } cases[] = {{"key of the BMC", "key of the BMC", ""},
                 {"key of the BMC", "", "another key of its own (Kg)"},
                 {"key of the BMC", "key of a BMC", "another key of its own (Kg)"},
                 {"", "key of the BMC", "another key of its own (Kg)"}};
    for (const int suite : {3, 17}) {
        for (const auto& c : cases) {
            const std::string given = c.given;
            options.kg = [given] { return Packet(given.begin(), given.end()); };
            const std::string refusal = Refusal({.options = {.cipherSuite = suite, .kg = c.bmc}});
            EXPECT_THAT(refusal, HasSubstr(c.refusal)) << c.bmc << "/" << given;
            EXPECT_EQ(refusal.empty(), *c.refusal == 0) << refusal;
        }
    }
}

}  // namespace
