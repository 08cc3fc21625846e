#include <atomic>

#include "simulator/network_bmc.h"
#include "simulator/server_file.h"
#include "tests/program/store/store_fixture.h"

// What a visit with --new costs on the wire.

namespace ipmiseltest {
namespace {

using namespace ::testing;

constexpr std::size_t kMaxPacketsUnchanged = 12;

class NewOverTheNetwork : public StoreTest {
protected:
    /// Packets of the session, both ways, once it is open; and the events that were reported.
    std::pair<std::size_t, std::size_t> PacketsOf(const Controller& controller,
                                                  const std::vector<std::string>& more) {
        const std::string file = folder.Write("bmc.json", controller.Server().dump());
        std::atomic<std::size_t> packets = 0;
        // RMCP+ header: payload type in byte 5, encrypted and authenticated by bits 7 and 6; IPMI 0
        const auto inSession = [](const ipmisim::Packet& packet) {
            return packet.size() > 5 && packet[4] == 0x06 && (packet[5] & 0x3F) == 0 &&
                   (packet[5] & 0xC0) != 0;
        };
        ipmisim::NetworkBmc::Character character;
        character.receive = [&](ipmisim::NetworkBmc&, std::vector<ipmisim::Packet>* came) {
            for (const ipmisim::Packet& packet : *came) packets += inSession(packet) ? 1 : 0;
        };
        character.send = [&](ipmisim::NetworkBmc&, const ipmisim::Packet& packet) {
            packets += inSession(packet) ? 1 : 0;
            return std::vector<ipmisim::Packet>{packet};
        };
        const ipmisim::NetworkBmc bmc(ipmisim::ReadServerFile(file).bmcs.at(0), character);
        const std::string out = (folder.path() / "out").string();
        std::filesystem::remove(out);
        std::vector<std::string> arguments{"collect",
                                           "--from",
                                           bmc.Place(),
                                           "--user",
                                           "root",
                                           "--password-file",
                                           folder.Write("password", "secret\n"),
                                           "--name",
                                           "bmc",
                                           "--store",
                                           uri,
                                           "--format",
                                           "events",
                                           "--output",
                                           out};
        arguments.insert(arguments.end(), more.begin(), more.end());
        Result result = Run(arguments);
        EXPECT_EQ(result.exitStatus, 0) << result.err;
        result.out = ReadText(out);
        return {packets, result.Events().size()};
    }
};
INSTANTIATE_TEST_SUITE_P(, NewOverTheNetwork, Values(false), StoreName);

TEST_P(NewOverTheNetwork, CostsTwelvePacketsAtMostWhenNothingIsNew) {
    Controller bmc;
    for (int i = 0; i < 100; ++i) bmc.Grow();
    const auto [whole, all] = PacketsOf(bmc, {"--new"});
    EXPECT_EQ(all, 100U);
    const auto [unchanged, none] = PacketsOf(bmc, {"--new"});
    EXPECT_LE(unchanged, kMaxPacketsUnchanged);
    EXPECT_EQ(none, 0U);
    bmc.Grow();
    const auto [grown, one] = PacketsOf(bmc, {"--new"});
    EXPECT_EQ(one, 1U);
    // The records that are known are not read again: two packets each.
    EXPECT_LT(grown + 180, whole);
}

}  // namespace
}  // namespace ipmiseltest
