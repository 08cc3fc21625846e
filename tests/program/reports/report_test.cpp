#include <gmock/gmock.h>

#include "program/commands/failure.h"
#include "program/reports/report.h"

namespace {

using ipmisel::OutcomeOf;
using ipmisel::ReportEnd;
using tqrhost::Instance;
using tqrhost::StopReason;

class Table : public testing::Test {
protected:
    /// The table of these instances, without its first line and the last.
    std::string Print(const std::vector<Instance>& instances) {
        testing::internal::CaptureStdout();
        {
            ipmisel::OutputFile out(std::nullopt);
            const auto report =
                ipmisel::MakeTableReport(out, {"sim:x", {"IPMISEL", "1.0", "1.0"}, "SIM-1", 1});
            for (const Instance& instance : instances) report->Add(instance);
            report->Finish({});
            out.Commit();
        }
        std::string text = testing::internal::GetCapturedStdout();
        text.erase(0, text.find('\n') + 1);
        return text.substr(0, text.rfind("\nCollected"));
    }
    static Instance Record(const std::string& message) {
        return {"QORSG_IPMILogRecord",
                {{"RecordID", "1"},
                 {"MessageTimestamp", "20240305120000.000000+060"},
                 {"Source", "16 (address). LUN 0. Channel 0. "},
                 {"SensorType", "Temperature"},
                 {"EventType", "Assertion, Threshold."},
                 {"Message", message},
                 {"AuxLog", "No Extended Data"},
                 {"SourceNode", "1"}}};
    }
    static void Set(Instance* record, const std::string& name, const std::string& value) {
        for (auto& [property, old] : record->properties) {
            if (property == name) old = value;
        }
    }
};

const std::string kHead =
    "\nQORSG_IPMILogRecord\n"
    "Record Time                Source       Sensor type    Direction   Message\n" +
    std::string(100, '-') + "\n";

TEST_F(Table, ARecordIsOneRowOfColumnsThatWrap) {
    Instance noTime = Record("Unknown log type. Raw Data:\n00 01");
    noTime.properties.erase(noTime.properties.begin() + 2, noTime.properties.begin() + 5);
    Set(&noTime, "RecordID", "65535");
    Set(&noTime, "MessageTimestamp", "19700101000000.000000+000");
    Instance auxiliary = Record(" (Memory - ): Deassertion: Uncorrectable");
    Set(&auxiliary, "SensorType", "Memory");
    Set(&auxiliary, "EventType", "Deassertion, Sensor-specific.");
    Set(&auxiliary, "Source", "System management software. Channel 7.");
    Set(&auxiliary, "AuxLog", "Type: Debug Code");
    const Instance wrapped = Record(
        "Processor 1 (Temperature - CPU1 Temp): Assertion: Rose above the upper limit. \n     "
        "Trigger reading: 80 degrees C.");
    EXPECT_EQ(
        Print({wrapped, noTime, auxiliary}),
        kHead +
            R"(1      2024-03-05 12:00:00 16 (address) Temperature    Assertion   Processor 1 (CPU1 Temp): Rose
                                                                   above the upper limit. Trigger
                                                                   reading: 80 degrees C.
65535  -                   -                           -           Unknown log type. Raw Data: 00 01
1      2024-03-05 12:00:00 System       Memory         Deassertion Uncorrectable Type: Debug Code
                           management
                           software.
                           Channel 7
)");
}

TEST_F(Table, AnyOtherClassIsReadableToo) {
    const Instance one{"QORSG_New\x1b", {{"Name", std::string("a\nb")}, {"Last", std::string()}}};
    const Instance other{"QORSG_New\x1b",
                         {{"RawData", std::vector<std::uint8_t>{1, 0xAB}},
                          {"Log", tqrhost::ObjectPath{"QORSG_Y", {{"Name", "z"}}}},
                          {"ANameLongerThanItsColumn_____", std::string(80, 'x')}}};
    EXPECT_EQ(Print({one, other}),
              "\nQORSG_New\uFFFD\n"
              "  Name:                    a b\n"
              "\n"
              "  RawData:                 01 ab\n"
              "  Log:                     QORSG_Y Name=z\n"
              "  ANameLongerThanItsColumn_____: " +
                  std::string(67, 'x') + "\n" + std::string(33, ' ') + std::string(13, 'x') + "\n");
}

TEST(Outcome, SaysHowItWentAndWhatIsMissing) {
    tqrhost::NodeCompleteness whole;
    whole.log = {5, 5};
    tqrhost::NodeCompleteness fru = whole;
    fru.faults = {{"Read FRU Data", "0003", "no response", false}};
    tqrhost::NodeCompleteness part = whole;
    part.log.read = 3;
    part.sensors = {7, 6};
    part.faults = {{"Read FRU Data", "0001", "no response", false},
                   {"Get SEL Entry", "0004", "short answer", true},
                   {"Get SDR", "0001", "no response", true}};
    const std::string partly = "collected in part: ";
    const std::string missing =
        "2 of 5 log records not read, 1 of 7 sensor records not read, Get SEL Entry 0004: short "
        "answer";
    const struct {
        int status;
        bool hasBmc;
        StopReason stopped;
        std::vector<tqrhost::NodeCompleteness> nodes;
        int exitStatus;
        std::string problem;
    } cases[] = {
        {0, true, StopReason::kNone, {whole, fru}, 0, ""},
        {0, true, StopReason::kNone, {part}, 4, partly + missing},
        {0, true, StopReason::kNone, {whole, part}, 4, partly + "node 2: " + missing},
        {0, true, StopReason::kDeadline, {fru}, 4, partly + "the deadline has passed"},
        {3, true, StopReason::kInterrupted, {part}, 4, partly + "interrupted; " + missing},
        {4, true, StopReason::kNone, {whole}, 1, "the pass ended with status 4 (Out of memory)"},
        {0, false, StopReason::kNone, {}, 3, "no BMC: the machine has no management controller"},
    };
    for (const auto& c : cases) {
        const ReportEnd end{{c.status}, c.hasBmc, c.stopped, {}, c.nodes, {}};
        const ipmisel::Outcome outcome = OutcomeOf(end);
        EXPECT_EQ(outcome.exitStatus, c.exitStatus) << c.problem;
        EXPECT_EQ(outcome.problem, c.problem);
        EXPECT_EQ(outcome.advice.empty(), c.exitStatus == 0);
    }
}

}  // namespace
