// A line between the program and a BMC that spoils packets by seeds, and a log that changes while
// it is read. The report is equal to that of a good line, or it says that it is partial.
// IPMISEL_SEEDS runs other seeds than the first dozen.

#include "simulator/network_bmc.h"
#include "simulator/server_file.h"
#include "tests/program/program_fixture.h"
#include "tests/support/seeds.h"
#include "tests/support/udp_relay.h"
#include "tests/support/wire.h"

namespace ipmiseltest {
namespace {

using ::testing::AnyOf;
using ::testing::Eq;

class Relay : public ProgramTest {
protected:
    Relay() { setting.environment["IPMISEL_PASSWORD"] = "secret"; }

    struct Found {
        Ended ended;
        bool complete = false;
        Json records;  ///< the bytes of each
    };
    Found CollectFrom(const std::string& source, std::vector<std::string> more = {}) {
        more.insert(more.end(), {"--user", "root", "--class", "QORSG_IPMILogRecord", "--format",
                                 "json", "--log-level", "error"});
        Found found{Collect(source, more), false, Json::array()};
        const Json report = Json::parse(found.ended.out, nullptr, false);
        if (report.is_discarded()) return found;
        found.complete = report["complete"];
        for (const Json& instance : report["instances"]) {
            found.records.push_back(instance["properties"]["RawData"]);
        }
        return found;
    }
    static std::uint16_t PortOf(const std::string& source) {
        return static_cast<std::uint16_t>(std::stoi(source.substr(source.rfind(':') + 1)));
    }
    /// Collects through a line of each of so many seeds; most reports are whole.
    void ExpectEqualOrPartialThroughLines(unsigned count,
                                          const std::function<std::uint16_t(unsigned seed)>& port,
                                          std::vector<std::string> options) {
        options.insert(options.end(), {"--timeout", "2"});
        const auto [first, last] = Seeds(count);
        unsigned whole = 0;
        Json expected;
        for (unsigned seed = 0; seed <= last; seed = std::max(seed + 1, first)) {
            const UdpRelay relay(port(seed), seed);
            const Found found = CollectFrom(relay.Place(), options);
            if (seed == 0) expected = found.records;
            EXPECT_TRUE(seed != 0 || found.complete) << found.ended.err;
            ExpectEqualOrPartial(found, expected, "seed " + std::to_string(seed));
            whole += found.complete ? 1 : 0;
        }
        EXPECT_GT(whole, (last - first + 1) / 2);  // a line of some percent costs time, not records
    }
    /// A partial report may also have what was there before.
    void ExpectEqualOrPartial(const Found& found, const Json& expected, const std::string& what,
                              const Json& before = Json::array()) {
        EXPECT_THAT(found.ended.exitStatus, AnyOf(Eq(0), Eq(1), Eq(3), Eq(4))) << what;
        EXPECT_EQ(found.complete, found.ended.exitStatus == 0) << what;
        if (found.complete) {
            EXPECT_EQ(found.records, expected) << what;
            return;
        }
        EXPECT_FALSE(found.ended.err.empty()) << what;
        for (const Json& record : found.records) {
            EXPECT_TRUE(std::count(expected.begin(), expected.end(), record) +
                            std::count(before.begin(), before.end(), record) >
                        0)
                << what;
        }
    }
};

TEST_F(Relay, WhateverALineDoesTheReportIsEqualOrPartial) {
    const auto rack = ipmisim::ReadServerFile(IPMISEL_EXAMPLES "/rack-server.json").bmcs.front();
    std::optional<ipmisim::NetworkBmc> bmc;
    const auto port = [&](unsigned seed) {
        const int suite = seed % 2 == 0 ? 17 : 3;
        bmc.emplace(rack, ipmisim::NetworkBmc::Character{.options = {.cipherSuite = suite}});
        return PortOf(bmc->Place());
    };
    ExpectEqualOrPartialThroughLines(12, port, {});
}

TEST_F(Relay, WhateverALineDoesToAnothersBmcTheReportIsEqualOrPartial) {
    if (!IpmiSim::Missing().empty()) GTEST_SKIP() << IpmiSim::Missing();
    std::vector<std::string> lines;
    for (std::uint16_t i = 1; i <= 60; ++i) {
        lines.push_back(IpmiSim::SelLine(SystemEvent(i, 1, 0x30)));
    }
    const IpmiSim sim(lines);
    ExpectEqualOrPartialThroughLines(6, [&](unsigned) { return PortOf(sim.Place()); },
                                     {"--workaround", "opensesspriv"});
}

TEST_F(Relay, ALogThatChangesWhileItIsReadIsReportedAsItIsThenOrAsPartial) {
    if (!IpmiSim::Missing().empty()) GTEST_SKIP() << IpmiSim::Missing();
    if (std::system("command -v ipmitool >/dev/null") != 0) {
        GTEST_SKIP() << "ipmitool is not installed (package ipmitool)";
    }
    const std::string add = "raw 0x0a 0x44 0 0 2 1 2 3 4 0x20 0 4 1 0x30 1 0x59 0x50 0x45\n";
    const struct {
        const char* what;
        std::string commands;  ///< of ipmitool
        bool again = false;    ///< in the second reading too
        bool unseen = false;  ///< within a second of the last addition, which the times do not tell
    } cases[] = {{"added", add},
                 {"erased", "sel delete 5\n"},
                 {"cleared", "sel clear\n"},
                 {"wrapped", "sel delete 1 2 3\n" + add + add + add, false, true},
                 {"added twice", add, true}};
    for (const auto& c : cases) {
        std::vector<std::string> lines;
        for (std::uint16_t i = 1; i <= 60; ++i) {
            lines.push_back(IpmiSim::SelLine(SystemEvent(i, 1, 0x30)));
        }
        const IpmiSim sim(lines);
        const std::uint16_t port = PortOf(sim.Place());
        const std::string tool = "ipmitool -I lanplus -C 3 -H 127.0.0.1 -p " +
                                 std::to_string(port) + " -U root -P secret exec " +
                                 folder.Write("commands", c.commands) + " >/dev/null 2>&1";
        const std::vector<std::string> options{"--workaround", "opensesspriv", "--window", "1"};
        const Json before = CollectFrom("lan:" + sim.Place(), options).records;
        unsigned changes = 0;
        const UdpRelay relay(port, 0, [&](unsigned number) {
            if (number == 40 || (c.again && number == 120)) {
                changes += std::system(tool.c_str()) == 0 ? 1U : 0U;
            }
        });
        const Found found = CollectFrom(relay.Place(), options);
        EXPECT_EQ(changes, c.again ? 2u : 1u) << c.what;
        EXPECT_TRUE(found.complete == !c.again || (c.unseen && !found.complete))
            << c.what << found.ended.err;
        ExpectEqualOrPartial(found, CollectFrom("lan:" + sim.Place(), options).records, c.what,
                             before);
    }
}

}  // namespace
}  // namespace ipmiseltest
