// Each line of the manual's table "What a line means" is provoked as a user would, and says so.

#include <gmock/gmock.h>

#include <functional>
#include <iostream>
#include <map>
#include <regex>
#include <string>
#include <vector>

#include "simulator/network_bmc.h"
#include "tests/support/ipmi_sim.h"
#include "tests/support/run_program.h"
#include "tests/support/temporary_folder.h"

namespace {

using ipmiseltest::Ended;
using ipmiseltest::RunningProgram;
using ipmiseltest::Setting;
using ipmiseltest::TemporaryFolder;
using ipmisim::NetworkBmc;
using testing::HasSubstr;
using Words = std::vector<std::string>;

struct Row {
    std::string line;
    int exitStatus;
};

std::vector<Row> ManualRows() {
    const std::string manual = ipmiseltest::ReadText(IPMISEL_MANUAL);
    const std::string table = manual.substr(manual.find("### What a line means"));
    const std::regex row("\n\\| `([^`]+)` \\| ([0-9]) \\|");
    std::vector<Row> rows;
    for (std::sregex_iterator at(table.begin(), table.end(), row), end; at != end; ++at) {
        rows.push_back({(*at)[1], std::stoi((*at)[2])});
    }
    return rows;
}

Ended Run(const Words& command, const std::string& password = "secret") {
    const TemporaryFolder folder;
    Setting setting;
    if (!password.empty()) setting.environment["IPMISEL_PASSWORD"] = password;
    return RunningProgram(folder.path().string(), command, setting).Wait();
}

Ended Collect(Words arguments, const std::string& password = "secret") {
    arguments.insert(arguments.begin(), {IPMISEL_PROGRAM, "collect", "--no-config"});
    return Run(arguments, password);
}

Ended CollectLan(const NetworkBmc::Character& character, const Words& more = {},
                 const std::string& password = ipmisim::kPassword) {
    ipmisim::BmcDescription bmc;
    bmc.deviceId = {0x20, 1, 2, 0x15, 2, 0xBF, 0x57, 1, 0, 0, 1};
    const NetworkBmc peer(bmc, character);
    Words arguments{"--timeout", "1.5", "--from", peer.Place()};
    arguments.insert(arguments.end(), more.begin(), more.end());
    if (more.empty() || more.front() != "--user") {
        arguments.insert(arguments.end(), {"--user", ipmisim::kUser});
    }
    return Collect(arguments, password);
}

/// In name spaces of its own, as whose root a shell first does `before`.
Ended CollectInside(const std::string& name_spaces, const std::string& before,
                    const std::string& arguments) {
    const std::string call = " " IPMISEL_PROGRAM " collect --no-config " + arguments;
    return Run(
        {"/bin/sh", "-c", "exec unshare -r " + name_spaces + " sh -c '" + before + call + "'"});
}

bool HasNameSpaces() {
    return std::system("unshare -rmn mount -t tmpfs none /mnt >/dev/null 2>&1") == 0;
}

using Provocations = std::map<std::string, std::function<Ended()>>;

/// By the line of the manual.
Provocations OfTheNetwork() {
    const auto silent = [](NetworkBmc&, std::vector<ipmisim::Packet>* all) { all->clear(); };
    // Where a password is checked: RAKP 1.
    const auto silentAtRakp1 = [](NetworkBmc&, std::vector<ipmisim::Packet>* all) {
        std::erase_if(*all,
                      [](const auto& packet) { return packet.size() > 5 && packet[5] == 0x12; });
    };
    return {
        {"the host name does not resolve",
         [] {
             return Collect({"--from", "lan:no..name", "--user", "x"});
         }},
        {"an IPv6 address stands in brackets",
         [] {
             return Collect({"--from", "lan:fe80::1"});
         }},
        {"nobody listens there, or a firewall refuses",
         [] {
             const auto port = std::to_string(ipmiseltest::FreeUdpPort());
             return Collect({"--from", "lan:127.0.0.1:" + port, "--user", "x"});
         }},
        {"no answer", [=] { return CollectLan({.receive = silent}); }},
        {"the BMC does not speak IPMI 2.0",
         [] { return CollectLan({.options = {.deviations = {.noIpmi20 = true}}}); }},
        {"wrong password, or wrong user name", [] { return CollectLan({}, {}, "wrong"); }},
        {"the BMC does not know the user name",
         [] {
             return CollectLan({}, {"--user", "nobody"});
         }},
        {"the BMC fell silent when the password was checked",
         [=] { return CollectLan({.receive = silentAtRakp1}); }},
        {"another key of its own (Kg)",
         [] { return CollectLan({.options = {.kg = "another key"}}); }},
        {"the user may not have the privilege asked for",
         [] { return CollectLan({.options = {.maxPrivilege = 2}}); }},
        {"does not offer the cipher suite",
         [] {
             return CollectLan({.options = {.cipherSuite = 2, .listedSuites = {0, 2}}});
         }},
        {"cipher suite 0 has no password",
         [] {
             return Collect({"--from", "lan:127.0.0.1", "--cipher-suite", "0"});
         }},
        {"is busy or has no free session",
         [] { return CollectLan({.options = {.hasFreeSession = false}}); }},
        {"numbers its answers wrongly",
         [] {
             using Numbers = ipmisim::RmcpDeviations::Numbers;
             return CollectLan({.options = {.deviations = {.numbers = Numbers::kZero}}});
         }},
        {"a password is needed and there is no terminal",
         [] {
             return Collect({"--from", "lan:127.0.0.1", "--user", "x"}, "");
         }},
    };
}

Provocations OfThisMachine() {
    return {
        {"cannot be read",
         [] {
             return Collect({"--from", "replay:" IPMISEL_EXAMPLES "/none"});
         }},
        {"does not belong into a configuration",
         [] {
             const TemporaryFolder folder;
             folder.Write("ipmisel.conf", "password = secret\n");
             Setting setting;
             setting.environment["XDG_CONFIG_HOME"] = folder.path().string();
             return RunningProgram(folder.path().string(), {IPMISEL_PROGRAM, "collect"}, setting)
                 .Wait();
         }},
        {"the pass ended with status",
         [] {
             const TemporaryFolder folder;
             const std::string server =
                 folder.Write("server.json",
                              R"({"bmcs": [{"device_id": "20 01 02 15 02 bf 57 01 00 00 01",)"
                              R"("sel": {"version": "50"}}],)"
                              R"("smbios": ["26 12 0030 01 2020 00 a30c000000000000 0105 0000"]})");
             return Collect({"--from", "sim:" + server, "--class", "QORSG_IPMILogRecord"});
         }},
        {"collected in part",
         [] {
             return Collect({"--from", "sim:" IPMISEL_EXAMPLES "/broken-bmc.json"});
         }},
    };
}

Provocations InNameSpaces() {
    return {
        {"the name server does not answer",
         [] { return CollectInside("-n", "exec", "--from lan:bmc.example --user x"); }},
        {"access is not allowed",
         [] {
             // The owner is not known in the inner name space, whose user is nobody.
             return CollectInside("-m",
                                  "mount -t tmpfs none /dev && : >/dev/ipmi0 && chmod 0 /dev/ipmi0 "
                                  "&& exec unshare -U",
                                  "");
         }},
        {"load the kernel modules",
         [] {
             return CollectInside(
                 "-m", "mount -t tmpfs none /dev; mount -t tmpfs none /sys/firmware; exec", "");
         }},
        {"No space left on device",
         [] {
             return CollectInside("-m", "mount -t tmpfs -o size=4k none /mnt && exec",
                                  "--from sim:" IPMISEL_EXAMPLES
                                  "/rack-server.json --output /mnt/report");
         }},
    };
}

TEST(ErrorLines, AreThoseOfTheManualAndSayWhatToDo) {
    Provocations all = OfTheNetwork();
    all.merge(OfThisMachine());
    Provocations inside = InNameSpaces();
    if (!HasNameSpaces()) {
        std::cout << "SKIPPED in part: name spaces of one's own are not to be had here\n";
        for (auto& [line, provoke] : inside) provoke = nullptr;
    }
    all.merge(inside);
    for (const auto& [line, exitStatus] : ManualRows()) {
        SCOPED_TRACE(line);
        const auto found = all.extract(line);
        ASSERT_FALSE(found.empty()) << "nothing provokes it";
        if (!found.mapped()) continue;
        const Ended ended = found.mapped()();
        EXPECT_EQ(ended.exitStatus, exitStatus);
        const std::string last = ended.err.substr(ended.err.rfind('\n', ended.err.size() - 2) + 1);
        EXPECT_THAT(last, testing::AllOf(HasSubstr(line), testing::StartsWith("ipmisel: "),
                                         HasSubstr("; ")))
            << ended.err;
    }
    for (const auto& [line, provoke] : all) ADD_FAILURE() << "not in the manual: " << line;
}

}  // namespace
