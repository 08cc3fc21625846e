#include "host/spdriver/reading.h"

#include <gmock/gmock.h>

#include "host/spdriver/completeness.h"
#include "tests/host/spdriver/windowed_pipeline.h"
#include "tests/support/wire.h"
#include "tqr/splibrary.h"

namespace ipmiseltest {
namespace {

using NQORTQR20::Response;
using ::testing::Contains;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using Answer = std::optional<Response>;

class Reading : public ::testing::Test {
protected:
    ipmisim::BmcDescription bmc;
    std::vector<ipmi::Command> asked;
    NQORTQR20::Source source;

    Reading() { bmc.selTime = 1; }
    ~Reading() override { NQORTQR20::CloseMachine(); }

    void Describe(std::uint16_t events, std::uint16_t sensors, unsigned step = 1) {
        bmc.selEntries.clear();
        bmc.sdrRecords.clear();
        for (unsigned i = 1; i <= events; ++i) {
            bmc.selEntries.push_back(SystemEvent(static_cast<std::uint16_t>(1 + (i - 1) * step), 1,
                                                 static_cast<std::uint8_t>(i)));
        }
        for (unsigned i = 1; i <= sensors; ++i) {
            bmc.sdrRecords.push_back(FullSensor(static_cast<std::uint16_t>(1 + (i - 1) * step),
                                                static_cast<std::uint8_t>(i), 7, 1, "Sensor name"));
        }
    }
    void Read(WindowedPipeline::Conditions conditions, NQORTQR20::ReadingNeeds needs = {}) {
        asked.clear();
        source = {};
        source.nodes.push_back(
            {"lan:h", nullptr,
             std::make_unique<WindowedPipeline>(bmc, std::move(conditions), &asked)});
        NQORTQR20::ReadLiveNodes(source, needs);
    }
    Answer Ask(const ipmi::Command& command) {
        return source.nodes[0].transport->Exchange(NQORTQR20::RequestFrame(command));
    }
    std::size_t Asked(ipmi::CommandCode code) const {
        return static_cast<std::size_t>(std::count_if(
            asked.begin(), asked.end(), [&](const auto& c) { return c.code() == code; }));
    }
    /// Walks the log as the memory gives it; the sensor numbers of its events.
    std::vector<int> Log() {
        std::vector<int> sensors;
        for (std::uint16_t id = 0; id != ipmi::kLastRecordId;) {
            const Answer answer = Ask(ipmi::GetSelEntry(id));
            if (!answer || answer->front() != 0) break;
            sensors.push_back((*answer)[3 + 11]);
            id = static_cast<std::uint16_t>((*answer)[1] | (*answer)[2] << 8);
        }
        return sensors;
    }
    /// Three sensor records are given whole, and the controller is not asked again.
    void ExpectRecordsInMemory() {
        asked.clear();
        for (std::uint16_t id = 1; id <= 3; ++id) {
            const Answer record = Ask(ipmi::GetSdr(id));
            ASSERT_TRUE(record);
            EXPECT_EQ(ipmisim::Bytes(record->begin() + 3, record->end()), bmc.sdrRecords[id - 1]);
        }
        EXPECT_THAT(asked, IsEmpty());
    }
    unsigned LogCount() {
        const Answer info = Ask(ipmi::GetSelInfo());
        return (*info)[2] | (*info)[3] << 8;
    }
    /// What is missing after a pass that reads the log.
    std::vector<std::string> FaultsOfAPass(bool sensors = false) {
        NQORTQR20::OpenMachine(std::move(source));
        auto* const library = NQORTQR20::SPLibrary::GetSplibraryInstance(0);
        const auto send = [&](const ipmi::Command& command) {
            const NQORTQR20::RequestFrame request(command);
            std::vector<unsigned char> buffer(request.bytes().begin(), request.bytes().end());
            buffer.resize(256);
            int length = 256;
            if (!library->sendIPMICommand(buffer.data(), &length, 256, true)) return Response();
            return Response(buffer.begin() + NQORTQR20::frame::kResponseAt, buffer.end());
        };
        send(ipmi::GetSelInfo());
        for (std::uint16_t id = 0; id != ipmi::kLastRecordId;) {
            const auto answer = send(ipmi::GetSelEntry(id));
            if (answer.empty() || answer.front() != 0) break;
            id = static_cast<std::uint16_t>(answer[1] | answer[2] << 8);
        }
        if (sensors) send(ipmi::GetSdrRepositoryInfo());
        NQORTQR20::EndPass();
        std::vector<std::string> faults;
        const NQORTQR20::NodeCompleteness node = NQORTQR20::GetCompleteness().front();
        for (const auto& fault : node.faults) faults.push_back(fault.what + ": " + fault.problem);
        if (!node.Whole() && faults.empty()) faults.emplace_back("records are missing");
        return faults;
    }
};

TEST_F(Reading, EveryRecordIsAskedForOnceWhateverTheWindowAndTheOrderOfAnswers) {
    for (const std::uint16_t events : {0, 1, 2, 100}) {
        for (const std::size_t window : {1u, 2u, 8u, 32u}) {
            for (const bool newestFirst : {false, true}) {
                Describe(events, 20);
                Read({.window = window, .newestFirst = newestFirst});
                SCOPED_TRACE(std::to_string(events) + " " + std::to_string(window));
                // The first record of an empty log is asked for before it is known to be empty.
                EXPECT_EQ(Asked(ipmi::kGetSelEntry), std::max<std::size_t>(events, 1));
                EXPECT_EQ(Asked(ipmi::kGetSdr), 20u);
                EXPECT_EQ(Asked(ipmi::kGetSelInfo), 2u);
                EXPECT_EQ(Asked(ipmi::kGetSdrRepositoryInfo) + Asked(ipmi::kReserveSdrRepository),
                          3u);
                asked.clear();
                EXPECT_EQ(Log().size(), events);
                EXPECT_EQ(LogCount(), events);
                if (events != 0) {
                    EXPECT_THAT(asked, IsEmpty());
                }
            }
        }
    }
}

TEST_F(Reading, NoMoreIsReadThanTheClassesNeed) {
    Describe(3, 3);
    Read({}, {.log = false, .sensors = false});
    EXPECT_THAT(asked, IsEmpty());
    Read({}, {.log = true, .sensors = false});
    EXPECT_EQ(Asked(ipmi::kGetSdr) + Asked(ipmi::kReserveSdrRepository), 0u);
    Read({}, {.log = false, .sensors = true});
    EXPECT_EQ(Asked(ipmi::kGetSelEntry) + Asked(ipmi::kGetSelInfo), 0u);
    EXPECT_EQ(Asked(ipmi::kGetSdr), 3u);
}

/// Every part of every record, under a good reservation and under another, answered as the
/// controller itself does.
TEST_F(Reading, TheMemoryAnswersEveryPartAsTheControllerWould) {
    Describe(3, 3);
    for (const bool whole : {true, false}) {
        bmc.wholeSdr = whole;
        Read({.window = 4});
        ipmisim::SimulatedBmc direct(bmc);
        const auto answered = [&](const ipmi::Command& command) {
            return direct.Execute(command.netFn, command.lun, command.command, command.data);
        };
        answered(ipmi::ReserveSdrRepository());
        const Answer reserved = Ask(ipmi::ReserveSdrRepository());
        ASSERT_TRUE(reserved && reserved->size() == 3);
        const auto reservation = static_cast<std::uint16_t>((*reserved)[1] | (*reserved)[2] << 8);
        for (const std::uint16_t id : {0, 1, 3, 9}) {
            for (unsigned offset = 0; offset < 70; ++offset) {
                for (const unsigned count : {0u, 1u, 7u, 16u, 22u, 60u, 255u}) {
                    const auto at = static_cast<std::uint8_t>(offset);
                    const auto many = static_cast<std::uint8_t>(count);
                    const Answer direct1 = answered(ipmi::GetSelEntry(id, at, many));
                    ASSERT_EQ(Ask(ipmi::GetSelEntry(id, at, many)), direct1)
                        << id << " " << offset << " " << count;
                    // What a controller gives in parts only, the memory gives whole, too.
                    if (!whole && count > 22) continue;
                    ASSERT_EQ(Ask(ipmi::GetSdr(id, at, many, reservation)),
                              answered(ipmi::GetSdr(id, at, many, 1)))
                        << id << " " << offset << " " << count;
                    const Answer wrong = Ask(ipmi::GetSdr(id, at, many, reservation + 7));
                    ASSERT_EQ(wrong, answered(ipmi::GetSdr(id, at, many, 8)));
                }
            }
        }
    }
}

TEST_F(Reading, AControllerThatGivesNoWholeRecordsIsAskedForParts) {
    const ipmisim::Fault tooLong{0x0A, 0x23, 1, ipmisim::Fault::Kind::kCompletionCode, 0, 0, {}};
    for (const int code : {0xCA, 0xC7, 0xC8, 0x00}) {
        Describe(0, 3);
        ipmisim::Fault fault = tooLong;
        fault.completionCode = static_cast<std::uint8_t>(code);
        if (code == 0x00) {  // cut after the next ID and twelve bytes
            fault.kind = ipmisim::Fault::Kind::kTruncate;
            fault.truncate = 14;
        }
        bmc.faults = {fault};
        Read({.window = 4});
        EXPECT_GE(std::count_if(asked.begin(), asked.end(),
                                [](const ipmi::Command& command) {
                                    return command.code() == ipmi::kGetSdr && command.data[5] <= 22;
                                }),
                  3)
            << code;
        SCOPED_TRACE(code);
        ExpectRecordsInMemory();
    }
}

TEST_F(Reading, ALostReservationIsTakenAnewAndThePassDoesNotSeeIt) {
    Describe(0, 3);
    bmc.wholeSdr = false;
    const auto lose = [](std::size_t number, const ipmi::Command& command,
                         ipmisim::SimulatedBmc* of) {
        if (number == 8 && command.code() == ipmi::kGetSdr) {
            of->Execute(0x0A, 0, ipmi::kReserveSdrRepository.number, {});
        }
    };
    Read({.window = 4, .before = lose});
    EXPECT_EQ(Asked(ipmi::kReserveSdrRepository), 2u);
    ExpectRecordsInMemory();
}

TEST_F(Reading, ARepositoryThatChangesWhileItIsReadIsTold) {
    for (const bool changes : {false, true}) {
        Describe(1, 3);
        ipmisim::BmcDescription grown = bmc;
        grown.sdrRecords.push_back(FullSensor(4, 4, 7, 1, "New"));
        Read({.window = 1,
              .before = [&, infos = 0](std::size_t, const ipmi::Command& command,
                                       ipmisim::SimulatedBmc* of) mutable {
                  if (command.code() == ipmi::kGetSdrRepositoryInfo && ++infos == 2 && changes) {
                      *of = ipmisim::SimulatedBmc(grown);
                  }
              }});
        const auto faults = FaultsOfAPass(true);
        NQORTQR20::CloseMachine();
        if (changes) {
            EXPECT_THAT(faults, ElementsAre("Get SDR Repository Info: the sensor repository has "
                                            "changed while it was read"));
        } else {
            EXPECT_THAT(faults, IsEmpty());
        }
    }
}

/// A log that changes while it is read, once and twice; what comes of it, and what is said.
TEST_F(Reading, AChangedLogIsReadOnceMore) {
    struct Change {
        const char* what;
        std::vector<int> log;   ///< sensor numbers of the events after the change
        bool renumbered;        ///< their IDs begin anew
        std::uint8_t time = 1;  ///< the last byte of the time stamps, B0h before
    };
    const Change changes[] = {{"one added", {1, 2, 3, 4, 5, 6}, false},
                              {"some erased", {1, 2, 5}, false},
                              {"cleared", {}, false},
                              {"cleared and one added", {9}, true},
                              {"wrapped", {4, 5, 6, 7, 8}, false},
                              {"wrapped within a second", {2, 3, 4, 5, 6}, false, 0xB0}};
    const auto describe = [&](const Change& change) {
        ipmisim::BmcDescription later = bmc;
        later.selEntries.clear();
        for (std::size_t i = 0; i < change.log.size(); ++i) {
            const auto sensor = static_cast<std::uint8_t>(change.log[i]);
            SelRecord record = SystemEvent(
                static_cast<std::uint16_t>(change.renumbered ? i + 1 : sensor), 1, sensor);
            record[3] = change.time;
            later.selEntries.push_back(record);
        }
        return later;
    };
    for (const Change& change : changes) {
        for (std::size_t at = 3; at <= 6; ++at) {
            for (const bool twice : {false, true}) {
                SCOPED_TRACE(std::string(change.what) + " " + std::to_string(at));
                Describe(5, 0);
                std::size_t infos = 0;
                bool changed = false;
                Read({.window = 2,
                      .before =
                          [&](std::size_t number, const ipmi::Command& command,
                              ipmisim::SimulatedBmc* of) {
                              if (command.code() == ipmi::kGetSelInfo) ++infos;
                              if (number == at && infos == 1) {
                                  *of = ipmisim::SimulatedBmc(describe(change));
                                  changed = true;
                              }
                              if (twice && changed && infos == 3) {
                                  *of = ipmisim::SimulatedBmc(
                                      describe({"", {7, 8, 9, 10, 11, 12, 13}, true, 2}));
                              }
                          }},
                     {.log = true, .sensors = false});
                ASSERT_TRUE(changed);
                EXPECT_EQ(Asked(ipmi::kGetSelInfo), 3u);
                EXPECT_EQ(Log(), change.log);
                if (!twice) {
                    EXPECT_EQ(LogCount(), change.log.size());
                    EXPECT_THAT(FaultsOfAPass(), IsEmpty());
                } else {
                    EXPECT_GE(LogCount(), change.log.size());
                    EXPECT_THAT(FaultsOfAPass(),
                                Contains("Get SEL Info: the log has changed while it was read"));
                }
            }
        }
    }
}

TEST_F(Reading, ARecordThatFailsOnceIsAskedForAgainAndElseLeftToThePass) {
    for (const unsigned failures : {1u, 2u}) {
        Describe(5, 0);
        bmc.faults.clear();
        for (unsigned call = 3; call < 3 + failures; ++call) {
            bmc.faults.push_back(
                {0x0A, 0x43, call, ipmisim::Fault::Kind::kCompletionCode, 0xC3, 0, {}});
        }
        Read({}, {.log = true, .sensors = false});
        asked.clear();
        EXPECT_EQ(Log(), (std::vector<int>{1, 2, 3, 4, 5}));
        // The third record and those behind it.
        EXPECT_EQ(asked.size(), failures == 1 ? 0u : 3u);
    }
}

TEST_F(Reading, ARecordChainThatLeadsBackEnds) {
    Describe(3, 3);
    bmc.selEntries.push_back(bmc.selEntries[1]);
    bmc.sdrRecords.push_back(bmc.sdrRecords[0]);
    Read({.window = 8});
    EXPECT_LT(asked.size(), 40u);
    EXPECT_THAT(FaultsOfAPass(), ElementsAre("Get SEL Entry: ran in a circle"));
}

TEST_F(Reading, TriesThatDoNotComeTrueAreGivenUp) {
    Describe(200, 0);
    // Every record at an ID that nobody could guess.
    for (std::size_t i = 0; i < bmc.selEntries.size(); ++i) {
        const auto id = static_cast<std::uint16_t>(1 + (i * 7919) % 60000);
        bmc.selEntries[i][0] = Low(id);
        bmc.selEntries[i][1] = High(id);
    }
    Read({.window = 16}, {.log = true, .sensors = false});
    EXPECT_EQ(Log().size(), 200u);
    EXPECT_LT(Asked(ipmi::kGetSelEntry), 260u);
}

TEST_F(Reading, WhatFollowsIsAskedForBehindWhatThePassWants) {
    Describe(0, 0);
    bmc.fru[0] = ipmisim::Bytes(100, 0x42);
    Read({.window = 8});
    asked.clear();
    Ask(ipmi::GetFruInventoryAreaInfo(0));
    Ask(ipmi::ReadFruData(0, 0, 16));
    for (std::uint16_t offset = 16; offset < 100; offset += 16) {
        const auto count = static_cast<std::uint8_t>(std::min(16, 100 - offset));
        const Answer chunk = Ask(ipmi::ReadFruData(0, offset, count));
        ASSERT_TRUE(chunk && chunk->size() == 2u + count);
    }
    EXPECT_EQ(asked.size(), 8u);  // the size, and seven chunks once each
}

TEST_F(Reading, WhatIsAnnouncedGoesOutWithTheNextRequestAndIsAskedOnce) {
    Describe(0, 3);
    Read({.window = 8});
    asked.clear();
    const auto& announce = source.nodes[0].announce;
    for (const ipmi::Command& command :
         {ipmi::GetDeviceId(), ipmi::GetSdr(1), ipmi::GetSelfTestResults(), ipmi::GetDeviceId()}) {
        announce(command);
    }
    Ask(ipmi::GetChassisStatus());
    EXPECT_EQ(Ask(ipmi::GetSelfTestResults()), Response{ipmi::kInvalidCommand});
    Ask(ipmi::GetDeviceId());
    // The record is in the memory; a refusal is an answer as well.
    EXPECT_THAT(asked, ElementsAre(ipmi::GetChassisStatus(), ipmi::GetDeviceId(),
                                   ipmi::GetSelfTestResults()));
}

TEST_F(Reading, AnnouncedFruDevicesAreReadInTheChunksOfTheFirst) {
    Describe(0, 0);
    for (const std::uint8_t device : {0, 1, 2}) bmc.fru[device] = ipmisim::Bytes(100, 0x42);
    const auto readDevice = [&](std::uint8_t device) {
        Ask(ipmi::GetFruInventoryAreaInfo(device));
        for (std::uint16_t offset = 0; offset < 100; offset += 32) {
            const auto count = static_cast<std::uint8_t>(std::min(32, 100 - offset));
            const Answer chunk = Ask(ipmi::ReadFruData(device, offset, count));
            ASSERT_TRUE(chunk && chunk->size() == 2u + count);
        }
    };
    Read({.window = 32});
    asked.clear();
    for (const std::uint8_t device : {1, 2, 3}) {  // the last is not there
        source.nodes[0].announce(ipmi::GetFruInventoryAreaInfo(device));
    }
    readDevice(0);
    readDevice(1);
    // Its turn has not come, and there is nothing of it left to ask for.
    EXPECT_THAT(asked, Contains(ipmi::ReadFruData(2, 0, 32)));
    readDevice(2);
    EXPECT_EQ(asked.size(), 4u + 3 * 4);
}

}  // namespace
}  // namespace ipmiseltest
