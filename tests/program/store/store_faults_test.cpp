#include <chrono>
#include <map>
#include <random>
#include <thread>

#include "tests/program/store/store_fixture.h"
#include "tests/support/ipmi_sim.h"

// What takes its time: histories by the hundred, kills by the hundred, several at once, another's
// BMC.

namespace ipmiseltest {
namespace {

using namespace ::testing;

constexpr int kSqliteHistories = 500;
constexpr int kPostgresqlHistories = 60;
constexpr int kSqliteKills = 200;
constexpr int kPostgresqlKills = 40;

using Random = std::mt19937;

std::size_t Pick(Random& random, std::size_t below) {
    return std::uniform_int_distribution<std::size_t>(0, below - 1)(random);
}

/// Something that happens to a log between two visits.
void Happen(Random& random, Controller* bmc, unsigned* replaced) {
    switch (Pick(random, 12)) {
        case 0:
            bmc->Clear();
            break;
        case 1:
            bmc->Clear();
            if (Pick(random, 2) == 0) bmc->nextId = 100;  // some go on counting
            for (std::size_t i = Pick(random, 6); i > 0; --i) bmc->Grow();
            break;
        case 2:
            for (std::size_t i = Pick(random, 8) + 1; i > 0; --i) bmc->Wrap();
            break;
        case 3:
            if (!bmc->log.empty()) bmc->Erase(Pick(random, bmc->log.size()));
            break;
        case 4:
            if (!bmc->log.empty()) bmc->Erase(Pick(random, bmc->log.size()));
            for (std::size_t i = Pick(random, 4); i > 0; --i) bmc->Grow(Pick(random, 2) == 0);
            break;
        case 5:
            bmc->clock -= static_cast<std::uint32_t>(Pick(random, 1000000));
            bmc->Grow();
            break;
        case 6:
            bmc->Replace(++*replaced);
            break;
        case 7:  // IDs run over
            bmc->nextId = static_cast<std::uint16_t>(0xFFFE - Pick(random, 2));
            bmc->Grow();
            if (bmc->nextId >= 0xFFFF) bmc->nextId = 1;
            bmc->Clear();
            bmc->Grow();
            break;
        case 8:
            break;
        default:
            for (std::size_t i = Pick(random, 9) + 1; i > 0; --i) bmc->Grow(Pick(random, 2) == 0);
            break;
    }
}

std::set<std::string> SetOf(const std::vector<std::string>& texts) {
    return {texts.begin(), texts.end()};
}

class StoreFaults : public StoreTest {
protected:
    std::vector<std::string> Present() {
        return Column(
            "SELECT raw FROM events e JOIN systems s ON s.id = e.system"
            " WHERE e.gone IS NULL AND s.gone IS NULL ORDER BY e.position");
    }
    /// Each event of each system once, by its record.
    std::vector<std::string> Stored() {
        return Column("SELECT s.guid || e.raw FROM events e JOIN systems s ON s.id = e.system");
    }
    /// The problems of a controller, as a collection without a store tells them.
    std::vector<std::string> Findings(const Controller& bmc) {
        const std::string out = (folder.path() / "findings").string();
        std::filesystem::remove(out);
        const Result plain =
            Run({"collect", "--from", "sim:" + folder.Write("bmc.json", bmc.Server().dump()),
                 "--class", "IPMI_Finding", "--format", "json", "--output", out});
        EXPECT_EQ(plain.exitStatus, 0) << plain.err;
        std::vector<std::string> findings;
        const Json report = Json::parse(ReadText(out));
        for (const Json& instance : report["instances"]) {
            const Json& finding = instance["properties"];
            findings.push_back(finding["Severity"].get<std::string>() + " " +
                               finding["Title"].get<std::string>() + " " + finding["Count"].dump());
        }
        return findings;
    }
    /// They are those of the store; an acknowledgement holds until there is a further event of it.
    void ExpectFindings(const Controller& bmc, Random& random) {
        std::vector<std::string> stored;
        const auto open = ipmisel::Store(uri).OpenFindings({"bmc"});
        for (const ipmisel::StoredFinding& finding : open) {
            stored.push_back(finding.severity + " " + finding.title + " " +
                             std::to_string(finding.count));
            const auto held = acknowledged_.find(finding.key);
            const bool holds = held != acknowledged_.end() && held->second == LastEvent(finding);
            EXPECT_EQ(finding.acknowledged, holds) << finding.title;
        }
        ASSERT_EQ(stored, Findings(bmc));
        std::map<std::string, std::string> still;
        for (const ipmisel::StoredFinding& finding : open) {
            if (finding.acknowledged) still[finding.key] = LastEvent(finding);
        }
        acknowledged_ = std::move(still);
        if (open.empty() || Pick(random, 2) == 0) return;
        const ipmisel::StoredFinding& one = open[Pick(random, open.size())];
        EXPECT_EQ(ipmisel::Store(uri).Acknowledge(one.key, {}, "test", "", 1), 1U);
        acknowledged_[one.key] = LastEvent(one);
    }
    static std::string LastEvent(const ipmisel::StoredFinding& finding) {
        return Json::parse(finding.properties)["Events"].back();
    }
    void NewUri(int number) {
        acknowledged_.clear();
        uri = GetParam() ? PostgresqlServer::Get()->FreshUri()
                         : "sqlite:" + databases.path() + "/" + std::to_string(number) + ".db";
    }

private:
    std::map<std::string, std::string> acknowledged_;  ///< last event by key
};
INSTANTIATE_TEST_SUITE_P(, StoreFaults, Values(false, true), StoreName);

TEST_P(StoreFaults, AllRunsTogetherGaveWhatWasEverInTheLogAtAVisit) {
    const int histories = GetParam() ? kPostgresqlHistories : kSqliteHistories;
    for (int seed = 0; seed < histories && !HasFailure(); ++seed) {
        SCOPED_TRACE("seed " + std::to_string(seed));
        NewUri(seed);
        Random random(static_cast<unsigned>(seed));
        Controller bmc;
        unsigned replaced = 0;
        std::set<std::string> ever;  // by GUID
        std::vector<std::string> given;
        std::size_t systems = 0;
        for (std::size_t visits = 3 + Pick(random, 4); visits > 0; --visits) {
            const std::string guid = bmc.guid;
            for (std::size_t n = Pick(random, 3); n > 0; --n) Happen(random, &bmc, &replaced);
            if (guid != bmc.guid || systems == 0) ++systems;
            std::vector<std::string> log;
            for (const RawRecord& record : bmc.log) {
                log.push_back(Raw(record));
                ever.insert(bmc.guid + Raw(record));
            }
            const Result visit = Visit(bmc.Server());
            ASSERT_EQ(visit.exitStatus, 0) << visit.err;
            for (const std::string& raw : visit.Raws()) given.push_back(bmc.guid + raw);
            ASSERT_EQ(Present(), log);
            if (seed % 5 == 0) ExpectFindings(bmc, random);  // takes most of the time
        }
        EXPECT_EQ(SetOf(given), ever);
        EXPECT_EQ(given.size(), ever.size()) << "an event was given twice";
        EXPECT_EQ(Stored().size(), ever.size());
        if (!GetParam()) std::filesystem::remove(uri.substr(uri.find(':') + 1));
    }
}

TEST_P(StoreFaults, AKillAtAnyMomentLosesNothingAndDoublesNothing) {
    const int kills = GetParam() ? kPostgresqlKills : kSqliteKills;
    Random random(1);
    Controller bmc;
    std::set<std::string> ever;
    int killed = 0;
    // Until a moment before which most runs have not ended, however fast the machine is.
    std::size_t latest = 60000;
    const auto grow = [&] {
        for (std::size_t n = Pick(random, 20) + 1; n > 0; --n) bmc.Grow();
        if (Pick(random, 10) == 0) bmc.Clear();
    };
    for (int i = 0; i < kills; ++i) {
        grow();
        const std::string source = "sim:" + folder.Write("bmc.json", bmc.Server().dump());
        RunningProgram program(folder.path().string(),
                               {IPMISEL_PROGRAM, "collect", "--from", source, "--store", uri,
                                "--new", "--format", "events"});
        std::this_thread::sleep_for(std::chrono::microseconds(Pick(random, latest)));
        program.Signal(SIGKILL);
        const bool wasKilled = program.Wait().signal == SIGKILL;
        killed += wasKilled ? 1 : 0;
        latest = wasKilled ? latest * 9 / 8 : std::max<std::size_t>(latest * 3 / 4, 1000);
        if (Pick(random, 4) != 0) continue;  // several killed in a row
        const Result visit = Visit(bmc.Server());
        ASSERT_EQ(visit.exitStatus, 0) << visit.err;
        std::vector<std::string> log;
        for (const RawRecord& record : bmc.log) log.push_back(Raw(record));
        for (const std::string& raw : log) ever.insert(raw);
        ASSERT_EQ(Present(), log);
    }
    Visit(bmc.Server());
    // What only a killed visit saw may be there too, if it had come to its end.
    const auto stored = Column("SELECT raw FROM events");
    EXPECT_EQ(SetOf(stored).size(), stored.size());
    EXPECT_THAT(SetOf(stored), IsSupersetOf(ever));
    EXPECT_GT(killed, kills / 3);
    RecordProperty("killed", killed);
}

TEST_P(StoreFaults, SeveralAtOnceStoreEachEventOnce) {
    Controller bmc;
    for (int i = 0; i < 50; ++i) bmc.Grow();
    constexpr int kAtOnce = 8;
    const std::string source = "sim:" + folder.Write("bmc.json", bmc.Server().dump());
    std::vector<std::unique_ptr<TemporaryFolder>> folders;
    std::vector<std::unique_ptr<RunningProgram>> programs;
    for (int i = 0; i < kAtOnce; ++i) {
        folders.push_back(std::make_unique<TemporaryFolder>());
        programs.push_back(std::make_unique<RunningProgram>(
            folders.back()->path().string(),
            std::vector<std::string>{IPMISEL_PROGRAM, "collect", "--from", source, "--name",
                                     i % 2 == 0 ? "bmc" : "other", "--store", uri}));
    }
    for (const auto& program : programs) {
        const Ended ended = program->Wait();
        EXPECT_EQ(ended.exitStatus, 0) << ended.err;
    }
    EXPECT_EQ(Column("SELECT key FROM events").size(), 2 * bmc.log.size());
    EXPECT_EQ(Column("SELECT name FROM systems").size(), 2U);
}

TEST_P(StoreFaults, AnothersBmcIsReadToTheSameUnion) {
    if (!IpmiSim::Missing().empty()) GTEST_SKIP() << IpmiSim::Missing();
    if (std::system("command -v ipmitool >/dev/null") != 0) {
        GTEST_SKIP() << "ipmitool is not installed (package ipmitool)";
    }
    for (unsigned seed = 0; seed < 3 && !HasFailure(); ++seed) {
        NewUri(static_cast<int>(seed));
        Random random(seed);
        const IpmiSim sim({});
        const std::string place = sim.Place();
        const auto tool = [&](const std::string& command) {
            const std::string line = "ipmitool -I lanplus -C 3 -H 127.0.0.1 -p " +
                                     place.substr(place.find(':') + 1) + " -U root -P secret " +
                                     command + " >/dev/null 2>&1";
            return std::system(line.c_str()) == 0;
        };
        const std::string password = folder.Write("password", "secret\n");
        std::vector<std::string> given;
        std::set<std::string> ever;
        for (int visit = 0; visit < 4; ++visit) {
            if (visit > 0 && Pick(random, 3) == 0) {
                ASSERT_TRUE(tool("sel clear"));
            }
            for (std::size_t n = Pick(random, 4); n > 0; --n) {
                // Platform event: a temperature, its upper critical limit
                ASSERT_TRUE(tool("raw 0x0a 0x44 0 0 2 0 0 0 0 0x20 0 4 1 0x30 1 0x59 " +
                                 std::to_string(Pick(random, 200)) + " 0x45"));
            }
            const std::vector<std::string> access{
                "collect", "--from",       "lan:" + place, "--user", "root", "--password-file",
                password,  "--workaround", "opensesspriv", "--name", "sim",  "--format",
                "events"};
            const auto raws = [&](std::vector<std::string> more) {
                const std::string out = (folder.path() / "out").string();
                std::filesystem::remove(out);
                more.insert(more.begin(), access.begin(), access.end());
                more.insert(more.end(), {"--output", out});
                Result result = Run(more);
                EXPECT_EQ(result.exitStatus, 0) << result.err;
                result.out = ReadText(out);
                return result.Raws();
            };
            for (const std::string& raw : raws({})) ever.insert(raw);
            for (const std::string& raw : raws({"--store", uri, "--new"})) given.push_back(raw);
        }
        EXPECT_EQ(SetOf(given), ever);
        EXPECT_EQ(given.size(), ever.size());
    }
}

}  // namespace
}  // namespace ipmiseltest
