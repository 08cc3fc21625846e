// Where a collection may stand still, against what ends it: --deadline and the first Ctrl-C hold in
// every phase, within a second.

#include <sys/stat.h>

#include <future>

#include "simulator/network_bmc.h"
#include "tests/program/program_fixture.h"

namespace ipmiseltest {
namespace {

using ipmisim::NetworkBmc;
using ipmisim::Packet;
using Arguments = std::vector<std::string>;
using Clock = std::chrono::steady_clock;

#ifdef __SANITIZE_ADDRESS__
constexpr int kRecords = 5000;
constexpr double kPatience = 4;  // every step costs many times as much
#else
constexpr int kRecords = 65278;
constexpr double kPatience = 1.5;  // the second, and half of one to start and to end a process
#endif
constexpr double kDeadline = 1.5;

NetworkBmc::Character AnsweringUntil(unsigned lastPacket) {
    NetworkBmc::Character character;
    character.receive = [lastPacket, number = 0U](NetworkBmc&,
                                                  std::vector<Packet>* packets) mutable {
        number += static_cast<unsigned>(packets->size());
        if (number > lastPacket) packets->clear();
    };
    return character;
}

NetworkBmc::Character Flooding() {
    NetworkBmc::Character character;
    character.send = [](NetworkBmc&, const Packet& answer) {
        if (!ipmisim::RmcpBmc::IsOfSession(answer)) return std::vector<Packet>{answer};
        return std::vector<Packet>(20000, Packet(60, 6));
    };
    return character;
}

ipmisim::BmcDescription LongLog() {
    ipmisim::BmcDescription bmc;
    bmc.deviceId = ipmisim::Bytes{0x20, 1, 2, 0x15, 2, 0xBF, 0x57, 1, 0, 0, 1};
    for (int i = 1; i <= 2000; ++i) {
        bmc.selEntries.push_back({static_cast<std::uint8_t>(i), static_cast<std::uint8_t>(i >> 8),
                                  2, 0, 0, 0, 0x50, 0x20, 0, 4, 1, 0x30, 1, 0x59, 0x50, 0x45});
    }
    return bmc;
}

class StandingStill : public ProgramTest {
protected:
    const Arguments kCollect{IPMISEL_PROGRAM, "collect", "--user", "root"};

    StandingStill() { setting.environment["IPMISEL_PASSWORD"] = "secret"; }

    /// How long a run took until it ended, from its start or from an interruption on.
    struct Outcome {
        Ended ended;
        double seconds = 0;
    };
    Outcome RunUntilItEnds(const Arguments& command, double interruptedAfter, const Setting& how) {
        const TemporaryFolder own;
        auto began = Clock::now();
        RunningProgram program(own.path().string(), command, how);
        if (interruptedAfter > 0) {
            std::this_thread::sleep_for(std::chrono::duration<double>(interruptedAfter));
            began = Clock::now();
            program.Signal(SIGINT);
        }
        Outcome outcome{program.Wait(), 0};
        outcome.seconds = std::chrono::duration<double>(Clock::now() - began).count();
        return outcome;
    }
    /// Seconds to the middle of a collection that nothing holds up, however fast the machine is.
    double MidwayOf(Arguments options) {
        options.insert(options.begin(), kCollect.begin(), kCollect.end());
        options.insert(options.end(), {"--output", "/dev/null"});
        const Outcome whole = RunUntilItEnds(options, 0, setting);
        EXPECT_THAT(whole.ended.exitStatus, ::testing::AnyOf(0, 4)) << whole.ended.err;
        return std::min(kDeadline, whole.seconds / 2);
    }
    std::string LongServer() {
        Json server = Server(kRecords);
        Json& sensors = server["bmcs"][0]["sdr"]["records"];
        const std::string rest = std::string(kSensorRecord).substr(4);
        for (int i = 2; i < kRecords - 254; ++i) {
            sensors.push_back(ipmisel::Format("%02x%02x", i & 0xFF, i >> 8) + rest);
        }
        return "sim:" + folder.Write("long.json", server.dump());
    }
    std::string Pipe(const char* name) {
        std::string pipe = (folder.path() / name).string();
        EXPECT_EQ(mkfifo(pipe.c_str(), 0600), 0);
        return pipe;
    }
};

TEST_F(StandingStill, DeadlineAndInterruptionHoldInEveryPhase) {
    const std::string records = "QORSG_IPMILogRecord";
    const UdpSocket silent(0);
    const std::string silentPort = "lan:127.0.0.1:" + std::to_string(silent.Port());
    const NetworkBmc good(LongLog(), {});
    const NetworkBmc slow(
        LongLog(), {.service = {.perRequest = std::chrono::milliseconds(50), .oneAtATime = true}});
    const NetworkBmc dying(LongLog(), AnsweringUntil(100)), dyingToo(LongLog(), AnsweringUntil(90));
    const NetworkBmc flooding(LongLog(), Flooding());
    Json slowServer = Server(200);
    slowServer["bmcs"][0]["latency_us"] = 100000;
    const std::string slowSim = Write(slowServer);
    const std::string longSim = LongServer();
    const std::string small = Example("rack-server");
    // Held open by a reader that does not read.
    const std::string unread = Pipe("unread");
    const int reader = open(unread.c_str(), O_RDWR | O_CLOEXEC);
    setting.environment["LD_PRELOAD"] = "";
    Setting nameless = setting;
    nameless.environment["LD_PRELOAD"] = IPMISEL_SILENT_NAMES;
    nameless.environment["ASAN_OPTIONS"] = "verify_asan_link_order=0";
    Setting prompted = setting;
    prompted.environment.erase("IPMISEL_PASSWORD");
    prompted.onTerminal = true;
    const Setting usual = setting;
    const Arguments toStandardOutput{"/bin/sh", "-c", "exec \"$@\" > '" + unread + "'", "sh"};

    const struct {
        const char* phase;
        Arguments options;
        const Setting* how = nullptr;
        Arguments before{};
        double after = kDeadline;
    } cases[] = {
        {"name look-up", {"--from", "lan:bmc.example", "--timeout", "20"}, &nameless},
        {"session set-up", {"--from", silentPort, "--timeout", "20"}},
        {"one of two silent", {"--from", good.Place(), "--from", silentPort, "--timeout", "20"}},
        {"walk", {"--from", slowSim, "--class", records}},
        {"walk over the network", {"--from", slow.Place(), "--window", "1"}},
        {"BMC dead in mid-walk", {"--from", dying.Place(), "--timeout", "20"}},
        {"one of two dead in mid-walk",
         {"--from", good.Place(), "--from", dyingToo.Place(), "--timeout", "20"}},
        {"flood", {"--from", flooding.Place(), "--timeout", "20"}},
        {"export",
         {"--from", longSim, "--class", records, "--format", "json"},
         nullptr,
         {},
         MidwayOf({"--from", longSim, "--class", records, "--format", "json"})},
        {"export of events",
         {"--from", longSim, "--format", "html"},
         nullptr,
         {},
         MidwayOf({"--from", longSim, "--format", "html"})},
        {"reader that does not read",
         {"--from", longSim, "--class", "IPMI_Event", "--format", "json", "--output", unread}},
        {"standard output that nobody reads",
         {"--from", longSim, "--class", "IPMI_Event", "--format", "json"},
         nullptr,
         toStandardOutput},
        {"log that nobody reads",
         {"--from", longSim, "--class", records, "--log-level", "trace", "--log-file", unread}},
        {"--output without a reader", {"--from", small, "--output", Pipe("output")}},
        {"--record without a reader", {"--from", small, "--record", Pipe("record")}},
        {"--log-file without a reader", {"--from", small, "--log-file", Pipe("log-file")}},
        {"--plugin from a pipe", {"--from", small, "--plugin", Pipe("plugin")}},
        {"--password-file without a writer",
         {"--from", silentPort, "--password-file", Pipe("password-file")},
         &usual},
        {"prompt", {"--from", silentPort}, &prompted},
    };
    for (const bool interrupted : {false, true}) {
        std::vector<std::future<Outcome>> outcomes;
        for (const auto& c : cases) {
            Arguments command = c.before;
            command.insert(command.end(), kCollect.begin(), kCollect.end());
            command.insert(command.end(), c.options.begin(), c.options.end());
            if (!interrupted) {
                command.insert(command.end(), {"--deadline", ipmisel::Format("%.2f", c.after)});
            }
            if (c.how != &prompted && c.options.end()[-2] != "--output" && c.before.empty()) {
                command.insert(command.end(), {"--output", "/dev/null"});
            }
            const Setting& how = c.how == nullptr ? setting : *c.how;
            outcomes.push_back(
                std::async(std::launch::async, [this, command, interrupted, &how, &c] {
                    return RunUntilItEnds(command, interrupted ? c.after : 0, how);
                }));
            // Two long ones at a time would measure each other.
            if (c.options[1] == longSim) outcomes.back().wait();
        }
        for (std::size_t i = 0; i < outcomes.size(); ++i) {
            const Outcome outcome = outcomes[i].get();
            const std::string what =
                cases[i].phase + std::string(interrupted ? ", interrupted: " : ": ");
            EXPECT_LT(outcome.seconds, (interrupted ? 0 : cases[i].after) + kPatience)
                << what << outcome.ended.err;
            // What cannot be reported any more is told in a line, or was killed.
            if (outcome.ended.signal == 0) {
                EXPECT_THAT(outcome.ended.exitStatus, ::testing::AnyOf(2, 3, 4)) << what;
                EXPECT_TRUE(outcome.ended.err.find("ipmisel: ") != std::string::npos ||
                            cases[i].how == &prompted)
                    << what;
            } else {
                EXPECT_TRUE(interrupted && outcome.ended.signal == SIGINT) << what;
            }
        }
    }
    close(reader);
}

}  // namespace
}  // namespace ipmiseltest
