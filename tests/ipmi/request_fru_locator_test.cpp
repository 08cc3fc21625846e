#include "ipmi/request_fru_locator.h"

#include <algorithm>
#include <functional>
#include <numeric>

#include "tests/support/bmc_fixture.h"

namespace {

using namespace ipmisel;
using ::testing::Contains;
using ::testing::ElementsAre;

constexpr std::uint8_t kGetSdr = 0x23;
constexpr std::uint8_t kReadFruData = 0x11;

class FruTest : public ipmiseltest::BmcTest {
protected:
    /// A way to the BMC as it is described now.
    std::unique_ptr<NQORTQR20::SPLibrary> Fresh() {
        return std::make_unique<NQORTQR20::SPLibrary>(
            std::make_unique<ipmiseltest::SimulatedTransport>(bmc, &requests));
    }
};

class FruWalk : public FruTest {
protected:
    std::vector<IPMIFRULocator> locators;

    /// A FRU device locator whose byte i is i, but for what is given. `typeLength` 0 is that of
    /// the text.
    void AddLocator(int id, std::uint8_t device, const std::string& idString,
                    std::uint8_t typeLength = 0, std::uint8_t type = 0x11) {
        ipmisim::Bytes record(16);
        std::iota(record.begin(), record.end(), std::uint8_t{0});
        record[0] = static_cast<std::uint8_t>(id);
        record[1] = static_cast<std::uint8_t>(id >> 8);
        record[3] = type;
        record[6] = device;
        record[15] = typeLength != 0 ? typeLength : static_cast<std::uint8_t>(idString.size());
        record.insert(record.end(), idString.begin(), idString.end());
        bmc.sdrRecords.push_back(record);
    }
    unsigned Walk() { return IPMIRequestFRULocator(Library()).IPMIGetSDREntry(nullptr, &locators); }
    std::vector<std::string> IdStrings() const {
        std::vector<std::string> found;
        for (const IPMIFRULocator& locator : locators) found.push_back(locator.GetIDString());
        return found;
    }
};

TEST_F(FruWalk, KeepsFruDeviceLocatorsAlone) {
    AddLocator(0x0001, 3, "PSU 1");
    AddLocator(0x0002, 0, "Device 0");
    AddLocator(0x0003, 4, "Sensor", 0, 0x01);
    AddLocator(0x1234, 0xA6, "DIMM");
    EXPECT_EQ(Walk(), kOk);
    ASSERT_THAT(IdStrings(), ElementsAre("PSU 1", "DIMM"));
    const IPMIFRULocator& dimm = locators[1];
    const std::vector<int> fields{dimm.GetRecordID_LSB(),       dimm.GetRecordID_MSB(),
                                  dimm.GetSDRVersion(),         dimm.GetRecordType(),
                                  dimm.GetRecordLength(),       dimm.GetDeviceAccessAddr(),
                                  dimm.GetFRUDevIDSlaveAddr(),  dimm.GetLogPhysLUNBusID(),
                                  dimm.GetChannelNumber(),      dimm.GetDeviceType(),
                                  dimm.GetDeviceTypeModifier(), dimm.GetFRUEntityID(),
                                  dimm.GetFRUEntityInstance(),  dimm.GetOEM(),
                                  dimm.GetIDStringTypeLength()};
    EXPECT_THAT(fields, ElementsAre(0x34, 0x12, 2, 0x11, 4, 5, 0xA6, 7, 8, 10, 11, 12, 13, 14, 4));
    std::vector<std::string> frames;
    for (const auto& frame : requests) frames.push_back(DumpBytes(frame, Digits::kUpperHex));
    EXPECT_THAT(frames, ElementsAre("01 20 0A 00 22 00 00 00 00 00 00 00 00 00 00 ",
                                    "01 20 0A 00 23 06 00 00 00 01 00 00 00 00 0F ",
                                    "01 20 0A 00 23 06 00 00 00 01 00 00 00 0F FF ",
                                    "01 20 0A 00 23 06 00 00 00 01 00 02 00 00 0F ",
                                    "01 20 0A 00 23 06 00 00 00 01 00 03 00 00 0F ",
                                    "01 20 0A 00 23 06 00 00 00 01 00 34 12 00 0F ",
                                    "01 20 0A 00 23 06 00 00 00 01 00 34 12 0F FF "));

    // What is told of it.
    const auto all = log.Lines(kTrace);
    EXPECT_THAT(all, Contains("Contents of buffer to send (fRspBuf):\n\t1 32 10 0 34 \n\t0 0 0 0 "
                              "0 \n\t0 0 0 0 0 "));
    EXPECT_EQ(std::count(all.begin(), all.end(),
                         "This is not a FRU Locator. Exiting "
                         "IPMIRequestFRULocator::IPMIGetSDRHeader()."),
              2);
    const auto end = std::find(all.begin(), all.end(), "Obtained the following FRU Locators.");
    ASSERT_EQ(all.end() - end, 9);
    EXPECT_EQ(end[2], "Number of FRU Locators is 2");
    EXPECT_EQ(end[3], "Device ID 3");
    EXPECT_EQ(end[4].substr(0, 16), "FRUData = 00 00 ");
    EXPECT_EQ(end[5], "Device ID 166");
    EXPECT_EQ(end[8], "IPMIRequestFRULocator::IPMIGetSDREntry() completed.");
    const auto progress = log.Lines(kInfo);
    ASSERT_EQ(progress.size(), 12U);
    EXPECT_EQ(progress[2], "fRspBuf = 00 02 00 05 50 53 55 20 31 ");
    EXPECT_EQ(progress[3], "Response Length = 8");
}

TEST_F(FruWalk, IdStringIsTheTextOfTheRecord) {
    const struct {
        std::string text;
        std::uint8_t typeLength;
        std::string idString;
    } cases[] = {
        {"PSU 1", 0xC5, "PSU 1"},  // type bits count as length
        {"PSU 1", 3, "PSU"},
        {"PSU 1", 0xFF, "PSU 1"},  // longer than the record
        {std::string("PS\0U", 4), 4, "PS"},
        {"", 0xC8, ""},
    };
    for (const auto& c : cases) {
        bmc.sdrRecords.clear();
        AddLocator(1, 3, c.text, c.typeLength);
        const auto library = Fresh();
        std::vector<IPMIFRULocator> found;
        EXPECT_EQ(IPMIRequestFRULocator(library.get()).IPMIGetSDREntry(nullptr, &found), kOk);
        ASSERT_EQ(found.size(), 1U);
        EXPECT_EQ(found[0].GetIDString(), c.idString) << c.text;
        EXPECT_EQ(found[0].GetIDStringTypeLength(), c.typeLength);
    }
}

TEST_F(FruWalk, OneByteOfFfGoesOn) {
    AddLocator(0x0001, 3, "A");
    AddLocator(0x00FF, 4, "B");
    AddLocator(0xFF00, 5, "C");
    EXPECT_EQ(Walk(), kOk);
    EXPECT_THAT(IdStrings(), ElementsAre("A", "B", "C"));
}

TEST_F(FruWalk, CircleEndsItWithWhatWasFound) {
    AddLocator(1, 3, "A");
    AddLocator(2, 4, "B");
    AddLocator(1, 5, "C");
    EXPECT_EQ(Walk(), kFailed);
    EXPECT_THAT(IdStrings(), ElementsAre("A", "B"));
}

TEST_F(FruWalk, SecondWalkOnTheSameObjectFindsNothing) {
    AddLocator(1, 3, "A");
    IPMIRequestFRULocator request(Library());
    EXPECT_EQ(request.IPMIGetSDREntry(nullptr, &locators), kOk);
    EXPECT_EQ(request.IPMIGetSDREntry(nullptr, &locators), kOk);
    EXPECT_EQ(locators.size(), 1U);
}

// Every answer of the walk fails once, in both ways; what was found before stays.
TEST_F(FruWalk, FailureKeepsWhatWasFound) {
    const struct {
        std::uint8_t command;
        unsigned call;
        const char* what;
        const char* prefix;
        std::size_t found;
    } cases[] = {
        {0x22, 1, "reserve SDR.", "reserving sensor data record: ", 0},
        {kGetSdr, 1, "obtain SDR Header.", "obtaining sensor data record header: ", 0},
        {kGetSdr, 2, "obtain SDR String.", "obtaining sensor data record string: ", 0},
        {kGetSdr, 3, "obtain SDR Header.", "obtaining sensor data record header: ", 1},
        {kGetSdr, 4, "obtain SDR String.", "obtaining sensor data record string: ", 1},
    };
    AddLocator(1, 3, "A");
    AddLocator(2, 4, "B");
    const ipmisim::BmcDescription good = bmc;
    for (const auto& c : cases) {
        for (const bool silent : {true, false}) {
            bmc = good;
            silent ? Silence(c.command, c.call) : FailWith(c.command, c.call, 0x81);
            const auto library = Fresh();
            locators.clear();
            log.Clear();
            EXPECT_EQ(IPMIRequestFRULocator(library.get()).IPMIGetSDREntry(nullptr, &locators),
                      kFailed);
            EXPECT_EQ(locators.size(), c.found);
            if (silent) {
                EXPECT_THAT(log.Lines(kError), ElementsAre(std::string("Failure in sending "
                                                                       "command to ") +
                                                           c.what));
            } else {
                EXPECT_EQ(log.Lines(kInfo).back(),
                          std::string("IPMI error in ") + c.prefix + "Unknown error\n");
            }
        }
    }
}

class FruData : public FruTest {
protected:
    IPMIFRULocator locator;

    FruData() {
        ipmisim::Bytes inventory(300);
        std::iota(inventory.begin(), inventory.end(), std::uint8_t{1});
        bmc.fru = {{0, {0xAA}}, {7, inventory}};
        locator.SetFRUDevIDSlaveAddr(7);
        const std::vector<unsigned char> earlier(IPMIFRULocator::kFruDataLength, 0xEE);
        locator.SetFRUData(0, earlier.data(), IPMIFRULocator::kFruDataLength);
    }
    unsigned Read(bool deviceZero = false) {
        return IPMIRequestFRULocator(Library()).IPMIGetFRUData(nullptr, &locator, deviceZero);
    }
    void AnswerWith(unsigned call, ipmisim::Bytes data) {
        ipmisim::Fault fault;
        fault.netFn = 0x0A;
        fault.command = kReadFruData;
        fault.call = call;
        fault.kind = ipmisim::Fault::Kind::kData;
        fault.data = std::move(data);
        bmc.faults.push_back(fault);
    }
    /// The data as it is when byte i is i + 1, but for [from, to), which is untouched.
    void ExpectDataBut(unsigned from, unsigned to) const {
        for (unsigned i = 0; i < IPMIFRULocator::kFruDataLength; ++i) {
            const bool untouched = (i >= from && i < to) || i >= 256;
            EXPECT_EQ(locator.GetFRUData()[i], untouched ? 0xEE : (i + 1) & 0xFF) << i;
        }
    }
};

TEST_F(FruData, IsReadInSixteenChunks) {
    EXPECT_EQ(Read(), kOk);
    ExpectDataBut(0, 0);
    ASSERT_EQ(requests.size(), 16U);
    EXPECT_EQ(DumpBytes(requests[0], Digits::kUpperHex),
              "01 20 0A 00 11 04 00 00 00 07 00 00 10 00 00 ");
    EXPECT_EQ(DumpBytes(requests[15], Digits::kUpperHex),
              "01 20 0A 00 11 04 00 00 00 07 F0 00 10 00 00 ");
    const auto progress = log.Lines(kInfo);
    ASSERT_EQ(progress.size(), 32U);
    EXPECT_EQ(progress[0], "fRspBuf = 00 10 01 02 03 04 05 06 07 08 09 0A 0B 0C 0D 0E 0F 10 ");
    EXPECT_EQ(progress[1], "Response Length = 17");
}

TEST_F(FruData, ShortAnswerFillsAsFarAsItGoes) {
    const struct {
        ipmisim::Bytes answer;
        unsigned copied;
    } cases[] = {{{}, 0}, {{0x00}, 0}, {{0x10}, 0}, {{0x10, 0x21}, 1}, {{0x03, 0x21, 0x22}, 2}};
    const auto untouched = locator;
    for (const auto& c : cases) {
        locator = untouched;
        bmc.faults.clear();
        AnswerWith(3, c.answer);
        const auto library = Fresh();
        EXPECT_EQ(IPMIRequestFRULocator(library.get()).IPMIGetFRUData(nullptr, &locator, false),
                  kOk);
        ExpectDataBut(32 + c.copied, 48);
    }
}

TEST_F(FruData, LongAnswerStaysInItsChunk) {
    for (const unsigned call : {1U, 15U, 16U}) {
        ipmisim::Bytes answer(400, 0xCC);
        for (unsigned i = 0; i < 16; ++i) {
            answer[1 + i] = static_cast<std::uint8_t>(16 * call - 15 + i);
        }
        AnswerWith(call, answer);
    }
    EXPECT_EQ(Read(), kOk);
    ExpectDataBut(0, 0);
}

TEST_F(FruData, EndsWhereTheDeviceEnds) {
    bmc.fru[7].resize(100);
    EXPECT_EQ(Read(), kFailed);
    ExpectDataBut(100, 256);
    EXPECT_EQ(log.Lines(kInfo).back(),
              "FRU data not available for Device ID 7: Parameter out of range.");
    EXPECT_EQ(log.Lines(kTrace).back().find("Contents of buffer"), 0U) << "no completed line";
}

TEST_F(FruData, OfAnAbsentOrSilentDevice) {
    Silence(kReadFruData, 2);
    bmc.fru.erase(7);
    EXPECT_EQ(Read(), kFailed);
    EXPECT_EQ(Read(), kFailed);
    ExpectDataBut(0, 256);
    EXPECT_THAT(log.Lines(kInfo), ElementsAre("FRU data not available for Device ID 7: Requested "
                                              "Sensor, data, or record not present."));
    EXPECT_THAT(log.Lines(kError), ElementsAre("Failure in sending command to obtain FRU Data."));
}

TEST_F(FruData, OfDeviceZeroWhateverTheLocatorSays) {
    EXPECT_EQ(Read(true), kFailed);
    EXPECT_EQ(locator.GetFRUData()[0], 0xAA);
    EXPECT_EQ(locator.GetFRUData()[1], 0xEE);
}

}  // namespace
