#include "ipmi/request_fru_locator.h"

#include <algorithm>
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
    std::vector<IPMIFRULocator> locators;
    IPMIFRULocator locator;

    /// A way to the BMC as it is described now.
    std::unique_ptr<NQORTQR20::SPLibrary> Fresh() {
        return std::make_unique<NQORTQR20::SPLibrary>(
            std::make_unique<ipmiseltest::SimulatedTransport>(bmc, &requests));
    }
    unsigned Walk() {
        locators.clear();
        log.Clear();
        return IPMIRequestFRULocator(Fresh().get()).IPMIGetSDREntry(nullptr, &locators);
    }
    unsigned Read(bool deviceZero = false) {
        log.Clear();
        return IPMIRequestFRULocator(Fresh().get()).IPMIGetFRUData(nullptr, &locator, deviceZero);
    }
    std::vector<std::string> Frames() const {
        std::vector<std::string> frames;
        for (const auto& frame : requests) frames.push_back(DumpBytes(frame, Digits::kUpperHex));
        return frames;
    }
};

class FruWalk : public FruTest {
protected:
    /// A record whose byte i is i, but for what is given.
    void AddRecord(int id, std::uint8_t device, const std::string& idString,
                   std::uint8_t typeLength, std::uint8_t type = 0x11) {
        ipmisim::Bytes record(16);
        std::iota(record.begin(), record.end(), std::uint8_t{0});
        record[0] = static_cast<std::uint8_t>(id);
        record[1] = static_cast<std::uint8_t>(id >> 8);
        record[3] = type;
        record[6] = device;
        record[15] = typeLength;
        record.insert(record.end(), idString.begin(), idString.end());
        bmc.sdrRecords.push_back(record);
    }
    std::vector<std::string> Found() {
        std::vector<std::string> found;
        for (const IPMIFRULocator& one : locators) found.push_back(one.GetIDString());
        return found;
    }
};

TEST_F(FruWalk, KeepsFruDeviceLocatorsAlone) {
    AddRecord(0x0001, 3, "PSU 1", 5);
    AddRecord(0x0002, 0, "Device 0", 8);
    AddRecord(0x0003, 4, "Sensor", 6, 0x01);
    AddRecord(0x1234, 0xA6, "DIMM", 4);
    EXPECT_EQ(Walk(), kOk);
    ASSERT_THAT(Found(), ElementsAre("PSU 1", "DIMM"));
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
    EXPECT_THAT(Frames(), ElementsAre("01 20 0A 00 22 00 00 00 00 00 00 00 00 00 00 ",
                                      "01 20 0A 00 23 06 00 00 00 01 00 00 00 00 0F ",
                                      "01 20 0A 00 23 06 00 00 00 01 00 00 00 0F FF ",
                                      "01 20 0A 00 23 06 00 00 00 01 00 02 00 00 0F ",
                                      "01 20 0A 00 23 06 00 00 00 01 00 03 00 00 0F ",
                                      "01 20 0A 00 23 06 00 00 00 01 00 34 12 00 0F ",
                                      "01 20 0A 00 23 06 00 00 00 01 00 34 12 0F FF "));

    const auto lines = log.Lines(kTrace);
    EXPECT_THAT(lines, Contains("Contents of buffer to send (fRspBuf):\n\t1 32 10 0 34 \n\t0 0 0 "
                                "0 0 \n\t0 0 0 0 0 "));
    EXPECT_EQ(std::count(lines.begin(), lines.end(),
                         "This is not a FRU Locator. Exiting "
                         "IPMIRequestFRULocator::IPMIGetSDRHeader()."),
              2);
    const auto end = std::find(lines.begin(), lines.end(), "Obtained the following FRU Locators.");
    ASSERT_EQ(lines.end() - end, 9);
    EXPECT_EQ(end[2], "Number of FRU Locators is 2");
    EXPECT_EQ(end[5], "Device ID 166");
    EXPECT_EQ(end[6].substr(0, 16), "FRUData = 00 00 ");
    EXPECT_EQ(log.Lines(kInfo)[2], "fRspBuf = 00 02 00 05 50 53 55 20 31 ");
    EXPECT_EQ(log.Lines(kInfo)[3], "Response Length = 8");
}

TEST_F(FruWalk, IdStringIsTheTextOfTheRecord) {
    const struct {
        std::string text;
        std::uint8_t typeLength;
        std::string idString;
    } cases[] = {
        {"PSU 1", 0xC5, "PSU 1"},  // type bits count as length
        {"PSU 1", 3, "PSU"},
        {"PSU 1", 0x0F, "PSU 1"},  // longer than the record
        {std::string("PS\0U", 4), 4, "PS"},
        {"", 0xC8, ""},
    };
    for (const auto& c : cases) {
        bmc.sdrRecords.clear();
        AddRecord(1, 3, c.text, c.typeLength);
        EXPECT_EQ(Walk(), kOk);
        EXPECT_THAT(Found(), ElementsAre(c.idString));
    }
}

TEST_F(FruWalk, OneByteOfFfGoesOn) {
    AddRecord(0x0001, 3, "A", 1);
    AddRecord(0x00FF, 4, "B", 1);
    AddRecord(0xFF00, 5, "C", 1);
    EXPECT_EQ(Walk(), kOk);
    EXPECT_THAT(Found(), ElementsAre("A", "B", "C"));
}

TEST_F(FruWalk, FailureKeepsWhatWasFound) {
    const struct {
        std::uint8_t command;
        unsigned call;
        std::string what, prefix;
        std::size_t found;
    } cases[] = {
        {0x22, 1, "reserve SDR.", "reserving sensor data record: ", 0},
        {kGetSdr, 3, "obtain SDR Header.", "obtaining sensor data record header: ", 1},
        {kGetSdr, 4, "obtain SDR String.", "obtaining sensor data record string: ", 1},
    };
    AddRecord(1, 3, "A", 1);
    AddRecord(2, 4, "B", 1);
    for (const auto& c : cases) {
        bmc.faults.clear();
        Silence(c.command, c.call);
        EXPECT_EQ(Walk(), kFailed);
        EXPECT_EQ(locators.size(), c.found);
        EXPECT_THAT(log.Lines(kError), ElementsAre("Failure in sending command to " + c.what));
        bmc.faults.clear();
        FailWith(c.command, c.call, 0x81);
        EXPECT_EQ(Walk(), kFailed);
        EXPECT_EQ(locators.size(), c.found);
        EXPECT_EQ(log.Lines(kInfo).back(), "IPMI error in " + c.prefix + "Unknown error\n");
    }
}

class FruData : public FruTest {
protected:
    FruData() {
        ipmisim::Bytes inventory(300);
        std::iota(inventory.begin(), inventory.end(), std::uint8_t{1});
        bmc.fru = {{0, {0xAA}}, {7, inventory}};
        Forget();
    }
    void Forget() {
        locator.SetFRUDevIDSlaveAddr(7);
        const std::vector<unsigned char> earlier(IPMIFRULocator::kFruDataLength, 0xEE);
        locator.SetFRUData(0, earlier.data(), IPMIFRULocator::kFruDataLength);
    }
    void AnswerWith(unsigned call, ipmisim::Bytes data) {
        bmc.faults.push_back({.netFn = 0x0A,
                              .command = kReadFruData,
                              .call = call,
                              .kind = ipmisim::Fault::Kind::kData,
                              .data = std::move(data)});
    }
    /// The inventory, but for [from, to), which is untouched.
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
    EXPECT_EQ(Frames()[0], "01 20 0A 00 11 04 00 00 00 07 00 00 10 00 00 ");
    EXPECT_EQ(Frames()[15], "01 20 0A 00 11 04 00 00 00 07 F0 00 10 00 00 ");
    EXPECT_EQ(log.Lines(kInfo)[0],
              "fRspBuf = 00 10 01 02 03 04 05 06 07 08 09 0A 0B 0C 0D 0E 0F 10 ");

    EXPECT_EQ(Read(true), kFailed) << "device 0, of one byte";
    EXPECT_EQ(locator.GetFRUData()[0], 0xAA);
}

TEST_F(FruData, ShortAnswerFillsAsFarAsItGoes) {
    const std::pair<ipmisim::Bytes, unsigned> cases[] = {
        {{}, 0}, {{0x10}, 0}, {{0x10, 0x21}, 1}, {{0x03, 0x21, 0x22}, 2}};
    for (const auto& [answer, copied] : cases) {
        Forget();
        bmc.faults.clear();
        AnswerWith(3, answer);
        EXPECT_EQ(Read(), kOk);
        ExpectDataBut(32 + copied, 48);
    }
}

TEST_F(FruData, LongAnswerStaysInItsChunk) {
    for (const unsigned call : {1U, 15U, 16U}) {
        ipmisim::Bytes answer(400, 0xCC);
        std::iota(answer.begin() + 1, answer.begin() + 17,
                  static_cast<std::uint8_t>(16 * call - 15));
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
    Forget();
    Silence(kReadFruData, 2);
    EXPECT_EQ(Read(), kFailed);
    ExpectDataBut(16, 256);
    EXPECT_THAT(log.Lines(kError), ElementsAre("Failure in sending command to obtain FRU Data."));
}

}  // namespace
