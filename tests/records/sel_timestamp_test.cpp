#include <gmock/gmock.h>

#include <limits>

#include "base/text.h"
#include "host/core/host.h"
#include "records/sel_entry.h"
#include "records/sel_texts.h"
#include "tests/records/text_field.h"
#include "tests/support/bmc_fixture.h"

namespace {

using ::testing::ElementsAre;
using ::testing::Pair;

class Timestamp : public ::testing::Test {
protected:
    ipmiseltest::LogRecorder log;

    void SetUp() override {
        tqrhost::MachineFacts facts;
        facts.localTime = "20240305120304.000000+060";
        tqrhost::SetMachineFacts(facts);
    }
    void TearDown() override { tqrhost::SetMachineFacts({}); }
};

TEST_F(Timestamp, IsTheCalendarTimeWithTheLocalOffset) {
    const struct {
        int raw;
        std::string time;
        const char* addition;
    } cases[] = {{0, "19700101000000", "Adding 0 hours to Timestamp."},
                 {0x1FFFFFFF, "19870105184831", "Adding 0 hours to Timestamp."},
                 {0x20000000, "19870105184832", "No addition to Timestamp."},
                 {0x65E70304, "20240305113324", "No addition to Timestamp."},
                 {-1, "19691231235959", "Adding 0 hours to Timestamp."}};
    for (const auto& c : cases) {
        const std::string expected = c.time + ".000000+060";
        IPMISELEntry entry;
        const s_SEL_row row = ipmiseltest::Row(
            ipmisel::Format("0 0 0 1 0 2 %x %x %x %x", c.raw & 0xFF, c.raw >> 8 & 0xFF,
                            c.raw >> 16 & 0xFF, c.raw >> 24 & 0xFF));
        ASSERT_EQ(entry.ScanSELDataFile(nullptr, &row, 0), 0U);
        log.Clear();
        char out[64] = {};
        EXPECT_EQ(entry.CopyTimestamp(nullptr, out, sizeof out, nullptr, {}, true, true), 0U);
        EXPECT_EQ(out, expected);
        EXPECT_THAT(
            log.Lines(4),
            ElementsAre(
                "IPMISELEntry::GetTimestamp() function entered.", c.addition,
                "RawTimeStamp = " + std::to_string(c.raw) + "\n         PreTimeStamp = " + expected,
                "Timestamp = " + expected, "IPMISELEntry::GetTimestamp() function completed."));
        char boot[5] = "####";
        entry.CopyOSBootTimestamp(nullptr, boot, 4, nullptr, {}, false, false);
        EXPECT_EQ(boot, c.time.substr(0, 4));
    }
}

TEST_F(Timestamp, BeyondTheCalendarIsNoTime) {
    EXPECT_EQ(ipmisel::TimestampText(std::numeric_limits<std::int64_t>::max(), 60),
              "19700101000000.000000+000");
    const std::string reason = NQORTQR20::TTQRStatusCode{21}.TranslateStatusCode();
    EXPECT_THAT(log.All(),
                ElementsAre(Pair(3, "Could not convert CurrentTimeStamp."),
                            Pair(2, "Unable to obtain Timestamp due to caught exception " + reason +
                                        ". Using default Timestamp (1/2/1970).")));
}

}  // namespace
