#include <gmock/gmock.h>

#include <chrono>
#include <functional>

#include "host/spdriver/source.h"
#include "tests/support/ipmi_sim.h"

namespace {

using ipmiseltest::IpmiSim;
using namespace ::testing;
using namespace tqrhost;

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
#ifndef IPMISEL_LAN
        GTEST_SKIP() << "built without access over the network";
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
    struct Change {
        std::function<void(SourceOptions*)> change;
        const char* reason;
    };
    void ExpectRefusals(const std::string& place, const std::vector<Change>& cases) {
        const SourceOptions good = options;
        for (const Change& c : cases) {
            c.change(&options);
            EXPECT_THAT(Refusal(place), HasSubstr(c.reason));
            options = good;
        }
    }
};

TEST_F(Lan, APlaceThatCannotBeIsRefusedAtOnce) {
    const struct {
        const char* place;
        const char* reason;
    } cases[] = {{":623", "no host is named"},
                 {"host:", "the port is no number from 1 to 65535"},
                 {"host:65536", "the port is no number from 1 to 65535"},
                 {"host:6x", "the port is no number from 1 to 65535"},
                 {"::1", "an IPv6 address stands in brackets"},
                 {"[::1", "the address has no closing bracket"},
                 {"[::1]x:623", "something stands between address and port"}};
    for (const auto& c : cases) {
        EXPECT_THAT(Refusal(c.place), HasSubstr(c.reason)) << c.place;
    }
    EXPECT_EQ(passwordsAsked, 0u);
}

TEST_F(Lan, AccessThatCannotBeIsRefusedAtOnce) {
    ExpectRefusals(
        "127.0.0.1",
        {{[](auto* o) { o->cipherSuite = 4; }, "cipher suite 4 is not supported; use 17 or 3"},
         {[](auto* o) { o->password = [] { return std::string(21, 'p'); }; },
          "password is longer than the 20 bytes"}});
}

TEST_F(Lan, ANameThatDoesNotResolveAndSilenceAreTold) {
    EXPECT_THAT(Refusal("no-such-host.invalid"),
                StartsWith("lan:no-such-host.invalid: the host name does not resolve"));
    options.timeoutSeconds = 0.5;
    const auto before = std::chrono::steady_clock::now();
    const std::string place = "127.0.0.1:" + std::to_string(ipmiseltest::FreeUdpPort());
    EXPECT_THAT(Refusal(place),
                StartsWith("lan:" + place + ": nobody listens there, or a firewall refuses"));
    EXPECT_LT(std::chrono::steady_clock::now() - before, std::chrono::seconds(5));
}

TEST_F(Lan, WhatFailsAtTheLogInIsToldApart) {
    if (!IpmiSim::Missing().empty()) GTEST_SKIP() << IpmiSim::Missing();
    IpmiSim sim({});
    ExpectRefusals(
        sim.Place(),
        {{[](auto* o) { o->password = [] { return std::string("wrong"); }; }, "wrong password"},
         {[](auto* o) { o->user = "nobody"; }, "does not know the user name"},
         {[](auto* o) { o->cipherSuite = 17; }, "the BMC"}});
    options.cipherSuite = 3;
    options.workarounds.clear();  // the privilege is named in Open Session, so it is granted there
    passwordsAsked = 0;
    EXPECT_EQ(OpenSources({"lan:" + sim.Place(), "lan:" + sim.Place()}, options).nodes.size(), 2u);
    EXPECT_EQ(passwordsAsked, 1u);
}

}  // namespace
