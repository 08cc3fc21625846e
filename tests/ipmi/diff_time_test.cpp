#include "ipmi/diff_time.h"

#include "tests/support/bmc_fixture.h"

namespace {

using ::testing::ElementsAre;
using ::testing::Pair;

class DiffTime : public ipmiseltest::BmcTest {
protected:
    DiffTime() {
        tqrhost::MachineFacts facts;
        facts.localTime = "20240305120304.000000+060";
        tqrhost::SetMachineFacts(facts);
    }
    ~DiffTime() override { tqrhost::SetMachineFacts({}); }
};

TEST_F(DiffTime, ComparesTheClocks) {
    const struct {
        std::uint32_t raw;
        const char* bmcTime;
        const char* difference;
        bool notBehind;
    } cases[] = {{1709640184, "20240305120304.000000+060", "00000000000000.000000:000", true},
                 {1709640185, "20240305120305.000000+060", "00000000000001.000000:000", true},
                 {1709640123, "20240305120203.000000+060", "00000000000101.000000:000", false},
                 {0xFFFFFFFF, "19691231235959.000000+060", "00019787120305.000000:000", false}};
    for (const auto& c : cases) {
        bmc.selTime = c.raw;
        NQORTQR20::SPLibrary library(
            std::make_unique<ipmiseltest::SimulatedTransport>(bmc, &requests));
        NQORTQR20::TCIMDateTime difference;
        bool notBehind = !c.notBehind;
        log.Clear();
        EXPECT_EQ(GetDiffTime(nullptr, &difference, &notBehind, &library), 0U);
        EXPECT_EQ(difference.ToString(), c.difference);
        EXPECT_EQ(notBehind, c.notBehind);
        EXPECT_THAT(log.All(),
                    ElementsAre(Pair(4, "GetDiffTime entered."),
                                Pair(4,
                                     "Contents of buffer to send (rspBuf):\n\t1 32 10 0 72 "
                                     "\n\t0 0 0 0 0 \n\t0 0 0 0 0 "),
                                Pair(4, "OSTime  = 20240305120304.000000+060"),
                                Pair(4, "BMCTime raw = " + std::to_string(static_cast<int>(c.raw))),
                                Pair(4, std::string("BMCTime = ") + c.bmcTime),
                                Pair(4, std::string("DiffTime = ") + c.difference),
                                Pair(4, "GetDiffTime completed.")));
    }
}

TEST_F(DiffTime, NothingWithoutALibraryObject) {
    EXPECT_EQ(GetDiffTime(nullptr, nullptr, nullptr, nullptr), 1U);
    EXPECT_THAT(log.All(),
                ElementsAre(Pair(4, "GetDiffTime entered."),
                            Pair(0, "Could not allocate memory for SPLibrary in DiffTime.")));
}

}  // namespace
