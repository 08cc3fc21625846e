#include "ipmi/sel_record.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "ipmi/command.h"

namespace ipmi {

using testing::ElementsAre;

// Every byte differs from its neighbours.
constexpr SelBytes kEvent{0x34, 0x12, 0x02, 0x0A, 0xF8, 0xAD, 0x69, 0x2C,
                          0x72, 0x04, 0x0C, 0x80, 0xEF, 0xA5, 0x01, 0x07};

SelRecord Record(SelBytes bytes) { return ParseSelRecord(bytes).value(); }

TEST(SelRecord, NamesTheFieldsOfASensorEvent) {
    for (const std::uint8_t type : {kSystemEventType, kNonStandardEventType}) {
        SelBytes bytes = kEvent;
        bytes[2] = type;
        const SelRecord record = Record(bytes);
        EXPECT_EQ(record.kind, RecordKind::kSensorEvent);
        EXPECT_EQ(record.id, 0x1234);
        EXPECT_EQ(record.time, 0x69ADF80Au);
        EXPECT_EQ(record.generator, (Generator{false, 0x2C, 2, 7}));
        EXPECT_EQ(record.messageRevision, 4);
        EXPECT_EQ(record.sensorType, 0x0C);
        EXPECT_EQ(record.sensorNumber, 0x80);
        EXPECT_TRUE(record.deassertion);
        EXPECT_EQ(record.eventType, 0x6F);
        EXPECT_EQ(record.offset(), 5);
        EXPECT_THAT(record.data, ElementsAre(0xA5, 0x01, 0x07));
        EXPECT_TRUE(record.oemData().empty());
    }
}

TEST(SelRecord, KeepsWhatIsTheVendorsOfOtherTypes) {
    SelBytes bytes = kEvent;
    bytes[2] = 0xDF;
    const SelRecord timestamped = Record(bytes);
    EXPECT_EQ(timestamped.kind, RecordKind::kOemTimestamped);
    EXPECT_EQ(timestamped.time, 0x69ADF80Au);
    EXPECT_EQ(timestamped.manufacturerId, 0x04722Cu);
    EXPECT_THAT(timestamped.oemData(), ElementsAre(0x0C, 0x80, 0xEF, 0xA5, 0x01, 0x07));
    for (const std::uint8_t type : {0xE0, 0xEF, 0xF1, 0xFF, 0x00, 0x03, 0xBF}) {
        bytes[2] = type;
        const SelRecord record = Record(bytes);
        EXPECT_EQ(record.kind, type >= 0xE0 ? RecordKind::kOemUntimestamped : RecordKind::kUnknown);
        EXPECT_EQ(record.time, kUnspecifiedTime);
        EXPECT_EQ(record.oemData().size(), 13u);
        EXPECT_EQ(record.oemData().front(), 0x0A);
    }
}

TEST(SelRecord, IsNoneWhenCut) {
    for (std::size_t length = 0; length < kSelRecordSize; ++length) {
        EXPECT_FALSE(ParseSelRecord(std::span(kEvent).first(length))) << length;
    }
}

TEST(SelEntry, IsTheNextRecordIdAndTheRecord) {
    std::vector<std::uint8_t> answer{0xFF, 0xFF};
    answer.insert(answer.end(), kEvent.begin(), kEvent.end());
    const auto entry = ParseSelEntry(answer);
    ASSERT_TRUE(entry);
    EXPECT_EQ(entry->nextRecordId, kLastRecordId);
    EXPECT_EQ(entry->record.id, 0x1234);
    for (std::size_t length = 0; length < answer.size(); ++length) {
        EXPECT_FALSE(ParseSelEntry(std::span(answer).first(length))) << length;
    }
}

TEST(Generator, IsSoftwareInWordsOrAnAddress) {
    const struct {
        std::uint8_t low;
        std::uint8_t high;
        const char* text;
    } cases[] = {
        {0x20, 0x00, "controller 20h, LUN 0, channel 0"},
        {0x2C, 0x71, "controller 2Ch, LUN 1, channel 7"},
        {0x01, 0x00, "BIOS (software ID 00h)"},
        {0x1F, 0x00, "BIOS (software ID 0Fh)"},
        {0x21, 0x00, "SMI handler (software ID 10h)"},
        {0x41, 0x00, "system management software (software ID 20h)"},
        {0x61, 0x00, "OEM software (software ID 30h)"},
        {0x8D, 0x00, "remote console software (software ID 46h)"},
        {0x8F, 0x00, "terminal mode remote console (software ID 47h)"},
        {0xFF, 0x00, "software (software ID 7Fh)"},
    };
    for (const auto& c : cases) {
        EXPECT_EQ(GeneratorText(ParseGenerator(c.low, c.high)), c.text);
    }
}

TEST(PanicPiece, IsElevenCharactersOrEndsAtTheFirstNul) {
    SelBytes bytes{0x01, 0x00, 0xF0, 0x20, 0x03, 'F', 'a', 't',
                   'a',  'l',  ' ',  'e',  'x',  'c', 'e', 'p'};
    const PanicPiece whole = ParsePanicPiece(Record(bytes));
    EXPECT_EQ(whole.writer, 0x20);
    EXPECT_EQ(whole.sequence, 3);
    EXPECT_EQ(whole.text, "Fatal excep");
    bytes[10] = 0;
    EXPECT_EQ(ParsePanicPiece(Record(bytes)).text, "Fatal");
}

TEST(PcieError, IsReadFromTheRecordsOfItsWriterAlone) {
    const SelBytes good{0x01, 0x00, 0xC0, 0x0A, 0xF8, 0xAD, 0x69, 0x3A,
                        0xCD, 0x00, 0xC0, 0xCA, 0x01, 0x3B, 0xFD, 0x00};
    const auto error = ParsePcieError(Record(good));
    ASSERT_TRUE(error);
    EXPECT_FALSE(error->correctable);
    EXPECT_EQ(error->segment, 1);
    EXPECT_EQ(error->bus, 0x3B);
    EXPECT_EQ(error->device, 0x1F);
    EXPECT_EQ(error->function, 5);
    SelBytes correctable = good;
    correctable[11] = 0xBF;
    EXPECT_TRUE(ParsePcieError(Record(correctable))->correctable);
    for (const std::size_t broken : {2, 7, 8, 9, 10, 11}) {
        SelBytes bytes = good;
        bytes[broken] ^= 0x01;
        EXPECT_FALSE(ParsePcieError(Record(bytes))) << broken;
    }
}

}  // namespace ipmi
