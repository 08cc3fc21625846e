// The requests over a transport that the host would not let through: it claims any length, and
// leads every walk in a circle.

#include <gtest/gtest.h>

#include <algorithm>
#include <cstring>
#include <limits>

#include "host/spdriver/transport.h"
#include "plugins/ipmisel/requests/request_aux_log.h"
#include "plugins/ipmisel/requests/request_fru_locator.h"
#include "plugins/ipmisel/requests/request_sdr.h"
#include "plugins/ipmisel/requests/request_sel.h"

namespace {

/// The start of every reply, from the completion code on, the length claimed for it, and how many
/// there were.
std::vector<unsigned char> gReply;
int gLength;
int gClaimedLength;  // the room for the reply, as the last request claimed it
unsigned gSends;

}  // namespace

namespace NQORTQR20 {

struct SPLibrary::Impl {};
SPLibrary::SPLibrary(std::unique_ptr<NQORTQR20::Transport>, bool) {}
SPLibrary::~SPLibrary() = default;
bool SPLibrary::sendIPMICommand(unsigned char* buffer, int* length, int bufferSize, bool) {
    std::fill_n(buffer, bufferSize, static_cast<unsigned char>(0x51));
    buffer[frame::kCompletionCodeAt] = 0;
    gClaimedLength = *length;
    std::copy(gReply.begin(), gReply.end(), buffer + frame::kResponseAt);
    buffer[26] = static_cast<unsigned char>(++gSends);
    *length = gLength;
    return true;
}

}  // namespace NQORTQR20

namespace {

using namespace ipmisel;

TEST(Bounds, ClaimedLengthsAreBelievedAsFarAsTheBufferReaches) {
    NQORTQR20::SPLibrary library(nullptr);
    for (int i = -1; i <= 320; ++i) {
        gReply = {0, 0xFF, 0xFF, 0, 0, 0, 0x01};  // no next record; a full sensor record
        gSends = 0;
        const int length = i == 320 ? std::numeric_limits<int>::max() : i;
        gLength = length;
        const std::size_t reach =
            length < 0 ? 0 : std::min<std::size_t>(static_cast<std::size_t>(length) + 1, 248);
        s_SEL_row row;
        std::memset(row.data, 'x', sizeof row.data);
        IPMIRequestSEL(&library).IPMIGetSELEntry(nullptr, &row, 1);
        EXPECT_EQ(std::strlen(row.data), std::min<std::size_t>(3 * reach + 1, 57)) << length;
        EXPECT_EQ(gSends, 1U) << "the next record ID stands in the buffer: " << length;

        std::vector<s_SDR_entry> entries;
        unsigned char info[kSdrInfoTextLength];
        EXPECT_EQ(IPMIRequestSDR(&library).IPMIGetSDREntry(nullptr, &entries, info), kOk);
        for (const s_SDR_entry& entry : entries) {
            EXPECT_EQ(strnlen(entry.SDRHeaderData, 64), std::min<std::size_t>(3 * reach, 64));
            EXPECT_EQ(strnlen(entry.SDRUnitsData, 96), std::min<std::size_t>(3 * reach, 96));
        }
        unsigned count = 77;
        EXPECT_EQ(IPMIRequestSEL(&library).IPMIGetSELInfo(nullptr, &count), kFailed);
        IPMIRequestAuxLog aux(&library);
        EXPECT_EQ(aux.IPMIGetAuxLogStatus(&count), kOk);
        EXPECT_EQ(count, 0x5151U) << "stands in the buffer, whatever its length: " << length;

        IPMIFRULocator locator;
        IPMIRequestFRULocator fru(&library);
        EXPECT_EQ(fru.IPMIGetFRUData(nullptr, &locator, true), kOk);
        const std::size_t copied = std::min<std::size_t>(std::max<std::size_t>(reach, 2) - 2, 16);
        EXPECT_EQ(locator.GetFRUData()[255], copied == 16 ? 0x51 : 0) << length;
        EXPECT_EQ(locator.GetFRUData()[256], 0);
        gReply = {0};
        EXPECT_EQ(fru.IPMIGetSDRString(nullptr, &locator), kOk);
        EXPECT_EQ(locator.GetIDString().size(),
                  reach < 5 ? 0 : std::min<std::size_t>(reach - 4, 0x51))
            << length;
    }
}

TEST(Bounds, RoomThatIsClaimedForTheReply) {
    NQORTQR20::SPLibrary library(nullptr);
    gReply = {0};
    IPMIRequestFRULocator(&library).IPMIReserveSDR(nullptr);
    EXPECT_EQ(gClaimedLength, 312);
    IPMIRequestSDR(&library).IPMIReserveSDR(nullptr);
    EXPECT_EQ(gClaimedLength, 256);
}

TEST(Bounds, WalksThatNeverEndAreEnded) {
    NQORTQR20::SPLibrary library(nullptr);
    gReply = {0, 0x01, 0x00, 0x01, 0x00, 0x51, 0x03};
    gLength = 18;
    gSends = 0;
    std::vector<s_SEL_row> rows(0x10001);
    unsigned filled = 0;
    EXPECT_EQ(IPMIRequestSEL(&library).IPMIGetSELEntry(nullptr, rows.data(), 0x10001, &filled),
              kOk);
    EXPECT_EQ(gSends, 0x10000U);
    EXPECT_EQ(filled, 0x10000U);
    EXPECT_STREQ(rows[0].data + 54, "01 ") << "not overwritten";
    EXPECT_STREQ(rows[0x10000].data, "");

    std::vector<s_SDR_entry> entries;
    unsigned char info[kSdrInfoTextLength];
    gSends = 0;
    EXPECT_EQ(IPMIRequestSDR(&library).IPMIGetSDREntry(nullptr, &entries, info), kOk);
    EXPECT_EQ(gSends, 2 + 0x10000U);

    std::vector<IPMIFRULocator> locators;
    gReply[6] = 0x11;
    gSends = 0;
    EXPECT_EQ(IPMIRequestFRULocator(&library).IPMIGetSDREntry(nullptr, &locators), kOk);
    EXPECT_EQ(gSends, 1 + 2 * 0x10000U);
    EXPECT_EQ(locators.size(), 0x10000U);
}

}  // namespace
