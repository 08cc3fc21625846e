#include "plugins/ipmisel/requests/request_sel.h"

#include "tests/support/bmc_fixture.h"
#include "tests/support/wire.h"

namespace {

using namespace ipmisel;
using ::testing::ElementsAre;
using ::testing::Pair;

class SelWalk : public ipmiseltest::BmcTest {
protected:
    s_SEL_row rows[4] = {};
    unsigned filled = 99;

    void AddEntries(std::initializer_list<std::uint16_t> ids) {
        for (const std::uint16_t id : ids) {
            bmc.selEntries.push_back(ipmiseltest::OtherRecord(id, 2));
        }
    }
    unsigned Walk(unsigned rowCount) {
        return IPMIRequestSEL(Library()).IPMIGetSELEntry(nullptr, rows, rowCount, &filled);
    }
};

TEST_F(SelWalk, FollowsTheRecordIdsAndTraces) {
    AddEntries({0x0001, 0x1234});
    IPMIRequestSEL request(Library());
    EXPECT_EQ(request.IPMIGetSELEntry(nullptr, rows, 2, &filled), kOk);
    EXPECT_EQ(filled, 2U);
    EXPECT_EQ(DumpBytes(requests.at(1), Digits::kUpperHex),
              "01 20 0A 00 43 06 00 00 00 00 00 34 12 00 FF ");
    const std::string frame = "Contents of buffer to send (rspBuf):\n\t1 32 10 0 67 \n\t6 0 0 0 0 ";
    const std::string tail = "02 11 12 13 14 15 16 17 18 19 1A 1B 1C 1D ";
    EXPECT_THAT(log.All(), ElementsAre(Pair(4, "IPMIRequestSEL::IPMIGetSELEntry() entered."),
                                       Pair(4, frame + "\n\t0 0 0 0 255 "),
                                       Pair(4, "buffer[0].data = 00 34 12 01 00 " + tail),
                                       Pair(4, frame + "\n\t0 52 18 0 255 "),
                                       Pair(4, "buffer[1].data = 00 FF FF 34 12 " + tail),
                                       Pair(4, "IPMIRequestSEL::IPMIGetSELEntry() completed.")));
    EXPECT_EQ(rows[1].data, "00 FF FF 34 12 " + tail);
    EXPECT_EQ(request.IPMIGetSELEntry(nullptr, rows, 2, &filled), kOk);
    EXPECT_EQ(requests.size(), 4U) << "a second walk reads the log whole again";
}

TEST_F(SelWalk, HighByteFfEndsTheWalk) {
    AddEntries({0x0001, 0x10FF, 0xFF10, 0x0003});
    EXPECT_EQ(Walk(4), kOk);
    EXPECT_EQ(filled, 2U);
}

TEST_F(SelWalk, FirstEntryIsStoredEvenForNoRows) {
    AddEntries({1, 2, 3, 4});
    for (const unsigned rowCount : {0U, 1U, 2U}) {
        rows[1] = rows[2] = {};
        requests.clear();
        EXPECT_EQ(Walk(rowCount), kOk);
        EXPECT_EQ(filled, std::max(rowCount, 1U));
        EXPECT_STREQ(rows[filled].data, "");
        EXPECT_EQ(requests.size(), 4U) << "what has no row is read and dropped";
    }
}

TEST_F(SelWalk, MissingAnswerInTheMiddleKeepsTheRowsAndIsTolerated) {
    AddEntries({1, 2, 3});
    Silence(ipmi::kGetSelEntry, 3);
    EXPECT_EQ(Walk(3), kOk);
    EXPECT_EQ(filled, 2U);
    EXPECT_THAT(log.Lines(kError), ElementsAre());
    const auto trace = log.Lines(kTrace);
    EXPECT_EQ(*(trace.end() - 2), "Failure in sending command to obtain SEL entry.\n");
    EXPECT_EQ(trace.back(), "IPMIRequestSEL::IPMIGetSELEntry() completed.");
}

}  // namespace
