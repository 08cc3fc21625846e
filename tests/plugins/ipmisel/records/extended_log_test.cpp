#include "plugins/ipmisel/records/extended_log.h"

#include <gmock/gmock.h>

#include "tests/plugins/ipmisel/records/text_field.h"
#include "tests/support/bmc_fixture.h"

namespace {

using ::testing::ElementsAre;
using ::testing::Pair;

/// Every byte differs from its neighbours.
s_AuxLog_entry Entry(unsigned recordSize, std::uint8_t recordId = 0x34) {
    return ipmiseltest::AuxEntry(static_cast<std::uint16_t>(0x1200 + recordId),
                                 static_cast<std::uint16_t>(recordSize));
}

std::vector<IPMIExtendedSELDataEntry> Parse(const std::vector<s_AuxLog_entry>& entries) {
    return ParseExtendedSELData(entries.data(), static_cast<unsigned>(entries.size()));
}

TEST(ExtendedLog, DecodesTheEntriesWithItsSignature) {
    std::vector<s_AuxLog_entry> entries(4, Entry(33));
    for (unsigned i = 0; i < 3; ++i) entries[i].bytes[i] ^= 0x01;
    entries[3].bytes[13] = 0x90;
    const ipmiseltest::LogRecorder log;
    const auto parsed = Parse(entries);
    ASSERT_EQ(parsed.size(), 1U);
    EXPECT_EQ(parsed[0].GetSELRecordId(), 0x1234);
    EXPECT_EQ(parsed[0].GetSeverityString(), "QOR_ERROR_FATAL");
    EXPECT_EQ(parsed[0].GetOperationString(), "0x0E0F");
    EXPECT_EQ(parsed[0].GetFRUInstanceString(), "0x12131415");
    EXPECT_EQ(parsed[0].GetGUIDString(), "0x161718191A1B1C1D1E1F");
    EXPECT_EQ(parsed[0].GetExtendedDataString(), "20 21 22 23 24 25 26 27 28 29 2A ");
    EXPECT_THAT(log.All(),
                ElementsAre(Pair(3, "Entering ParseExtendedSELData."),
                            Pair(3,
                                 "recordsize = 33 t = 20 t = 21 t = 22 t = 23 t = 24 t = 25 "
                                 "t = 26 t = 27 t = 28 t = 29\n t = 2A\n x = 11"),
                            Pair(3, "20 21 22 23 24 25 26 27 28 29 2A "),
                            Pair(3, "Leaving ParseExtendedSELData.")));
}

TEST(ExtendedLog, ExtendedDataStaysInsideTheEntry) {
    const std::pair<unsigned, std::size_t> cases[] = {{0, 0},     {22, 0},    {23, 1},
                                                      {246, 224}, {247, 224}, {65535, 224}};
    for (const auto& [recordSize, bytes] : cases) {
        EXPECT_EQ(Parse({Entry(recordSize)})[0].GetExtendedDataString().size(), bytes * 3);
    }
}

TEST(ExtendedLog, NamesClassAndSubclass) {
    IPMIExtendedSELDataEntry entry;
    EXPECT_EQ(entry.GetClassString() + entry.GetSubclassString(), "Not setNot set");
    const std::tuple<std::uint8_t, std::uint8_t, const char*> cases[] = {
        {0, 7, "Computing/Unknown"},     {1, 9, "Peripheral/Spec Reserved"},
        {1, 12, "Peripheral/Network"},   {2, 4, "I/O BUS/Unknown"},
        {2, 12, "I/O BUS/I2C"},          {3, 11, "Software/Unknown"},
        {3, 18, "Software/DXE Service"}, {3, 255, "Software/Unknown"}};
    for (const auto& [classCode, subclass, texts] : cases) {
        entry.SetSubclass(subclass);
        entry.SetClass(classCode);
        EXPECT_EQ(entry.GetClassString() + "/" + entry.GetSubclassString(), texts);
    }
}

TEST(ExtendedLog, UnknownClassKeepsTheSubclassText) {
    std::vector<s_AuxLog_entry> entries(2, Entry(22));
    entries[0].bytes[16] = entries[0].bytes[17] = 1;
    const auto parsed = Parse(entries);
    EXPECT_EQ(parsed[1].GetClassString(), "Unknown");
    EXPECT_EQ(parsed[1].GetSubclassString(), "Keyboard");  // of the entry before
}

TEST(ExtendedLog, EachEntryIsFetchedOnce) {
    auto entries = Parse({Entry(23, 1), Entry(24, 2), Entry(25, 1)});
    IPMIExtendedSELDataEntry found;
    EXPECT_EQ(GetExtendedSELEntry(0x1203, &entries, &found), 1);
    EXPECT_EQ(found.GetTypeString(), "Not set");
    EXPECT_EQ(GetExtendedSELEntry(0x1201, &entries, &found), 0);
    EXPECT_EQ(found.GetExtendedDataString(), "20 ");
    EXPECT_EQ(GetExtendedSELEntry(0x11201, &entries, &found), 0);  // 16 bits count
    EXPECT_EQ(found.GetExtendedDataString(), "20 21 22 ");
    EXPECT_EQ(GetExtendedSELEntry(0x1201, &entries, &found), 1);
    EXPECT_EQ(entries.size(), 1U);
}

}  // namespace
