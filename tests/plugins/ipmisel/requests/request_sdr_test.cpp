#include "plugins/ipmisel/requests/request_sdr.h"

#include <algorithm>
#include <numeric>

#include "tests/support/bmc_fixture.h"
#include "tests/support/wire.h"

namespace {

using namespace ipmisel;
using ::testing::ElementsAre;

class SdrWalk : public ipmiseltest::BmcTest {
protected:
    std::vector<s_SDR_entry> entries;
    unsigned char info[kSdrInfoTextLength] = {};

    /// A record of 64 bytes whose byte i is i, but for ID and type.
    void AddRecord(std::uint16_t id, std::uint8_t type) {
        ipmisim::Bytes record(64);
        std::iota(record.begin(), record.end(), std::uint8_t{0});
        record[0] = ipmiseltest::Low(id);
        record[1] = ipmiseltest::High(id);
        record[3] = type;
        bmc.sdrRecords.push_back(record);
    }
    unsigned Walk() { return IPMIRequestSDR(Library()).IPMIGetSDREntry(nullptr, &entries, info); }
};

TEST_F(SdrWalk, ReadsThreePiecesOfFullAndCompactRecords) {
    AddRecord(0x0001, 1);
    AddRecord(0x1234, 2);
    EXPECT_EQ(Walk(), kOk);
    EXPECT_EQ(std::string(info, std::find(info, info + sizeof info, 0)),
              "00 51 02 00 7F FF FF FF FF FF FF FF FF FF 02 ");
    ASSERT_EQ(entries.size(), 2U);
    EXPECT_STREQ(entries[0].SDRHeaderData, "00 34 12 01 00 02 01 04 05 06 07 08 09 ");
    EXPECT_STREQ(entries[0].SDRUnitsData, "00 34 12 14 15 16 17 18 19 1A 1B 1C 1D ");
    EXPECT_STREQ(entries[0].SDRStringData,
                 "00 34 12 2F 30 31 32 33 34 35 36 37 38 39 3A 3B 3C 3D "
                 "3E 3F ");
    EXPECT_EQ(std::string(entries[1].SDRStringData, 64),
              "00 FF FF 1F 20 21 22 23 24 25 26 27 28 29 2A 2B 2C 2D 2E 2F 30 3");
    EXPECT_THAT(Frames(), ElementsAre("01 20 0A 00 20 00 00 00 00 00 00 00 00 00 00 ",
                                      "01 20 0A 00 22 00 00 00 00 00 00 00 00 00 00 ",
                                      "01 20 0A 00 23 06 00 00 00 01 00 00 00 00 0A ",
                                      "01 20 0A 00 23 06 00 00 00 01 00 00 00 14 0A ",
                                      "01 20 0A 00 23 06 00 00 00 01 00 00 00 2F FF ",
                                      "01 20 0A 00 23 06 00 00 00 01 00 34 12 00 0A ",
                                      "01 20 0A 00 23 06 00 00 00 01 00 34 12 14 0A ",
                                      "01 20 0A 00 23 06 00 00 00 01 00 34 12 1F FF "));
}

TEST_F(SdrWalk, OtherRecordTypesAreSkipped) {
    AddRecord(1, 3);
    EXPECT_EQ(Walk(), kOk);
    EXPECT_TRUE(entries.empty());
    auto trace = log.Lines(kTrace);
    EXPECT_EQ(log.All().size(), trace.size());
    trace.erase(trace.begin(), trace.end() - 4);
    EXPECT_THAT(trace, ElementsAre("IPMIRequestSDR::IPMIReserveSDR() completed.",
                                   "IPMIRequestSDR::IPMIGetSDRHeader() entered.",
                                   "Contents of buffer to send (rspBuf):\n\t01 20 0A 00 23 "
                                   "\n\t06 00 00 00 01 \n\t00 00 00 00 0A ",
                                   "IPMIRequestSDR::IPMIGetSDREntry() completed."));
}

TEST_F(SdrWalk, AnyFfByteEndsTheWalk) {
    for (const std::uint16_t next : {0x12FF, 0xFF12}) {
        bmc.sdrRecords.clear();
        entries.clear();
        AddRecord(1, 1);
        AddRecord(next, 1);
        FreshLibrary();
        EXPECT_EQ(Walk(), kOk);
        EXPECT_EQ(entries.size(), 1U) << next;
    }
}

}  // namespace
