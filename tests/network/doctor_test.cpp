// `ipmisel doctor` against a simulated BMC on a port, with one thing wrong at a time.

#include <gmock/gmock.h>

#include <algorithm>
#include <array>
#include <cstdlib>
#include <ctime>
#include <string>
#include <vector>

#include "program/run_program.h"
#include "simulator/network_bmc.h"

namespace {

using ipmisim::NetworkBmc;
using testing::AllOf;
using testing::ContainsRegex;
using testing::HasSubstr;
using testing::Not;

struct Finding {
    int exitStatus;
    std::string lines;
};

Finding Examine(std::vector<std::string> arguments, const char* password = ipmisim::kPassword) {
    setenv("IPMISEL_PASSWORD", password, 1);
    arguments.insert(arguments.begin(), {"ipmisel", "doctor", "--no-config", "--timeout", "0.7"});
    std::vector<char*> argv;
    for (std::string& argument : arguments) argv.push_back(argument.data());
    testing::internal::CaptureStdout();
    testing::internal::CaptureStderr();
    const int status = ipmisel::RunProgram(static_cast<int>(argv.size()), argv.data());
    const std::string errors = testing::internal::GetCapturedStderr();
    return {status, testing::internal::GetCapturedStdout() + errors};
}

ipmisim::BmcDescription Bmc() {
    ipmisim::BmcDescription bmc;
    bmc.deviceId = {0x20, 1, 2, 0x15, 2, 0xBF, 0x57, 1, 0, 0, 1};
    bmc.selfTest = {0x55, 0x00};
    bmc.selTime = static_cast<std::uint32_t>(std::time(nullptr));
    return bmc;
}

Finding ExamineBmc(const ipmisim::RmcpBmc::Options& options,
                   const std::vector<std::string>& more = {},
                   const char* password = ipmisim::kPassword) {
    const NetworkBmc peer(Bmc(), {.options = options});
    std::vector<std::string> arguments{peer.Place(), "--user", ipmisim::kUser};
    arguments.insert(arguments.end(), more.begin(), more.end());
    return Examine(std::move(arguments), password);
}

TEST(Doctor, ABmcWithoutFaultIsWell) {
    ipmisim::BmcDescription bmc = Bmc();
    bmc.utcOffsetMinutes = 60;  // local time, and not wrong
    *bmc.selTime += 3600;
    // A compact record: owner, LUN and number of the sensor after the header.
    std::vector<std::uint8_t> sensor(32, 0);
    std::copy_n(std::array<std::uint8_t, 8>{1, 0, 0x51, 2, 27, 0x20, 0, 0x31}.begin(), 8,
                sensor.begin());
    bmc.sdrRecords = {sensor};
    const NetworkBmc peer(std::move(bmc), {.options = {.listedSuites = {3, 17}}});
    const Finding found = Examine({peer.Place(), "--user", ipmisim::kUser});
    EXPECT_EQ(found.exitStatus, 0) << found.lines;
    EXPECT_THAT(found.lines,
                AllOf(ContainsRegex("ok +session +opened in"),
                      ContainsRegex("ok +cipher suite 17 +opens for user, operator, admin\n"),
                      ContainsRegex("- +cipher suite 3 +listed, but the BMC opens no"),
                      Not(HasSubstr("event log")),  // which is empty
                      ContainsRegex("- +Get Sensor Reading +requested sensor"),
                      ContainsRegex("ok +sessions at a time +4 or more"),
                      ContainsRegex("ok +clock +[+-][0-9] s"), Not(HasSubstr("WRONG"))));
}

TEST(Doctor, AKnownDeviationIsRecognisedByTheWorkaroundThatHelps) {
    using Numbers = ipmisim::RmcpDeviations::Numbers;
    const struct {
        ipmisim::RmcpDeviations deviations;
        const char* workaround;
    } cases[] = {
        {{.paddedUserName = true}, "intel20"},
        {{.longRakp2Code = true}, "supermicro20"},
        {{.noPrivilege = true}, "opensesspriv"},
        {{.noIpmi20 = true}, "authcap"},
        {{.badChecksums = true}, "nochecksumcheck"},
        {{.numbers = Numbers::kStandStill}, "sessionnumbers"},
        {{.numbers = Numbers::kZero}, "sessionnumbers"},
        {{.numbers = Numbers::kStartOver}, "sessionnumbers"},
        {{.longRakp2Code = true, .noPrivilege = true}, "sun20"},
    };
    for (const auto& c : cases) {
        const Finding found = ExamineBmc({.deviations = c.deviations});
        EXPECT_EQ(found.exitStatus, 4) << c.workaround << "\n" << found.lines;
        EXPECT_THAT(found.lines, HasSubstr(std::string("--workaround ") + c.workaround));
        const Finding with =
            ExamineBmc({.deviations = c.deviations}, {"--workaround", c.workaround});
        EXPECT_EQ(with.exitStatus, 0) << c.workaround << "\n" << with.lines;
        const bool looksAtNumbers = c.deviations.numbers == Numbers::kRight;
        EXPECT_EQ(with.lines.find("session numbers") != std::string::npos, looksAtNumbers);
    }
}

TEST(Doctor, ALineThatDoublesPacketsIsNoDeviationOfTheBmc) {
    const NetworkBmc peer(Bmc(), {.send = [](NetworkBmc&, const ipmisim::Packet& answer) {
                              return std::vector<ipmisim::Packet>(2, answer);
                          }});
    const Finding found = Examine({peer.Place(), "--user", ipmisim::kUser});
    EXPECT_EQ(found.exitStatus, 0) << found.lines;
    EXPECT_THAT(found.lines,
                ContainsRegex("ok +session numbers +as they should be in [0-9]+ answers"));
}

TEST(Doctor, WhatIsRefusedIsSaidAndWhatToDo) {
    const struct {
        ipmisim::RmcpBmc::Options options;
        std::vector<std::string> arguments;
        const char* password;
        const char* line;
    } cases[] = {
        {{}, {}, "wrong", "session +[^\n]*wrong password(.|\n)*user or password +the password"},
        {{.hasFreeSession = false}, {}, ipmisim::kPassword, "session +[^\n]*no free session"},
        {{}, {"--user", "nobody"}, ipmisim::kPassword, "session +[^\n]*does not know the user"},
        {{.kg = "another key"}, {}, ipmisim::kPassword, "session +[^\n]*--kg-file"},
        {{.cipherSuite = 2}, {}, ipmisim::kPassword, "session +[^\n]*--cipher-suite"},
    };
    for (const auto& c : cases) {
        const NetworkBmc peer(Bmc(), {.options = c.options});
        std::vector<std::string> arguments{peer.Place()};
        if (c.arguments.empty()) arguments.insert(arguments.end(), {"--user", ipmisim::kUser});
        arguments.insert(arguments.end(), c.arguments.begin(), c.arguments.end());
        const Finding found = Examine(std::move(arguments), c.password);
        EXPECT_EQ(found.exitStatus, 3) << found.lines;
        EXPECT_THAT(found.lines, ContainsRegex(std::string("WRONG +") + c.line));
    }
}

TEST(Doctor, AWrongPasswordCostsAtMostThreeLogIns) {
    unsigned attempts = 0;
    const NetworkBmc counting(Bmc(),
                              {.receive = [&](NetworkBmc&, std::vector<ipmisim::Packet>* packets) {
                                  constexpr std::size_t kPayloadType = 5;
                                  constexpr std::uint8_t kOpenSession = 0x10;
                                  for (const auto& packet : *packets) {
                                      attempts += packet.size() > kPayloadType && packet[4] == 6 &&
                                                  packet[kPayloadType] == kOpenSession;
                                  }
                              }});
    Examine({counting.Place(), "--user", ipmisim::kUser}, "wrong");
    EXPECT_GE(attempts, 1U);
    EXPECT_LE(attempts, 2 * 3U) << "a suite that is not offered costs a packet too";
}

TEST(Doctor, APlaceThatIsNotReachedIsStatusThree) {
    std::string closed;
    {
        const NetworkBmc peer(Bmc(), {});
        closed = peer.Place();
    }
    const Finding refused = Examine({closed});
    EXPECT_EQ(refused.exitStatus, 3);
    EXPECT_THAT(refused.lines, ContainsRegex("WRONG +port +[^\n]*nobody listens"));

    const NetworkBmc silent(
        Bmc(), {.receive = [](NetworkBmc&, std::vector<ipmisim::Packet>* all) { all->clear(); }});
    const Finding found = Examine({silent.Place()});
    EXPECT_EQ(found.exitStatus, 3);
    EXPECT_THAT(found.lines, ContainsRegex("WRONG +port +[^\n]*no answer"));
    EXPECT_EQ(Examine({"lan:::1"}).exitStatus, 2);
}

TEST(Doctor, ASuiteOrAPrivilegeThatIsMissingIsNamed) {
    const Finding user = ExamineBmc({.maxPrivilege = 3});
    EXPECT_EQ(user.exitStatus, 4);
    EXPECT_THAT(user.lines, AllOf(ContainsRegex("WRONG +privilege +[^\n]*--privilege operator"),
                                  ContainsRegex("cipher suite 17 +opens for user, operator; not "
                                                "for admin")));
    const Finding open = ExamineBmc({.cipherSuite = 2, .listedSuites = {0, 2}},
                                    {"--workaround", "authcap", "--cipher-suite", "2"});
    EXPECT_EQ(open.exitStatus, 4);
    EXPECT_THAT(open.lines, ContainsRegex("WRONG +cipher suite 0 +[^\n]*disable it"));
}

TEST(Doctor, MoreRequestsThanTheBmcCanTakeAreFound) {
    const NetworkBmc peer(Bmc(), {.service = {.perRequest = std::chrono::milliseconds(5),
                                              .maxOutstanding = 4,
                                              .refusesWhenFull = true}});
    const Finding found = Examine({peer.Place(), "--user", ipmisim::kUser});
    EXPECT_THAT(found.lines, ContainsRegex("requests at a time +[124]: "));
}

TEST(Doctor, ABmcThatAnswersWithATimeoutHangs) {
    ipmisim::BmcDescription bmc = Bmc();
    bmc.faults.push_back({.netFn = 0x06,
                          .command = 0x01,
                          .call = {},
                          .kind = ipmisim::Fault::Kind::kCompletionCode,
                          .completionCode = 0xC3,
                          .data = {}});
    const NetworkBmc peer(std::move(bmc), {});
    const Finding found = Examine({peer.Place(), "--user", ipmisim::kUser});
    EXPECT_EQ(found.exitStatus, 3);
    EXPECT_THAT(found.lines, ContainsRegex("WRONG +Get Device ID +timeout[^\n]*reset it"));
}

TEST(Doctor, ARecordThatTheBmcDoesNotGiveIsNamed) {
    const Finding found = Examine({"sim:" IPMISEL_EXAMPLES "/broken-bmc.json"});
    EXPECT_EQ(found.exitStatus, 4);
    EXPECT_THAT(found.lines, ContainsRegex("WRONG +event log +record 0004: no answer;"));
}

TEST(Doctor, WhatTheBmcLacksOrRefusesIsSaid) {
    ipmisim::BmcDescription bmc = Bmc();
    bmc.wholeSdr = false;
    bmc.sdrRecords = {std::vector<std::uint8_t>(48, 0x51)};
    bmc.selTime = 1000;
    const NetworkBmc peer(std::move(bmc), {});
    const Finding found = Examine({peer.Place(), "--user", ipmisim::kUser});
    EXPECT_EQ(found.exitStatus, 4);
    EXPECT_THAT(found.lines, AllOf(ContainsRegex("- +sensor records +read in parts"),
                                   ContainsRegex("WRONG +clock +never set"),
                                   ContainsRegex("- +Get SEL Entry +the log is empty")));
}

}  // namespace
