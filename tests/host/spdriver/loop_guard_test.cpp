#include "host/spdriver/loop_guard.h"

#include "tests/host/spdriver/requests.h"
#include "tests/support/bmc_fixture.h"
#include "tests/support/wire.h"

namespace ipmiseltest {
namespace {

constexpr ipmi::CommandCode kSel = ipmi::kGetSelEntry, kSdr = ipmi::kGetSdr;

/// Both walks over a BMC whose records have the given IDs; of two with one ID the first is found,
/// so that a repeated ID closes a circle.
class Guard : public ::testing::TestWithParam<ipmi::CommandCode> {
protected:
    std::vector<std::vector<std::uint8_t>> asked;
    std::unique_ptr<tqrhost::LoopGuard> guard;

    void Records(const std::vector<std::uint16_t>& ids, std::vector<ipmisim::Fault> faults = {}) {
        ipmisim::BmcDescription bmc;
        for (const std::uint16_t id : ids) {
            bmc.selEntries.push_back({Low(id), High(id)});
            bmc.sdrRecords.push_back({Low(id), High(id), 0x51, 0x01, 0x00});
        }
        bmc.faults = std::move(faults);
        guard =
            std::make_unique<tqrhost::LoopGuard>(std::make_unique<SimulatedTransport>(bmc, &asked));
    }
    bool Read(std::uint16_t id, ipmi::CommandCode command = GetParam()) {
        const auto answer = guard->Exchange(ReadRequest(command, id));
        return answer && answer->front() == 0;
    }
    void Send(ipmi::CommandCode command) { guard->Exchange(RequestOf(command)); }
    /// Reads along the chain; the number of records that were given.
    unsigned Walk() {
        std::uint16_t id = 0;
        for (unsigned given = 0; given < 10; ++given) {
            const auto answer = guard->Exchange(ReadRequest(GetParam(), id));
            if (!answer || answer->front() != 0) return given;
            id = static_cast<std::uint16_t>((*answer)[1] | (*answer)[2] << 8);
            if (id == 0xFFFF) return given + 1;
        }
        return 10;
    }
};

INSTANTIATE_TEST_SUITE_P(Commands, Guard, ::testing::Values(kSel, kSdr));

TEST_P(Guard, AWalkGivesEachRecordOnceAndCanBeMadeAgain) {
    const struct {
        const char* what;
        std::vector<std::uint16_t> ids;
        unsigned given;
    } cases[] = {{"no circle", {1, 2, 3}, 3},
                 {"back to the middle", {1, 2, 3, 2}, 3},
                 {"back to the first by its own ID", {1, 2, 1}, 2},
                 {"back to the first by 0x0000", {1, 2, 0}, 2},
                 {"on the spot", {1, 2, 2}, 2}};
    for (const auto& c : cases) {
        Records(c.ids);
        EXPECT_EQ(Walk(), c.given) << c.what;
        EXPECT_EQ(Walk(), c.given) << c.what;
    }
}

TEST_P(Guard, AFailedReadEndsTheWalk) {
    for (const auto kind :
         {ipmisim::Fault::Kind::kNoResponse, ipmisim::Fault::Kind::kCompletionCode}) {
        Records({1, 2, 3}, {{GetParam().netFn, GetParam().number, 2, kind, 0xCB, 0, {}}});
        EXPECT_EQ(Walk(), 1u);
        EXPECT_EQ(Walk(), 3u);
    }
}

TEST_P(Guard, TheCommandsThatBeginAWalkForgetTheLast) {
    const bool isSel = GetParam() == kSel;
    for (const ipmi::CommandCode begin :
         {isSel ? ipmi::kGetSelInfo : ipmi::kReserveSdrRepository,
          isSel ? ipmi::kGetSelInfo : ipmi::kGetSdrRepositoryInfo}) {
        Records({1, 2, 3});
        EXPECT_TRUE(Read(0) && Read(2));
        Send(isSel ? ipmi::kReserveSdrRepository : ipmi::kGetSelInfo);  // begins the other walk
        EXPECT_FALSE(Read(2));
        EXPECT_TRUE(Read(0) && Read(2));
        Send(begin);
        EXPECT_TRUE(Read(0) && Read(2));
    }
}

TEST_P(Guard, OtherPartsOfTheLastRecordAreGivenAfterIt) {
    Records({1});
    Send(ipmi::kReserveSdrRepository);
    const auto part = [](std::uint8_t offset) {
        return RequestOf(GetParam(), {1, 0, 0, 0, offset, 1});
    };
    EXPECT_TRUE(guard->Exchange(part(0)) && guard->Exchange(part(2)) && guard->Exchange(part(3)));
    EXPECT_FALSE(guard->Exchange(part(2)));
}

// A walk over the event log ends at any next record ID of 0xFFxx; the locator walk goes on.
TEST_P(Guard, OnlyTheEventLogEndsAtAHighByteFf) {
    Records({1, 0xFF10, 2});
    EXPECT_TRUE(Read(0));
    EXPECT_EQ(Read(0), GetParam() == kSel);
}

}  // namespace
}  // namespace ipmiseltest
