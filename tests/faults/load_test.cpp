// As much as a BMC can hold, as often as one likes.

#include <malloc.h>

#include "tests/program/program_fixture.h"
#include "tests/support/fru_inventory.h"
#include "tests/support/machine_fixture.h"

extern "C" std::size_t __sanitizer_get_current_allocated_bytes();  // of AddressSanitizer

namespace ipmiseltest {
namespace {

#ifdef __SANITIZE_ADDRESS__
constexpr int kRecords = 5000;  // every step costs many times as much
std::size_t Allocated() { return __sanitizer_get_current_allocated_bytes(); }
#else
constexpr int kRecords = 65535;
std::size_t Allocated() { return mallinfo2().uordblks; }
#endif
constexpr int kReachable = 0xFEFF;    // a next record ID of 0xFFxx ends the walk
constexpr int kHeldByIpmiSim = 2000;  // it takes a second to read so many in, and ten for 5,000

class Load : public ProgramTest {
protected:
    const std::vector<std::string> log_{"--class", "QORSG_IPMILogRecord", "--log-level", "error"};

    /// The log's account of a report that has as many instances as it says.
    static Json Log(const Json& report) {
        const Json log = report["completeness"][0]["log"];
        EXPECT_EQ(report["instances"].size(), log["exported"]);
        EXPECT_EQ(log["read"], log["exported"]);
        return log;
    }
};

TEST_F(Load, AFullLogThroughEveryKindOfSource) {
    std::vector<std::string> recorded = log_;
    recorded.insert(recorded.end(), {"--record", InPlace("capture")});
    Json simulated = Report(Write(Server(kRecords)), recorded);
    EXPECT_EQ(Log(simulated)["announced"], kRecords);
    EXPECT_EQ(Log(simulated)["read"], std::min(kRecords, kReachable));
    Json replayed = Report("replay:" + InPlace("capture"), log_);
    for (Json* const report : {&simulated, &replayed}) {  // what they are called
        for (const char* const name : {"source", "systems"}) report->erase(name);
        (*report)["completeness"][0].erase("source");
    }
    EXPECT_TRUE(simulated == replayed);
}

TEST_F(Load, ALongLogOverTheNetwork) {
    if (!IpmiSim::Missing().empty()) GTEST_SKIP() << IpmiSim::Missing();
    std::vector<std::string> lines;
    for (int i = 1; i <= kHeldByIpmiSim; ++i) {
        lines.push_back(IpmiSim::SelLine(SystemEvent(static_cast<std::uint16_t>(i), 1, 0x30)));
    }
    const IpmiSim sim(lines, kHeldByIpmiSim);
    setting.environment["IPMISEL_PASSWORD"] = "secret";
    std::vector<std::string> access = log_;
    access.insert(access.end(), {"--user", "root", "--workaround", "opensesspriv"});
    EXPECT_EQ(Log(Report("lan:" + sim.Place(), access))["read"], kHeldByIpmiSim);
}

TEST_F(Load, OutOfMemoryIsOneLineWhereverItIs) {
#ifdef __SANITIZE_ADDRESS__
    GTEST_SKIP() << "AddressSanitizer takes more address space than the limits leave";
#endif
    const std::string log = Write(Server(10000));
    Json server = Server();
    for (int i = 0; i < 50000; ++i) server["smbios"].push_back(std::string(100, '0'));
    const std::string wide = "sim:" + folder.Write("wide.json", server.dump());
    const std::string saved = (folder.path() / "saved").string();
    const std::string capture = (folder.path() / "capture").string();
    const std::string store = "sqlite:" + (folder.path() / "store").string();
    const Ended good = Collect(log, {"--format", "json", "--output", saved, "--record", capture});
    ASSERT_EQ(good.exitStatus, 0) << good.err;
    const std::vector<std::string> commands[] = {
        {"collect", "--from", wide, "--output", InPlace("report")},
        {"collect", "--from", log, "--output", InPlace("report"), "--format", "html"},
        {"collect", "--from", "replay:" + capture, "--output", InPlace("report"), "--log-level",
         "error"},
        {"collect", "--from", log, "--output", InPlace("report"), "--store", store},
        {"check", "--from", wide},
        {"diff", saved, saved}};
    unsigned ranOut = 0;
    for (const auto& command : commands) {
        for (const char* kilobytes : {"18000", "25000", "33000", "46000"}) {
            std::vector<std::string> run{"/bin/sh", "-c", "ulimit -v $0; exec \"$@\"", kilobytes,
                                         IPMISEL_PROGRAM};
            run.insert(run.end(), command.begin(), command.end());
            const Ended ended = RunningProgram(folder.path().string(), run).Wait();
            const std::string shown = ::testing::PrintToString(run) + ended.err + ended.out;
            EXPECT_EQ(ended.signal, 0) << shown;
            if (ended.err.find("memory") == std::string::npos) continue;
            ++ranOut;
            EXPECT_THAT(ended.exitStatus, ::testing::AnyOf(command[0] == "diff" ? 2 : 1, 3))
                << shown;
            EXPECT_EQ(std::count(ended.err.begin(), ended.err.end(), '\n'), 1) << shown;
        }
    }
    EXPECT_GE(ranOut, std::size(commands));
}

class Memory : public MachineTest {};

TEST_F(Memory, AHundredCollectionsLeaveNothingBehind) {
    nodes[0].selEntries.assign(50, SystemEvent(1, 0x01, 0x30));
    for (std::uint8_t i = 0; i < 50; ++i) nodes[0].selEntries[i][0] = i + 1;
    nodes[0].sdrRecords = {FullSensor(1, 0x30, 7, 1, "Ambient"), FruLocator(2, 3, "PSU 1")};
    nodes[0].fru = {{0, FixedLayout("Maker", "Board", "S-0")},
                    {3, FixedLayout("Maker", "Supply", "S-3")}};
    nodes.push_back(nodes[0]);
    nodes[1].faults = {NoResponse(ipmi::kGetSelEntry, 20),
                       CompletionCode(ipmi::kReadFruData, 5, 0xC3)};
    std::size_t early = 0;
    for (int pass = 1; pass <= 200; ++pass) {
        ipmisel::Module().ipmifruonce = false;
        EXPECT_EQ(Collect({"QORSG_IPMIFRU", "QORSG_IPMILogRecord", "QORSG_ZMCAuxDebugRecord"}), 0);
        EXPECT_EQ(written.instances.size(), 73U);
        written.instances = {};
        requests = {};
        log.Clear();
        if (pass == 100) early = Allocated();  // what grows with use has grown by then
    }
    EXPECT_LT(Allocated(), early + 1000);
}

}  // namespace
}  // namespace ipmiseltest
