#include <array>

#include "host/spdriver/completeness.h"
#include "ipmi/command.h"
#include "tests/support/bmc_fixture.h"

namespace {

class Completeness : public ipmiseltest::BmcTest {
protected:
    Completeness() {
        for (std::uint8_t i = 1; i <= 3; ++i) bmc.selEntries.push_back({i, 0, 2});
    }

    void Send(ipmi::CommandCode command, const std::vector<std::uint8_t>& data = {}) {
        Ask(ipmi::MakeCommand(command, data));
    }
    void Ask(const ipmi::Command& command) {
        std::array<unsigned char, 256> buffer{};
        NQORTQR20::frame::LayOutRequest(buffer, command.netFn, command.lun, command.command,
                                        command.data);
        int length = 256;
        Library()->sendIPMICommand(buffer.data(), &length, 256, true);
    }
    static std::string Counts(const NQORTQR20::SourceAccount& account) {
        return (account.announced ? std::to_string(*account.announced) : "-") + "/" +
               std::to_string(account.read);
    }
    void ReadLog() {
        Send(ipmi::kGetSelInfo);
        for (const std::uint8_t record : {0, 2, 3})
            Send(ipmi::kGetSelEntry, {0, 0, record, 0, 0, 0xFF});
    }
    NQORTQR20::NodeCompleteness Account() { return NQORTQR20::CompletenessOf(*Library()); }
    std::vector<std::string> Faults() {
        std::vector<std::string> texts;
        for (const auto& fault : Account().faults) {
            texts.push_back(fault.what + " " + fault.record + ": " + fault.problem);
        }
        return texts;
    }
    using Texts = std::vector<std::string>;
};

TEST_F(Completeness, CountsEveryRecordOnceHoweverOftenItIsRead) {
    ReadLog();
    ReadLog();
    EXPECT_EQ(Account().log.announced, 3u);
    EXPECT_EQ(Account().log.read, 3u);
    EXPECT_EQ(Account().sensors.announced, std::nullopt);
    EXPECT_TRUE(Account().Whole());
}

TEST_F(Completeness, TellsWhatWentWrongWithEachRead) {
    Silence(ipmi::kGetSelEntry, 1);
    FailWith(ipmi::kGetSelEntry, 2, 0xCB);
    bmc.faults.push_back({0x0A, 0x43, 3, ipmisim::Fault::Kind::kTruncate, 0, 7, {}});
    ReadLog();
    EXPECT_EQ(Faults(),
              (Texts{"Get SEL Entry 0000: no response", "Get SEL Entry 0002: completion code cb",
                     "Get SEL Entry 0003: short answer"}));
    EXPECT_EQ(Account().log.read, 0u);
    EXPECT_FALSE(Account().Whole());
}

TEST_F(Completeness, ALogThatNobodyReadIsNotMissing) {
    Send(ipmi::kGetSelInfo);
    EXPECT_EQ(Account().log.announced, 3u);
    EXPECT_TRUE(Account().Whole());
    Send(ipmi::kGetSelEntry, {0, 0, 2, 0, 0, 0xFF});
    EXPECT_EQ(Account().log.Missing(), 2u);
}

TEST_F(Completeness, AnEmptyRepositoryIsWholeWhoeverReadsItBeforeItIsCounted) {
    Send(ipmi::kGetSdr, {0, 0, 0, 0, 0, 5});
    EXPECT_EQ(Faults(), Texts{"Get SDR 0000: completion code cb"});
    Send(ipmi::kGetSdrRepositoryInfo);
    EXPECT_EQ(Faults(), Texts{});
    EXPECT_TRUE(Account().Whole());
}

TEST_F(Completeness, ARepositoryWhoseFirstRecordIsNotThereIsNotWhole) {
    bmc.sdrRecords = {{1, 0, 0x51, 1, 0}};
    FailWith(ipmi::kGetSdr, 1, 0xCB);
    Send(ipmi::kGetSdr, {0, 0, 0, 0, 0, 5});
    Send(ipmi::kGetSdrRepositoryInfo);
    EXPECT_EQ(Faults(), Texts{"Get SDR 0000: completion code cb"});
    EXPECT_FALSE(Account().Whole());
}

TEST_F(Completeness, ASensorRecordInPartsIsAsGoodAsAWholeOne) {
    bmc.sdrRecords = {{1, 0, 0x51, 1, 5, 6, 7, 8, 9, 10}};
    bmc.faults.push_back({0x0A, 0x23, 2, ipmisim::Fault::Kind::kTruncate, 0, 2 + 6, {}});
    FailWith(ipmi::kGetSdr, 1, 0xCA);
    Send(ipmi::kGetSdrRepositoryInfo);
    Send(ipmi::kReserveSdrRepository);
    Send(ipmi::kGetSdr, {1, 0, 0, 0, 0, 0xFF});  // refused whole
    EXPECT_EQ(Faults(), Texts{});
    EXPECT_EQ(Account().sensors.Missing(), 1u);
    Send(ipmi::kGetSdr, {1, 0, 0, 0, 0, 0xFF});  // cut after six bytes
    EXPECT_EQ(Faults(), Texts{"Get SDR 0000: short answer"});
    Send(ipmi::kGetSdr, {1, 0, 1, 0, 6, 2});
    EXPECT_FALSE(Account().Whole());
    Send(ipmi::kGetSdr, {1, 0, 1, 0, 8, 2});
    EXPECT_EQ(Faults(), Texts{});
    EXPECT_TRUE(Account().Whole());
}

TEST_F(Completeness, FactsCountOnceUnlessTheControllerDoesNotHaveThem) {
    bmc.deviceId = ipmisim::Bytes(11, 0x20);
    bmc.selfTest = ipmisim::Bytes{0x55};  // cut
    for (int i = 0; i < 2; ++i) {
        Ask(ipmi::GetDeviceId());
        Ask(ipmi::GetSelfTestResults());
        Ask(ipmi::GetChassisStatus());  // C1h
        Ask(ipmi::GetPefConfigurationParameters(ipmi::kPefEventFilterCount));
    }
    EXPECT_EQ(Counts(Account().controller), "2/1");
    EXPECT_EQ(Faults(), Texts{"Get Self Test Results : short answer"});
    EXPECT_TRUE(Account().Whole());  // nothing is missing of log or sensors
}

TEST_F(Completeness, SensorReadingsCountByLunAndNumber) {
    bmc.sensors[{0x20, 0, 0x30}] = {.reading = 1, .states = {}, .thresholds = {}, .factors = {}};
    bmc.sensors[{0x20, 1, 0x30}] = {
        .reading = 1, .states = ipmisim::Bytes{}, .thresholds = {}, .factors = {}};
    Ask(ipmi::GetSensorReading(0x30));
    Ask(ipmi::GetSensorReading(0x30));
    Ask(ipmi::GetSensorReading(0x30, 1));  // one byte
    Ask(ipmi::GetSensorReading(0x31));     // not there, as it says
    EXPECT_EQ(Counts(Account().readings), "3/1");
    EXPECT_EQ(Faults(), Texts{"Get Sensor Reading 0130: short answer"});
}

TEST_F(Completeness, AnInventoryDeviceIsReadWhenItsEndIs) {
    bmc.fru[3] = ipmisim::Bytes(40, 0xAA);
    Ask(ipmi::GetFruInventoryAreaInfo(4));  // absent
    Ask(ipmi::GetFruInventoryAreaInfo(3));
    Ask(ipmi::ReadFruData(3, 0, 32));
    EXPECT_EQ(Counts(Account().inventory), "1/0");
    Ask(ipmi::ReadFruData(3, 33, 7));  // leaves a gap
    EXPECT_EQ(Counts(Account().inventory), "1/0");
    Ask(ipmi::ReadFruData(3, 32, 32));
    EXPECT_EQ(Counts(Account().inventory), "1/1");
    EXPECT_EQ(Faults(), Texts{});
}

TEST_F(Completeness, AnInventoryReadThatWasRefusedAndThenAnsweredIsNoFault) {
    bmc.fru[3] = ipmisim::Bytes(64, 0xAA);
    FailWith(ipmi::kReadFruData, 1, 0xCA);
    FailWith(ipmi::kReadFruData, 2, 0x81);
    FailWith(ipmi::kReadFruData, 4, 0x81);
    Ask(ipmi::ReadFruData(3, 0, 32));
    Ask(ipmi::ReadFruData(3, 0, 16));
    EXPECT_EQ(Faults().size(), 2u);
    Ask(ipmi::ReadFruData(3, 0, 16));
    EXPECT_EQ(Faults(), Texts{});
    Ask(ipmi::ReadFruData(3, 16, 16));
    Ask(ipmi::ReadFruData(3, 32, 16));  // goes on without it
    Ask(ipmi::ReadFruData(3, 16, 16));
    EXPECT_EQ(Faults(), Texts{"Read FRU Data 0003: completion code 81"});
}

TEST_F(Completeness, ARepositoryThatHasChangedIsToldAndNoMore) {
    bmc.faults.push_back({.netFn = 0x0A,
                          .command = 0x20,
                          .call = 3,
                          .kind = ipmisim::Fault::Kind::kData,
                          .data = ipmisim::Bytes{0x51, 0, 0, 0, 0, 1, 0, 0, 0, 0, 0, 0, 0, 0}});
    for (int i = 0; i < 2; ++i) Send(ipmi::kGetSdrRepositoryInfo);
    EXPECT_EQ(Faults(), Texts{});
    Send(ipmi::kGetSdrRepositoryInfo);
    Send(ipmi::kGetSdrRepositoryInfo);
    EXPECT_EQ(Faults(),
              Texts{"Get SDR Repository Info : the sensor repository has changed while it "
                    "was read"});
    EXPECT_TRUE(Account().Whole());
}

TEST_F(Completeness, AQuestionAnsweredAtTheSecondTryLeavesNothingOut) {
    Silence(ipmi::kGetSelInfo, 1);
    Send(ipmi::kGetSelInfo);
    EXPECT_EQ(Faults(), Texts{"Get SEL Info : no response"});
    ReadLog();
    EXPECT_EQ(Faults(), Texts{});
    EXPECT_TRUE(Account().Whole());
}

TEST_F(Completeness, ACircleIsAFaultAndAnAbsentDeviceIsNone) {
    ReadLog();
    Send(ipmi::kGetSelEntry, {0, 0, 1, 0, 0, 0xFF});  // the first record again, under its own ID
    EXPECT_EQ(Faults(), Texts{"Get SEL Entry 0001: ran in a circle"});
    Send(ipmi::kReadFruData, {9, 0, 0, 16});
    EXPECT_EQ(Faults().size(), 1u);
}

TEST_F(Completeness, AWalkThatEndsEarlyIsNotMadeUpForByAnother) {
    ipmisim::Bytes last(18, 0xFF);  // by its next record ID
    last[2] = last[4] = 2;
    last[3] = 0;
    bmc.faults = {ipmiseltest::Answer(ipmi::kGetSelEntry, 2, last)};
    Send(ipmi::kGetSelInfo);
    for (const std::uint8_t record : {0, 2}) Send(ipmi::kGetSelEntry, {0, 0, record, 0, 0, 0xFF});
    ReadLog();
    EXPECT_EQ(Account().log.read, 3u);
    EXPECT_EQ(Faults(), Texts{"Get SEL Entry 0002: ended early"});
}

TEST_F(Completeness, AnInventoryFaultLeavesLogAndSensorsWhole) {
    bmc.fru[0] = ipmisim::Bytes(16, 1);
    FailWith(ipmi::kReadFruData, 2, 0xC0);
    Send(ipmi::kReadFruData, {0, 0, 0, 16});
    Send(ipmi::kReadFruData, {0, 0, 0, 16});
    Send(ipmi::kReadFruData, {0, 16, 0, 16});  // past the end: the device is smaller
    EXPECT_EQ(Faults(), Texts{"Read FRU Data 0000: completion code c0"});
    EXPECT_TRUE(Account().Whole());
}

}  // namespace
