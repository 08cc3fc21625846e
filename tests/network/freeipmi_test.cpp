// FreeIPMI's client against the BMC of the simulator. What the BMC takes from both clients, and
// both take from it, is the standard and not a mistake that client and BMC share.

#include <freeipmi/freeipmi.h>
#include <gmock/gmock.h>

#include <array>
#include <memory>
#include <string>

#include "host/spdriver/source.h"
#include "simulator/network_bmc.h"

namespace {

using ipmisim::NetworkBmc;
using Bytes = std::vector<std::uint8_t>;

struct CloseContext {
    void operator()(ipmi_ctx_t context) const {
        ipmi_ctx_close(context);
        ipmi_ctx_destroy(context);
    }
};

/// Completion code and data of Get Device ID, as FreeIPMI gets them; empty when it fails.
Bytes AskWithFreeIpmi(const NetworkBmc& bmc, int suite, const std::string& kg, unsigned flags) {
    const std::unique_ptr<ipmi_ctx, CloseContext> context(ipmi_ctx_create());
    const std::string host = bmc.Place().substr(4);
    if (ipmi_ctx_open_outofband_2_0(
            context.get(), host.c_str(), ipmisim::kUser, ipmisim::kPassword,
            kg.empty() ? nullptr : reinterpret_cast<const unsigned char*>(kg.data()),
            static_cast<unsigned>(kg.size()), IPMI_PRIVILEGE_LEVEL_ADMIN,
            static_cast<std::uint8_t>(suite), 3000, 500, flags, IPMI_FLAGS_DEFAULT) < 0) {
        ADD_FAILURE() << ipmi_ctx_errormsg(context.get());
        return {};
    }
    const std::uint8_t command = 0x01;
    Bytes answer(64);
    const int length = ipmi_cmd_raw(context.get(), 0, 0x06, &command, 1, answer.data(),
                                    static_cast<unsigned>(answer.size()));
    answer.resize(length > 0 ? static_cast<std::size_t>(length) : 0);
    if (!answer.empty()) answer.erase(answer.begin());  // the command
    return answer;
}

Bytes AskWithOurs(const NetworkBmc& bmc, int suite, const std::string& kg,
                  const std::vector<std::string>& workarounds) {
    NQORTQR20::SourceOptions options;
    options.user = ipmisim::kUser;
    options.password = [] { return std::string(ipmisim::kPassword); };
    options.kg = [kg] { return Bytes(kg.begin(), kg.end()); };
    options.cipherSuite = suite;
    options.workarounds = workarounds;
    const NQORTQR20::Source source = NQORTQR20::OpenSources({bmc.Place()}, options);
    return tqrhost::ExchangeOver(*source.nodes[0].pipeline, ipmi::GetDeviceId()).value_or(Bytes());
}

TEST(FreeIpmi, TakesFromTheSimulatedBmcWhatWeTakeInEverySuiteAndDeviation) {
    const struct {
        const char* kg;
        ipmisim::RmcpDeviations deviations;
        unsigned flags;
        std::vector<std::string> workarounds;
    } cases[] = {
        {"", {}, 0, {}},
        {"key of the BMC", {}, 0, {}},
        {"",
         {.paddedUserName = true},
         IPMI_WORKAROUND_FLAGS_OUTOFBAND_2_0_INTEL_2_0_SESSION,
         {"intel20"}},
        {"",
         {.longRakp2Code = true},
         IPMI_WORKAROUND_FLAGS_OUTOFBAND_2_0_SUPERMICRO_2_0_SESSION,
         {"supermicro20"}},
        {"",
         {.badChecksums = true},
         IPMI_WORKAROUND_FLAGS_OUTOFBAND_2_0_NO_CHECKSUM_CHECK,
         {"nochecksumcheck"}},
    };
    ipmisim::BmcDescription bmc;
    bmc.deviceId = Bytes{0x20, 1, 2, 0x15, 2, 0xBF, 0x57, 1, 0, 0, 1};
    Bytes expected = *bmc.deviceId;
    expected.insert(expected.begin(), 0);
    for (const int suite : {1, 2, 3, 15, 16, 17}) {
        for (const auto& c : cases) {
            // FreeIPMI knows these two for the suites of their time.
            if (suite > 3 && (c.deviations.longRakp2Code || c.deviations.paddedUserName)) continue;
            const NetworkBmc peer(
                bmc, {.options = {.cipherSuite = suite, .kg = c.kg, .deviations = c.deviations}});
            EXPECT_EQ(AskWithFreeIpmi(peer, suite, c.kg, c.flags), expected)
                << suite << " " << c.flags;
            EXPECT_EQ(AskWithOurs(peer, suite, c.kg, c.workarounds), expected)
                << suite << " " << c.flags;
        }
    }
}

}  // namespace
