#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <string>
#include <vector>

#include "host/spdriver/transport.h"
#include "tests/host/spdriver/requests.h"
#include "tests/support/ipmi_sim.h"

namespace {

using ipmiseltest::IpmiSim;
using ipmiseltest::ReadRequest;
using ipmiseltest::StorageRequest;
using ::testing::ElementsAreArray;
using ::testing::HasSubstr;
using ::testing::StartsWith;
using tqrhost::OpenSources;
using tqrhost::Response;
using tqrhost::SourceError;
using tqrhost::SourceOptions;

class Lan : public ::testing::Test {
protected:
    SourceOptions options;
    unsigned passwordsAsked = 0;

    Lan() {
        options.user = "root";
        options.password = [this] {
            ++passwordsAsked;
            return std::string("secret");
        };
        options.workarounds = {"opensesspriv"};
        options.timeoutSeconds = 5;
    }
    void SetUp() override {
#ifndef IPMISEL_FREEIPMI
        GTEST_SKIP() << "built without FreeIPMI";
#endif
    }
    std::string Refusal(const std::string& place) {
        try {
            OpenSources({"lan:" + place}, options);
        } catch (const SourceError& error) {
            return error.what();
        }
        return "";
    }
};

TEST_F(Lan, APlaceThatCannotBeIsRefusedAtOnce) {
    const struct {
        const char* place;
        const char* reason;
    } cases[] = {
        {":623", "no host is named"},
        {"[]:623", "no host is named"},
        {"host:", "the port is no number from 1 to 65535"},
        {"host:0", "the port is no number from 1 to 65535"},
        {"host:65536", "the port is no number from 1 to 65535"},
        {"host:6x", "the port is no number from 1 to 65535"},
        {"::1", "an IPv6 address stands in brackets"},
        {"[::1", "the address has no closing bracket"},
        {"[::1]x:623", "something stands between address and port"},
    };
    for (const auto& c : cases) {
        EXPECT_THAT(Refusal(c.place), HasSubstr(c.reason)) << c.place;
    }
    EXPECT_EQ(passwordsAsked, 0u);
}

TEST_F(Lan, AccessThatCannotBeIsRefusedAtOnce) {
    const SourceOptions good = options;
    options.privilege = "king";
    EXPECT_THAT(Refusal("127.0.0.1"), HasSubstr("\"king\"; use one of user, operator, admin"));
    options = good;
    options.workarounds = {"opensesspriv", "magic"};
    EXPECT_THAT(Refusal("127.0.0.1"), HasSubstr("\"magic\"; use one of authcap, "));
    options = good;
    options.cipherSuite = 4;
    EXPECT_THAT(Refusal("127.0.0.1"), HasSubstr("cipher suite 4 is not supported"));
    options = good;
    options.user = std::string(17, 'u');
    EXPECT_THAT(Refusal("127.0.0.1"), HasSubstr("user name is longer than the 16 bytes"));
    options = good;
    options.password = [] { return std::string(21, 'p'); };
    EXPECT_THAT(Refusal("127.0.0.1"), HasSubstr("password is longer than the 20 bytes"));
}

TEST_F(Lan, ANameThatDoesNotResolveAndSilenceAreTold) {
    EXPECT_THAT(Refusal("no-such-host.invalid"),
                StartsWith("lan:no-such-host.invalid: the host name does not resolve"));
    options.timeoutSeconds = 0.5;
    const auto before = std::chrono::steady_clock::now();
    const std::string place = "127.0.0.1:" + std::to_string(ipmiseltest::FreeUdpPort());
    EXPECT_THAT(Refusal(place), StartsWith("lan:" + place + ": no answer; check the address"));
    EXPECT_LT(std::chrono::steady_clock::now() - before, std::chrono::seconds(5));
}

/// The same over a BMC of OpenIPMI.
class LanSim : public Lan {
protected:
    void SetUp() override {
        Lan::SetUp();
        if (!IsSkipped() && !IpmiSim::Missing().empty()) GTEST_SKIP() << IpmiSim::Missing();
    }
    const std::vector<std::uint8_t> entry{0x01, 0x00, 0x02, 0x11, 0x12, 0x13, 0x14, 0x20,
                                          0x00, 0x04, 0x01, 0x30, 0x6F, 0xA1, 0xA2, 0xA3};
};

TEST_F(LanSim, TheLogIsReadFromSeveralNodes) {
    IpmiSim first({IpmiSim::SelLine(entry)});
    IpmiSim second({});
    const auto source = OpenSources({"lan:" + first.Place(), "lan:" + second.Place()}, options);
    EXPECT_TRUE(source.facts.ipmiLan);
    ASSERT_EQ(source.nodes.size(), 2u);
    EXPECT_EQ(passwordsAsked, 1u);
    const auto answer = source.nodes[0]->Exchange(ReadRequest(0x43, 0));
    std::vector<std::uint8_t> expected{0x00, 0xFF, 0xFF};
    expected.insert(expected.end(), entry.begin(), entry.end());
    ASSERT_TRUE(answer);
    ASSERT_EQ(answer->size(), expected.size());
    std::copy_n(answer->begin() + 6, 4, expected.begin() + 6);  // the time is ipmi_sim's own
    EXPECT_THAT(*answer, ElementsAreArray(expected));
    // Completion codes are answers.
    EXPECT_EQ(source.nodes[1]->Exchange(ReadRequest(0x43, 0)), Response{0xCB});
    EXPECT_EQ(source.nodes[0]->Exchange(StorageRequest(0x5B)), Response{0xC1});
}

TEST_F(LanSim, WrongUserPasswordAndSuiteAreToldApart) {
    IpmiSim sim({});
    const SourceOptions good = options;
    options.password = [] { return std::string("wrong"); };
    EXPECT_THAT(Refusal(sim.Place()), HasSubstr("wrong password"));
    options = good;
    options.user = "nobody";
    EXPECT_THAT(Refusal(sim.Place()), HasSubstr("does not know the user name"));
    options = good;
    options.workarounds.clear();
    EXPECT_THAT(Refusal(sim.Place()), HasSubstr("--workaround opensesspriv"));
    options = good;
    options.cipherSuite = 17;
    EXPECT_NE(Refusal(sim.Place()), "");
    options.cipherSuite = 3;
    EXPECT_EQ(Refusal(sim.Place()), "");
}

TEST_F(LanSim, ABmcThatFallsSilentGivesNoResponse) {
    IpmiSim sim({});
    options.timeoutSeconds = 0.5;
    const auto source = OpenSources({"lan:" + sim.Place()}, options);
    EXPECT_TRUE(source.nodes[0]->Exchange(StorageRequest(0x40)));
    sim.Stop();
    EXPECT_EQ(source.nodes[0]->Exchange(StorageRequest(0x40)), std::nullopt);
}

}  // namespace
