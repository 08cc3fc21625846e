#include "ipmi/request_sel.h"

#include "tests/support/bmc_fixture.h"

namespace {

using namespace ipmisel;
using ::testing::ElementsAre;
using ::testing::Pair;

class SelWalk : public ipmiseltest::BmcTest {
protected:
    s_SEL_row rows[4] = {};
    unsigned filled = 99;

    void AddEntries(std::initializer_list<int> ids) {
        for (const int id : ids) {
            const auto low = static_cast<std::uint8_t>(id),
                       high = static_cast<std::uint8_t>(id >> 8);
            bmc.selEntries.push_back({low, high, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11, 12, 13, 14, 0xAF});
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
    const std::string tail = "02 03 04 05 06 07 08 09 0A 0B 0C 0D 0E AF ";
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

TEST_F(SelWalk, EntriesBeyondTheRowsAreReadAndDropped) {
    AddEntries({1, 2, 3, 4});
    EXPECT_EQ(Walk(2), kOk);
    EXPECT_EQ(filled, 2U);
    EXPECT_EQ(requests.size(), 4U);
    EXPECT_STREQ(rows[2].data, "");
}

TEST_F(SelWalk, FirstEntryIsStoredEvenForNoRows) {
    AddEntries({1, 2});
    EXPECT_EQ(Walk(0), kOk);
    EXPECT_EQ(filled, 1U);
    EXPECT_STREQ(rows[1].data, "");
}

TEST_F(SelWalk, MissingAnswerInTheMiddleKeepsTheRowsAndIsTolerated) {
    AddEntries({1, 2, 3});
    Silence(0x43, 3);
    EXPECT_EQ(Walk(3), kOk);
    EXPECT_EQ(filled, 2U);
    EXPECT_THAT(log.Lines(kError), ElementsAre());
    const auto trace = log.Lines(kTrace);
    EXPECT_EQ(*(trace.end() - 2), "Failure in sending command to obtain SEL entry.\n");
    EXPECT_EQ(trace.back(), "IPMIRequestSEL::IPMIGetSELEntry() completed.");
}

TEST_F(SelWalk, CompletionCodeOnThirdReadKeepsTheFirstTwoRows) {
    AddEntries({1, 2, 3});
    FailWith(0x43, 3, 0xCB);
    EXPECT_EQ(Walk(3), kFailed);
    EXPECT_EQ(filled, 2U);
}

}  // namespace
