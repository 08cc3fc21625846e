#include "plugins/ipmisel/records/sel_entry.h"

#include <gmock/gmock.h>

#include <array>
#include <cstdio>
#include <limits>
#include <memory>

#include "plugins/ipmisel/records/sel_texts.h"
#include "tests/plugins/ipmisel/records/text_field.h"
#include "tests/plugins/ipmisel/texts/mapping_fixture.h"

namespace {

using namespace ipmisel;
using ipmiseltest::Row;
using namespace ::testing;

// Neighbouring bytes differ; the record ID is 0x1234.
constexpr const char* kRow = "00 FF FE 34 12 02 A1 A2 A3 64 B3 C2 04 0C 87 6F D1 D2 D3 ";

/// Over marker texts: every numbered text is its number in angle brackets.
class SelEntry : public ipmiseltest::MappingTest {
protected:
    IPMISELEntry entry;

    unsigned Scan(const std::string& text = kRow) {
        const auto row = std::make_unique<s_SEL_row>(Row(text));  // nothing readable behind it
        log.Clear();
        return entry.ScanSELDataFile(context.get(), row.get(), 0);
    }
    std::string Text(unsigned (IPMISELEntry::*copy)(NQORTQR20::TCPluginCallbacks*, char*, unsigned,
                                                    IPMIMapping*) const,
                     unsigned length = kRoom) {
        std::vector<char> out(length, '#');
        EXPECT_EQ((entry.*copy)(context.get(), out.data(), length, &mapping), 0U);
        return std::string(ipmisel::BoundedView(out.data(), length));
    }
};

TEST_F(SelEntry, TakesTheRecordOutOfItsRow) {
    ASSERT_EQ(Scan(), 0U);
    EXPECT_THAT(log.Lines(4),
                ElementsAre("IPMISELEntry::ScanSELDataFile() function entered.",
                            "Results of ScanSELDataFile: 18 52 2 161 162 163 100 179 194 4 "
                            "12 135 111 209 210 211",
                            "IPMISELEntry::ScanSELDataFile() function completed."));
}

TEST_F(SelEntry, WhatAShortRowLacksIsZeroAndAnEmptyOneIsTheEnd) {
    for (std::size_t count = 1; count < 19; ++count) {
        ASSERT_EQ(Scan(), 0U);
        const IPMISELEntry whole = entry;
        ASSERT_EQ(Scan(std::string(kRow).substr(0, count * 3)), 0U);
        for (unsigned i = 0; i < 16; ++i) {
            const std::size_t wire = i < 2 ? 1 - i : i;
            EXPECT_EQ(entry.Byte(i), wire + 3 < count ? whole.Byte(i) : 0) << count << " " << i;
        }
    }
    for (const std::string& text : {std::string(), std::string(58, ' ')}) {
        EXPECT_EQ(Scan(text), 2U);
        EXPECT_EQ(log.Lines(3), std::vector<std::string>{"System event log end-of-file found.\n"});
        EXPECT_EQ(log.Lines(4).back(), "IPMISELEntry::ScanSELDataFile() function returned.");
    }
}

TEST_F(SelEntry, FillsAnArrayUpToTheFirstEmptyRow) {
    const s_SEL_row rows[] = {Row("00 02 00 01 00 02"), Row("00 03 00 02 00 02"), Row("")};
    std::array<IPMISELEntry, 3> entries;
    EXPECT_EQ(FillSELArray(nullptr, rows, entries.data(), 2), 0U);
    EXPECT_EQ(entries[1].Byte(1), 2);
    EXPECT_EQ(FillSELArray(nullptr, rows, entries.data(), 3), 1U);
    EXPECT_THAT(log.Lines(1), ElementsAre("Could not open process all SELs."));
}

TEST_F(SelEntry, TextsAreTracedAndCutAtTheBufferWithoutANul) {
    Scan();
    log.Clear();
    EXPECT_EQ(Text(&IPMISELEntry::CopyRecordID), "4660");
    EXPECT_THAT(log.All(), ElementsAre(Pair(4, "IPMISELEntry::GetRecordID() function entered."),
                                       Pair(4, "Record ID    = 4660"),
                                       Pair(4, "IPMISELEntry::GetRecordID() function completed.")));
    EXPECT_EQ(Text(&IPMISELEntry::CopyRecordID, 3), "466");
    EXPECT_EQ(Text(&IPMISELEntry::CopyGeneratorID), "<541><544>");
    EXPECT_THAT(log.Lines(4), Contains("IPMISELEntry::GetGeneratorID function entered."));
    EXPECT_THAT(log.Lines(4), Contains("GenID1, GenID2 = 179, 194"));
    EXPECT_EQ(Text(&IPMISELEntry::CopySensorType), "Memory");
    EXPECT_EQ(Text(&IPMISELEntry::CopyEventType), "Assertion, Sensor-specific.");
}

TEST_F(SelEntry, EventDataGoesToTheDecoderOfItsClass) {
    const std::string threshold = Threshold(0x51, 0x20, 0x30);
    const std::string generic = Generic(0x02, 0x51, 0x20, 0x30, 0x0C, 0x87);
    const std::string last = Generic(0x0C, 0x51, 0x20, 0x30, 0x0C, 0x87);
    const std::string specific = Sensor(0x0C, 0x51, 0x20, 0x30);
    const std::pair<int, std::string> cases[] = {{0x00, ""},   {0x81, threshold}, {0x02, generic},
                                                 {0x0C, last}, {0x0D, ""},        {0x6F, specific}};
    for (const auto& [type, text] : cases) {
        Scan(ipmisel::Format("0 0 0 1 0 2 0 0 0 0 20 0 4 0C 87 %02X 51 20 30", type));
        char out[kRoom] = "stale";
        EXPECT_EQ(entry.CopyEventData(context.get(), out, kRoom, nullptr, &mapping), 0U);
        EXPECT_EQ(out, text) << type;
        EXPECT_THAT(log.Lines(4), Contains("Event Data   = " + text));
    }
}

TEST_F(SelEntry, RawDataIsInWireOrderAndNeedsItsRoom) {
    Scan();
    EXPECT_EQ(Text(&IPMISELEntry::CopyRawDataString, 64),
              "34 12 02 a1 a2 a3 64 b3 c2 04 0c 87 6f d1 d2 d3");
    EXPECT_EQ(entry.CopyRawDataString(nullptr, nullptr, 63, nullptr), 1U);
    EXPECT_EQ(entry.CopyRawDataHex(nullptr, nullptr, 15), 1U);
    EXPECT_THAT(log.Lines(1), ElementsAre("Buffer not big enough to copy Raw Data.",
                                          "Buffer not big enough to copy Raw Hex Data."));
    std::array<unsigned char, 18> hex;
    hex.fill(0xEE);
    EXPECT_EQ(entry.CopyRawDataHex(nullptr, hex.data(), 17), 0U);
    EXPECT_THAT(hex, ElementsAre(0x34, 0x12, 0x02, 0xA1, 0xA2, 0xA3, 0x64, 0xB3, 0xC2, 0x04, 0x0C,
                                 0x87, 0x6F, 0xD1, 0xD2, 0xD3, 0, 0xEE));
}

TEST_F(SelEntry, OemRecordsHandTheirBytesOn) {
    Scan();
    const std::string all = "OEM data: A1 A2 A3 64 B3 C2 04 0C 87 6F D1 D2 D3";
    EXPECT_EQ(Text(&IPMISELEntry::GetOEMxC0),
              "Manufacturer ID: 311987 (0x04C2B3). OEM data: 0C 87");
    EXPECT_EQ(Text(&IPMISELEntry::GetOEMxC1),
              "Manufacturer ID: 311987 (0x04C2B3). OEM data: 0C 87 6F D1");
    EXPECT_EQ(Text(&IPMISELEntry::GetOEMxE0), "OEM data: A1 A2 A3 64 B3 C2 04 0C 87 D3");
    for (const auto copy :
         {&IPMISELEntry::GetOEMxE1, &IPMISELEntry::GetOEMxE2, &IPMISELEntry::GetOEMxE3}) {
        EXPECT_EQ(Text(copy), all);
    }
    log.Clear();
    EXPECT_EQ(entry.GetOEMxE3(nullptr, nullptr, 0, &mapping), 1U);
    EXPECT_THAT(log.Lines(4), ElementsAre("IPMISELEntry::GetOEMxE3() function entered."));
}

TEST_F(SelEntry, PrintsItsVariablesInTheirOldOrder) {
    Scan();
    EXPECT_EQ(PrintSELArray(nullptr, &entry, 1), 0U);
    EXPECT_THAT(log.Lines(4),
                Contains("Variables: 34 12 02 000000d3 64 b3 c2 04 0c 87 6f d1 d2\n"));
}

TEST_F(SelEntry, ReadsTheInformationLineOfAFile) {
    const std::string good = "00 51 02 01 05 06 07 08 09 0A 0B 0C 0D 0E 0F \n";
    const std::string other = "00 52" + good.substr(5);
    const std::unique_ptr<std::FILE, int (*)(std::FILE*)> file(std::tmpfile(), &std::fclose);
    std::fputs((good.substr(1) + other + std::string(45, ' ') + "\n" + good).c_str(), file.get());
    std::rewind(file.get());
    int count = -1;
    for (const unsigned result : {1U, 1U, 1U, 0U, 2U}) {
        EXPECT_EQ(entry.ScanSELInfoDataFile(nullptr, file.get(), &count), result);
        EXPECT_EQ(count, result == 1 ? -1 : 0x0102);
    }
    EXPECT_THAT(log.Lines(0), ElementsAre("SELInfostring is not in the correct format.",
                                          "Error in reading data file for SELInfoInfostring",
                                          "End-of-file found. No data for SDR Info."));
    EXPECT_THAT(
        log.Lines(1),
        ElementsAre("This SEL Version (0x52) does not match the current IPMI Version (0x51).\n"));
}

class Timestamp : public ::testing::Test {
protected:
    ipmiseltest::LogRecorder log;
    ipmiseltest::Machine now{"", "20240305120304.000000+060"};
};

TEST_F(Timestamp, IsTheCalendarTimeWithTheLocalOffset) {
    const std::tuple<int, std::string, const char*> cases[] = {
        {0, "19700101000000", "Adding 0 hours to Timestamp."},
        {0x1FFFFFFF, "19870105184831", "Adding 0 hours to Timestamp."},
        {0x20000000, "19870105184832", "No addition to Timestamp."},
        {0x65E70304, "20240305113324", "No addition to Timestamp."},
        {-1, "19691231235959", "Adding 0 hours to Timestamp."}};
    for (const auto& [raw, time, addition] : cases) {
        const std::string expected = time + ".000000+060";
        IPMISELEntry entry;
        const s_SEL_row row =
            ipmiseltest::Row(ipmisel::Format("0 0 0 1 0 2 %x %x %x %x", raw & 0xFF, raw >> 8 & 0xFF,
                                             raw >> 16 & 0xFF, raw >> 24 & 0xFF));
        ASSERT_EQ(entry.ScanSELDataFile(nullptr, &row, 0), 0U);
        log.Clear();
        char out[64] = {};
        EXPECT_EQ(entry.CopyTimestamp(nullptr, out, sizeof out, nullptr, {}, true, true), 0U);
        EXPECT_EQ(out, expected);
        EXPECT_THAT(
            log.Lines(4),
            ElementsAre(
                "IPMISELEntry::GetTimestamp() function entered.", addition,
                "RawTimeStamp = " + std::to_string(raw) + "\n         PreTimeStamp = " + expected,
                "Timestamp = " + expected, "IPMISELEntry::GetTimestamp() function completed."));
        char boot[5] = "####";
        entry.CopyOSBootTimestamp(nullptr, boot, 4, nullptr, {}, false, false);
        EXPECT_EQ(boot, time.substr(0, 4));
    }
}

TEST_F(Timestamp, BeyondTheCalendarIsNoTime) {
    EXPECT_EQ(ipmisel::TimestampText(std::numeric_limits<std::int64_t>::max(), 60),
              "19700101000000.000000+000");
    const std::string reason = NQORTQR20::TTQRStatusCode{21}.TranslateStatusCode();
    EXPECT_THAT(log.All(),
                ElementsAre(Pair(3, "Could not convert CurrentTimeStamp."),
                            Pair(2, "Unable to obtain Timestamp due to caught exception " + reason +
                                        ". Using default Timestamp (1/2/1970).")));
}

TEST(EventType, NamesDirectionAndClass) {
    const std::tuple<std::uint8_t, const char*> cases[] = {
        {0x00, "Assertion, Unknown event type."}, {0x01, "Assertion, Threshold."},
        {0x81, "Deassertion, Threshold."},        {0x02, "Assertion, Generic."},
        {0x8C, "Deassertion, Generic."},          {0x0D, "Assertion, Unknown event type."},
        {0x6E, "Assertion, Unknown event type."}, {0x6F, "Assertion, Sensor-specific."},
        {0x70, "Assertion, Unknown event type."}};
    for (const auto& [byte, text] : cases) EXPECT_EQ(EventTypeText(byte), text) << int{byte};
}

TEST(Source, TellsSoftwareFromAddresses) {
    const ipmiseltest::TextFolder folder(
        "535=BIOS. \r\n536=SMI. \n537=System. \n538=OEM. \n539=Remote. \n540=Terminal. \n"
        "541=Reserved. \n543=LUN %d. \n544=Channel %d.\n");
    const NQORTQR20::PluginContext context(folder.path());
    const std::tuple<int, const char*> software[] = {
        {0x00, "BIOS. "},     {0x0F, "BIOS. "},    {0x10, "SMI. "},    {0x20, "System. "},
        {0x3F, "OEM. "},      {0x40, "Remote. "},  {0x46, "Remote. "}, {0x47, "Terminal. "},
        {0x48, "Reserved. "}, {0x7F, "Reserved. "}};
    for (const auto& [id, text] : software) {
        EXPECT_EQ(SourceText(context.get(), static_cast<std::uint8_t>(id * 2 + 1), 0xF3),
                  std::string(text) + "Channel 15.")
            << id;
    }
    EXPECT_EQ(SourceText(context.get(), 0x20, 0x2D), "16 (address). LUN 1. Channel 2.");
}

TEST(Source, LeavesOutTextsThatAreNotThereAndCutsLongOnes) {
    const ipmiseltest::TextFolder folder("543=" + std::string(110, 'L') +
                                         "\n544=" + std::string(50, 'C') + "%d\n");
    const NQORTQR20::PluginContext context(folder.path());
    const ipmiseltest::LogRecorder log;
    EXPECT_EQ(SourceText(context.get(), 0x41, 0x30), std::string(50, 'C') + "3");
    EXPECT_THAT(log.Lines(0),
                ElementsAre("Could not find data_number 537", "Error in obtaining string."));
    EXPECT_EQ(SourceText(context.get(), 0x20, 0x30),
              "16 (address). " + std::string(110, 'L') + "CCC");  // 127 characters
}

TEST(ShutDown, OnlyPartZeroCarriesComment) {
    const std::tuple<std::array<std::uint8_t, 5>, const char*> cases[] = {
        {{0, 'a', 0, 'b', 'c'}, "(Shutdown Event): Comment String Part 0: abc"},
        {{0, 0, 0, 0, 0}, "(Shutdown Event): Comment String Part 0: "},
        {{1, 0x04, 0x03, 0x02, 0x01}, "(Shutdown Event): ReasonCode: 16909060"},
        {{2, 0xFE, 0xFF, 0xFF, 0xFF}, "(Shutdown Event): ReasonCode: -2"}};
    for (const auto& [bytes, text] : cases) EXPECT_EQ(ShutDownText(bytes), text);
}

}  // namespace
