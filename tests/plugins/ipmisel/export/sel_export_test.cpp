#include "plugins/ipmisel/export/sel_export.h"

#include <memory>
#include <string>
#include <vector>

#include "plugins/ipmisel/export/event_message.h"
#include "plugins/ipmisel/log.h"
#include "tests/plugins/ipmisel/export/export_fixture.h"

namespace ipmiseltest {
namespace {

using namespace ::testing;

constexpr const char* kNoTime = "19700101000000.000000+000";

class SelExport : public ExportTest {
protected:
    std::vector<IPMIExtendedSELDataEntry> extended;

    static SelRecord Record(std::uint16_t id, std::uint8_t type) {
        return type == 0x02 ? SystemEvent(id, 0x01, 0x30) : OtherRecord(id, type);
    }
    void AddSensor(std::uint8_t number, std::uint8_t entity, std::uint8_t instance,
                   const std::string& name) {
        auto& sensor = *sensors_.emplace_back(std::make_unique<IPMISDREntry>());
        sensor.sdrVersion = 0x51;
        sensor.recordType = 0x01;
        sensor.sensorNumber = number;
        sensor.entityId = entity;
        sensor.entityInstance = instance;
        sensor.m = 1;
        name.copy(sensor.IDString.get(), 16);
        sensor.IDString[name.size()] = '\0';
        cache_.push_back(&sensor);
    }
    unsigned Export(int node = 0, int recordIdOffset = 0) {
        const NQORTQR20::OutputHandle output(written);
        log.Clear();
        return ExportSEL(node, context.get(), output.get(), nullptr, &mapping, nullptr, &cache_,
                         entries.data(), static_cast<unsigned>(entries.size()), recordIdOffset,
                         extended, Library());
    }

private:
    std::vector<std::unique_ptr<IPMISDREntry>> sensors_;
    SDRCache cache_;
};

TEST_F(SelExport, WritesThePropertiesOfEachRecordTypeInOrder) {
    const std::string bothTimes = "MessageTimestamp CreationTimeStamp ";
    const struct {
        std::uint8_t type;
        std::string names;
        const char* sensorType;
        bool hasTime = true;
    } cases[] = {
        {0xC0, bothTimes + "SensorType Message ", "OEM POST with Time Stamp"},
        {0xC1, bothTimes + "SensorType Message ", "OEM SMI Handler with Time Stamp"},
        {0xE0, bothTimes + "SensorType Message ", "OEM POST No Time Stamp", false},
        {0xE1, bothTimes + "SensorType Message ", "OEM SMI No Time Stamp", false},
        {0xDC, "MessageTimestamp SensorType Message ", "Boot Time"},
        {0xDD, "MessageTimestamp SensorType Message ", "Shutdown Event"},
        {0x7F, bothTimes + "Message ", "(none)", false},
        {0x02,
         bothTimes + "Source SensorType EventType Entity EntityInstance SensorInformation Message ",
         "Temperature"},
    };
    for (const auto& c : cases) Add(Record(0x0105, c.type));
    EXPECT_EQ(Export(1), 0U);
    ASSERT_EQ(written.instances.size(), std::size(cases));
    for (std::size_t i = 0; i < std::size(cases); ++i) {
        SCOPED_TRACE(cases[i].sensorType);
        const NQORTQR20::Instance& instance = written.instances[i];
        EXPECT_EQ(instance.className, "QORSG_IPMILogRecord");
        EXPECT_EQ(Names(instance), "CreationClassName LogCreationClassName LogName RecordID " +
                                       cases[i].names + "AuxLog SourceNode RawData ");
        EXPECT_EQ(Text(i, "SensorType"), cases[i].sensorType);
        EXPECT_EQ(Text(i, "CreationClassName"), "QORSG_IPMILog");
        EXPECT_EQ(Text(i, "LogName"), "IPMILogEntry");
        EXPECT_EQ(Text(i, "RecordID"), "261");
        EXPECT_EQ(Text(i, "SourceNode"), "2");
        EXPECT_EQ(Text(i, "AuxLog"), "No Extended Data");
        EXPECT_EQ(Text(i, "MessageTimestamp") != kNoTime, cases[i].hasTime);
        const SelRecord record = Record(0x0105, cases[i].type);
        EXPECT_EQ(RawData(instance), std::vector<std::uint8_t>(record.begin(), record.end()));
    }
    EXPECT_THAT(log.Lines(ipmisel::kWarning), IsEmpty());
}

TEST_F(SelExport, EntityNamesAboveTheNumberedOnesReachOnlyTheMessage) {
    AddSensor(0x31, 0x29, 3, "Ambient");  // the first of them
    AddSensor(0x32, 0x35, 3, "Ambient");
    AddSensor(0x33, 0x28, 1, "VRM 1");  // the last numbered one
    Add(SystemEvent(1, 0x01, 0x31));
    Add(SystemEvent(2, 0x01, 0x32, 0x81));
    Add(SystemEvent(3, 0x08, 0x33));
    Add(SystemEvent(4, 0x04, 0x34));
    Export();
    EXPECT_THAT(log.Lines(0), IsEmpty());  // no text is looked for that there is not
    ASSERT_EQ(written.instances.size(), 4U);
    const struct {
        const char *entity, *instance, *sensorType, *sensor;
        std::string message;
    } cases[] = {
        {"", "3", "Temperature", "Ambient",
         "Processing blade 3 (Temperature - Ambient): Assertion: "},
        {"", "3", "Temperature", "Ambient", " 3 (Temperature - Ambient): Deassertion: "},
        {"Battery", "1", "Power Supply", "VRM 1",
         "Battery 1 (Voltage Regulator Module - VRM 1): Assertion: "},
        {"", "", "Fan", "", "  (Fan - ): Assertion: "},  // no such sensor
    };
    for (std::size_t i = 0; i < std::size(cases); ++i) {
        EXPECT_EQ(Text(i, "Entity"), cases[i].entity);
        EXPECT_EQ(Text(i, "EntityInstance"), cases[i].instance);
        EXPECT_EQ(Text(i, "SensorType"), cases[i].sensorType);
        EXPECT_EQ(Text(i, "SensorInformation"), cases[i].sensor);
        EXPECT_EQ(Text(i, "Message").substr(0, cases[i].message.size()), cases[i].message);
    }
}

TEST(EventMessage, RewritesSomeNames) {
    // Entity, instance, sensor type, sensor, deassertion, event.
    const std::tuple<ipmisel::EventMessage, const char*> cases[] = {
        {{"Processor", "2", "Temperature", "CPU 2 Temp", false, "Too hot. "},
         "Processor 2 (Temperature - CPU 2 Temp): Assertion: Too hot. "},
        {{"Processor", "2", "Temperature", "CPU 2 Temp", true, "Too hot. "},
         "Processor 2 (Temperature - CPU 2 Temp): Deassertion: Too hot. "},
        {{"", "", "Fan", "", false, ""}, "  (Fan - ): Assertion: "},
        // The instance goes with memory, one blank more stays.
        {{"Memory Device", "32", "Memory", "DIMM 3", false, "ECC. "},
         "Memory Device  (Memory - DIMM 3): Assertion: ECC. "},
        {{"Power Unit", "1", "Power Supply", "VRM 1", false, ""},
         "Power Unit 1 (Voltage Regulator Module - VRM 1): Assertion: "},
        {{"Power Unit", "1", "Voltage", "VRM 1", false, ""},
         "Power Unit 1 (Voltage - VRM 1): Assertion: "},
        {{"Unknown", "1", "Fan", "HSDC Fan", false, ""},
         "HS IO Expansion 1 (Fan - HSDC Fan): Assertion: "},
        {{"Unknown", "1", "Fan", "Fan 7", false, ""}, "Fan 7 1 (Fan - Fan 7): Assertion: "},
        {{"Cannot tell", "1", "Fan", "Fan 7", false, ""}, "Fan 7 1 (Fan - Fan 7): Assertion: "},
        // The first occurrence alone, and not the blank beside it.
        {{"Board", "1", "Unknown Sensor Unknown", "X", false, ""},
         "Board 1 ( Sensor Unknown - X): Assertion: "},
    };
    for (const auto& [parts, message] : cases) EXPECT_EQ(Compose(parts), message);
}

TEST_F(SelExport, UnknownTypeIsLoggedWithItsIdSwapped) {
    Add(Record(0x0102, 0x7F));
    Export();
    EXPECT_EQ(Text(0, "Message"),
              "Unknown log type. Raw Data:\n02 01 7f 11 12 13 14 15 16 17 18 19 1a 1b 1c 1d");
    EXPECT_THAT(log.Lines(ipmisel::kTrace),
                Contains("This SEL entry (ID 513) has an unknown type (0x7f).\n"));
    written.refusedProperty = "Message";  // which it can do without
    EXPECT_EQ(Export(), 0U);
    ASSERT_EQ(written.instances.size(), 2U);
    EXPECT_THAT(log.Lines(ipmisel::kWarning), IsEmpty());
    EXPECT_THAT(log.Lines(ipmisel::kTrace), Contains("No Raw Data Message."));
}

TEST_F(SelExport, OffsetCountsForTheExtendedEntryToo) {
    extended.resize(1);
    extended[0].SetSELRecordId(0x05, 0x01);
    extended[0].SetType(0x02);
    extended[0].SetSeverity(0x40);
    extended[0].SetSubclass(1);
    extended[0].SetClass(1);
    extended[0].SetExtendedData("0A ");
    Add(SystemEvent(5, 0x01, 0x30));
    Export(0, 256);
    EXPECT_EQ(Text(0, "RecordID"), "261");
    EXPECT_EQ(Text(0, "AuxLog"),
              "Type: ERROR_CODE Sev: QOR_ERROR_INFO Class: Peripheral Sub-Class: Keyboard "
              "Instance: Not set GUID: Not set Extended Data: 0A ");
}

TEST_F(SelExport, RefusedPropertyAbandonsThatRecordOnly) {
    struct Case {
        std::uint8_t type;
        std::string property;
        std::string line;
    };
    std::vector<Case> cases{
        {0x02, "SourceNode", "Error adding QORSG_IPMILogRecord -- SourceNode."},
        {0x02, "RawData", "Failed to add array property."},
        {0xDC, "RecordID", "Error adding OS bootTime RecordID."},
        {0xDD, "SensorType", "Error adding OS bootTime SensorType."},
        {0xE0, "SensorType", "Error adding SensorType."},
    };
    for (const std::string property :
         {"CreationClassName", "LogCreationClassName", "LogName", "RecordID", "MessageTimestamp",
          "CreationTimeStamp", "Source", "SensorType", "EventType", "Entity", "EntityInstance",
          "SensorInformation", "Message", "AuxLog"}) {
        cases.push_back({0x02, property, "Error adding " + property + "."});
    }
    for (const Case& c : cases) {
        entries.clear();
        written.instances.clear();
        Add(Record(1, c.type));
        Add(Record(2, 0x02));
        written.refusedProperty = c.property;
        EXPECT_EQ(Export(), 0U);
        EXPECT_THAT(log.Lines(ipmisel::kWarning), ElementsAre(c.line));
        ASSERT_EQ(written.instances.size(), 1U) << c.property;
        EXPECT_EQ(Text(0, "RecordID"), "2");
    }
}

TEST_F(SelExport, WithoutAValueArrayTheExportEnds) {
    Add(Record(1, 0x02));
    Add(Record(2, 0x02));
    gNoArrays = true;
    EXPECT_EQ(Export(), 1U);
    EXPECT_THAT(written.instances, IsEmpty());
    EXPECT_THAT(log.Lines(ipmisel::kWarning),
                ElementsAre("Could not create Array for Raw Hex Data."));
    EXPECT_THAT(log.Lines(ipmisel::kTrace), Not(Contains("ExportSEL() function complete.")));
}

TEST_F(SelExport, UnknownClockDifferenceIsTolerated) {
    Silence(ipmi::kGetSelTime, 0);
    EXPECT_EQ(Export(), 0U);  // of no records
    EXPECT_THAT(written.instances, IsEmpty());
    EXPECT_THAT(log.Lines(ipmisel::kNotice),
                ElementsAre("Not synchronizing BMC time with OS time."));
    EXPECT_EQ(log.All().front().second, "ExportSEL() function entered.");
    EXPECT_EQ(log.All().back().second, "ExportSEL() function complete.");
}

}  // namespace
}  // namespace ipmiseltest
