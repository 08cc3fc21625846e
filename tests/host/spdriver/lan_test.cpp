#include <gmock/gmock.h>

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
};

TEST_F(Lan, APlaceThatCannotBeIsRefusedAtOnce) {
    const struct {
        std::string place;
        const char* reason;
    } cases[] = {{":623", "no host is named"},
                 {std::string(301, 'h'), "hhh...: it is too long for a host"},
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

TEST_F(Lan, APasswordThatNoBmcTakesIsRefusedAtOnce) {
    options.password = [] { return std::string(21, 'p'); };
    EXPECT_THAT(Refusal("127.0.0.1"), HasSubstr("password is longer than the 20 bytes"));
}

TEST_F(Lan, ThePasswordIsAskedForOnceForAllBmcs) {
    if (!IpmiSim::Missing().empty()) GTEST_SKIP() << IpmiSim::Missing();
    IpmiSim sim({});
    options.cipherSuite = 3;
    options.workarounds.clear();  // the privilege is named in Open Session, so it is granted there
    EXPECT_EQ(OpenSources({"lan:" + sim.Place(), "lan:" + sim.Place()}, options).nodes.size(), 2u);
    EXPECT_EQ(passwordsAsked, 1u);
}

}  // namespace
