#include "plugins/ipmisel/export/aux_debug_export.h"

#include "tests/plugins/ipmisel/export/export_fixture.h"

namespace ipmiseltest {
namespace {

using namespace ::testing;

constexpr const char* kAuxClass = "QORSG_ZMCAuxDebugRecord";

/// Keeps the last log line before each instance.
class LineRecorder : public InstanceRecorder {
public:
    explicit LineRecorder(const LogRecorder& log) : log_(log) {}
    std::vector<std::string> lines;

protected:
    bool Take(const NQORTQR20::Instance& instance) override {
        lines.push_back(log_.All().back().second);
        return InstanceRecorder::Take(instance);
    }

private:
    const LogRecorder& log_;
};

class AuxDebugLog : public ExportTest {
protected:
    LineRecorder written{log};
    std::vector<s_AuxLog_entry> auxEntries;

    /// `seconds` is the time of the record.
    void AddSel(std::uint16_t id, std::uint8_t seconds = 0) {
        SelRecord record = SystemEvent(id, 0x01, 0x30);
        record[3] = seconds;
        ExportTest::Add(record);
    }
    /// An entry of the type whose data counts up from there.
    void Add(std::uint16_t selId, std::uint8_t type = 0x03, std::uint16_t recordSize = 4) {
        auxEntries.push_back(AuxEntry(selId, recordSize));
        auxEntries.back().bytes[10] = type;
    }
    unsigned Export() {
        log.Clear();
        const NQORTQR20::OutputHandle output(written);
        return ExportAuxDebugLog(1, nullptr, output.get(), auxEntries.data(),
                                 static_cast<unsigned>(auxEntries.size()), entries.data(),
                                 static_cast<unsigned>(entries.size()), &mapping, Library());
    }
};

TEST_F(AuxDebugLog, WritesDebugCodesOfKnownRecords) {
    AddSel(0x0102, 1);
    AddSel(0x0304, 2);
    AddSel(0x0304, 3);
    Add(0x0304);
    Add(0x0304, 0x01);
    Add(0x0999);
    Add(0x0102);
    auxEntries.push_back({});
    Add(0x0102, 0x03, 0);
    Add(0x0102);
    auxEntries.back().bytes[2] = 0x01;  // signature
    EXPECT_EQ(Export(), 0U);

    EXPECT_THAT(written.Texts("RecordID"), ElementsAre("0", "3", "5"));
    ASSERT_EQ(written.instances.size(), 3U);
    const NQORTQR20::Instance& first = written.instances[0];
    EXPECT_EQ(first.className, kAuxClass);
    EXPECT_EQ(Names(first),
              "MessageTimestamp CreationClassName LogCreationClassName LogName RecordID RawData ");
    EXPECT_EQ(TextOf(first, "CreationClassName"), kAuxClass);
    EXPECT_EQ(TextOf(first, "LogCreationClassName"), kAuxClass);
    EXPECT_EQ(TextOf(first, "LogName"), kAuxClass);
    EXPECT_THAT(RawData(first), ElementsAre(0x03, 11, 12, 13));
    EXPECT_THAT(RawData(written.instances[2]), IsEmpty());
    EXPECT_THAT(written.lines, Each("Deleting valArray."));
    // The first of two records with one ID.
    EXPECT_EQ(written.Texts("MessageTimestamp")[0].substr(0, 14), "20240305092522");
    EXPECT_EQ(written.Texts("MessageTimestamp")[1].substr(0, 14), "20240305092521");

    EXPECT_THAT(log.Lines(1), ElementsAre("Found corresponding SEL Record Entry.",
                                          "No corresponding SEL Record found.",
                                          "Found corresponding SEL Record Entry.",
                                          "Found corresponding SEL Record Entry."));
    EXPECT_EQ(log.Lines(3)[0], "selid is 258\n");
    EXPECT_THAT(log.Lines(4), Contains("RecordSize= 4\n"));
    EXPECT_EQ(log.Lines(4).front(), "ExportAuxDebugLog() function entered.");
    EXPECT_EQ(log.Lines(4).back(), "ExportAuxDebugLog() function exited.");
}

TEST_F(AuxDebugLog, RawDataEndsWithTheEntry) {
    AddSel(1);
    for (const std::uint16_t size : {245, 246, 247, 0xFFFF}) Add(1, 0x03, size);
    EXPECT_EQ(Export(), 0U);
    std::vector<std::size_t> sizes;
    for (const auto& instance : written.instances) sizes.push_back(RawData(instance).size());
    EXPECT_THAT(sizes, ElementsAre(245U, 246U, 246U, 246U));
    EXPECT_EQ(RawData(written.instances[3]).back(), 255);
}

TEST_F(AuxDebugLog, RefusedPropertyAbandonsItsEntryAlone) {
    AddSel(1);
    Add(1);
    for (const char* property : {"MessageTimestamp", "CreationClassName", "LogCreationClassName",
                                 "LogName", "RecordID", "RawData"}) {
        written.refusedProperty = property;
        EXPECT_EQ(Export(), 0U);
        EXPECT_THAT(written.instances, IsEmpty());
        const std::string line = property == std::string("RawData")
                                     ? "Failed to add array property."
                                     : std::string("Error adding ") + property + ".";
        EXPECT_THAT(log.Lines(1), ElementsAre("Found corresponding SEL Record Entry.", line));
        EXPECT_THAT(log.Lines(4), Contains("ExportAuxDebugLog() function exited."));
    }
}

TEST_F(AuxDebugLog, WithoutArraysEndsTheExport) {
    AddSel(1);
    Add(1);
    Add(1);
    gNoArrays = true;
    EXPECT_EQ(Export(), 1U);
    EXPECT_THAT(written.instances, IsEmpty());
    EXPECT_THAT(log.Lines(1), ElementsAre("Found corresponding SEL Record Entry.",
                                          "Could not create Array for Raw Hex Data."));
    EXPECT_THAT(log.Lines(4), Not(Contains("ExportAuxDebugLog() function exited.")));
}

}  // namespace
}  // namespace ipmiseltest
