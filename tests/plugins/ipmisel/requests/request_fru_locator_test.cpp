#include "plugins/ipmisel/requests/request_fru_locator.h"

#include <algorithm>
#include <numeric>

#include "tests/support/bmc_fixture.h"
#include "tests/support/wire.h"

namespace {

using namespace ipmisel;
using ::testing::Contains;
using ::testing::ElementsAre;

using ipmi::kGetSdr;

class FruWalk : public ipmiseltest::BmcTest {
protected:
    std::vector<IPMIFRULocator> locators;

    /// A record whose byte i is i, but for what is given.
    void AddRecord(std::uint16_t id, std::uint8_t device, const std::string& idString,
                   std::uint8_t typeLength, std::uint8_t type = 0x11) {
        ipmisim::Bytes record(16);
        std::iota(record.begin(), record.end(), std::uint8_t{0});
        record[0] = ipmiseltest::Low(id);
        record[1] = ipmiseltest::High(id);
        record[3] = type;
        record[6] = device;
        record[15] = typeLength;
        record.insert(record.end(), idString.begin(), idString.end());
        bmc.sdrRecords.push_back(record);
    }
    unsigned Walk() {
        locators.clear();
        log.Clear();
        return IPMIRequestFRULocator(FreshLibrary()).IPMIGetSDREntry(nullptr, &locators);
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
    const std::tuple<std::string, std::uint8_t, std::string> cases[] = {
        {"PSU 1", 0xC5, "PSU 1"},  // type bits count as length
        {"PSU 1", 3, "PSU"},      {std::string("PS\0U", 4), 4, "PS"},
        {"PSU 1", 0x0F, "PSU 1"},  // from here on longer than the record
        {"", 0xC8, ""},
    };
    for (const auto& [text, typeLength, idString] : cases) {
        bmc.sdrRecords.clear();
        AddRecord(1, 3, text, typeLength);
        EXPECT_EQ(Walk(), kOk);
        EXPECT_THAT(Found(), ElementsAre(idString));
        EXPECT_EQ(log.Lines(kNotice).size(), (typeLength & 0x1FU) > text.size());
    }
    EXPECT_THAT(log.Lines(kNotice),
                ElementsAre("The ID string of FRU device 3 is cut short: 0 of 8 bytes."));
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
        ipmi::CommandCode command;
        unsigned call;
        std::string what, prefix;
        std::size_t found;
    } cases[] = {
        {ipmi::kReserveSdrRepository, 1, "reserve SDR.", "reserving sensor data record: ", 0},
        {kGetSdr, 3, "obtain SDR Header.", "obtaining sensor data record header: ", 1},
        {kGetSdr, 4, "obtain SDR String.", "obtaining sensor data record string: ", 1},
    };
    AddRecord(1, 3, "A", 1);
    AddRecord(2, 4, "B", 1);
    for (const auto& c : cases) {
        bmc.faults = {ipmiseltest::NoResponse(c.command, c.call)};
        EXPECT_EQ(Walk(), kFailed);
        EXPECT_THAT(log.Lines(kError), ElementsAre("Failure in sending command to " + c.what));
        bmc.faults = {ipmiseltest::CompletionCode(c.command, c.call, 0x81)};
        EXPECT_EQ(Walk(), kFailed);
        EXPECT_EQ(locators.size(), c.found);
        EXPECT_EQ(log.Lines(kInfo).back(), "IPMI error in " + c.prefix + "Unknown error\n");
    }
}

class FruData : public ipmiseltest::BmcTest {
protected:
    IPMIFRULocator locator;

    FruData() {
        bmc.fru = {{0, {0xAA}}, {7, ipmisim::Bytes(300)}};
        std::iota(bmc.fru[7].begin(), bmc.fru[7].end(), std::uint8_t{1});
        locator.SetFRUDevIDSlaveAddr(7);
    }
    unsigned Read(bool deviceZero = false) {
        log.Clear();
        return IPMIRequestFRULocator(FreshLibrary()).IPMIGetFRUData(nullptr, &locator, deviceZero);
    }
};

TEST_F(FruData, IsReadInSixteenChunks) {
    EXPECT_EQ(Read(), kOk);
    EXPECT_EQ(requests.size(), 16U);
    EXPECT_EQ(Frames().front(), "01 20 0A 00 11 04 00 00 00 07 00 00 10 00 00 ");
    EXPECT_EQ(Frames().back(), "01 20 0A 00 11 04 00 00 00 07 F0 00 10 00 00 ");
    EXPECT_EQ(log.Lines(kInfo)[0],
              "fRspBuf = 00 10 01 02 03 04 05 06 07 08 09 0A 0B 0C 0D 0E 0F 10 ");
    EXPECT_EQ(Read(true), kFailed) << "device 0, of one byte";
    EXPECT_EQ(locator.GetFRUData()[0], 0xAA);
}

TEST_F(FruData, EachAnswerFillsItsChunkAsFarAsItGoes) {
    const auto answer = [](unsigned call, ipmisim::Bytes data) {
        return ipmiseltest::Answer(ipmi::kReadFruData, call, std::move(data));
    };
    ipmisim::Bytes tooLong(400, 0xCC);
    std::iota(tooLong.begin() + 1, tooLong.begin() + 17, std::uint8_t{0xF1});
    const auto told = [](const char* what) {
        return std::pair<int, std::string>(kNotice, std::string("FRU device 7 answered ") + what);
    };
    const struct {
        std::vector<ipmisim::Fault> faults;
        unsigned from, to;  // untouched
        std::size_t deviceSize = 300;
        std::pair<int, std::string> line{};
    } cases[] = {
        {{}, 0, 0},
        {{answer(3, {})}, 32, 48, 300, told("0 bytes at offset 32, not 16.")},
        {{answer(3, {0x10})}, 32, 48, 300, told("0 bytes at offset 32, not 16.")},
        {{answer(3, {0x10, 0x21})}, 33, 48, 300, told("1 bytes at offset 32, not 16.")},
        {{answer(3, {0x03, 0x21, 0x22})}, 34, 48, 300, told("2 bytes at offset 32, not 16.")},
        {{answer(16, tooLong)}, 0, 0, 300, told("246 bytes at offset 240, not 16.")},
        {{},
         100,
         256,
         100,
         {kInfo, "FRU data not available for Device ID 7: Parameter out of range."}},
        {{ipmiseltest::NoResponse(ipmi::kReadFruData, 2)},
         16,
         256,
         300,
         {kError, "Failure in sending command to obtain FRU Data."}},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(&c - cases);
        bmc.faults = c.faults;
        bmc.fru[7].resize(c.deviceSize);
        std::iota(bmc.fru[7].begin(), bmc.fru[7].end(), std::uint8_t{1});
        const std::vector<unsigned char> earlier(IPMIFRULocator::kFruDataLength, 0xEE);
        locator.SetFRUData(0, earlier.data(), IPMIFRULocator::kFruDataLength);
        EXPECT_EQ(Read(), c.to == 256 ? kFailed : kOk);
        for (unsigned i = 0; i < IPMIFRULocator::kFruDataLength; ++i) {
            const bool untouched = (i >= c.from && i < c.to) || i >= 256;
            EXPECT_EQ(locator.GetFRUData()[i], untouched ? 0xEE : (i + 1) & 0xFF) << i;
        }
        if (c.line.second.empty()) {
            EXPECT_THAT(log.Lines(kNotice), ElementsAre());
        } else {
            EXPECT_THAT(log.All(), Contains(c.line));
        }
    }
}

}  // namespace
