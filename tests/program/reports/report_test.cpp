#include <gmock/gmock.h>

#include "program/commands/failure.h"
#include "program/reports/output_file.h"
#include "program/reports/report.h"
#include "program/reports/text_table.h"
#include "program/reports/timeline.h"

namespace {

using ipmisel::OutcomeOf;
using ipmisel::ReportEnd;
using NQORTQR20::Instance;
using NQORTQR20::StopReason;

/// An event as a plug-in writes it.
Instance Event(std::int64_t record, const std::string& severity, const std::string& text) {
    return {"IPMI_Event",
            {{"Key", std::string(32, static_cast<char>('a' + record))},
             {"Node", std::int64_t{1}},
             {"RecordID", record},
             {"Time", NQORTQR20::Time{1773023504 + record}},
             {"Severity", severity},
             {"State", std::string("open")},
             {"Direction", std::string("asserted")},
             {"Sensor", std::string("CPU1 Temp")},
             {"Text", text},
             {"Part", std::string("Processor 1")}}};
}

class Table : public testing::Test {
protected:
    ipmisel::ReportHead head{.source = "sim:x",
                             .plugin = {"IPMISEL", "1.0", "1.0"},
                             .machineType = "SIM-1",
                             .nodes = 1,
                             .systems = {{"rack7", "sim:x", "", "", "", ""}},
                             .collected = {1773081722},
                             .wanted = {"IPMI_Event", "IPMI_Finding"}};
    ipmisel::ReportLook look;
    ipmisel::ReportEnd end;

    /// The table of these instances from its third line on.
    std::string Print(const std::vector<Instance>& instances) {
        testing::internal::CaptureStdout();
        {
            ipmisel::OutputFile out(std::nullopt);
            const auto report = ipmisel::MakeTableReport(out, head, look);
            for (const Instance& instance : instances) report->Add(instance);
            report->Finish(end);
            out.Commit();
        }
        std::string text = testing::internal::GetCapturedStdout();
        EXPECT_THAT(text, testing::HasSubstr("rack7: SIM-1"));
        EXPECT_THAT(text,
                    testing::HasSubstr("\n1 BMC from sim:x, collected 2026-03-09 18:42:02 UTC\n"));
        for (int lines = 2; lines > 0; --lines) text.erase(0, text.find('\n') + 1);
        return text;
    }
};

TEST(TextTable, ATitleIsNotCutWhileAnotherColumnCanGiveWay) {
    const struct {
        std::size_t width;
        const char* titles;
    } cases[] = {{40, "What is wrong              Serial number\n"},
                 {22, "What is wron  Serial n\n"}};
    for (const auto& c : cases) {
        ipmisel::TextTable table({{"What is wrong"}, {"Serial number"}}, 0);
        table.Add({.cells = {std::string(30, 'a') + " " + std::string(30, 'b'), "7"}});
        testing::internal::CaptureStdout();
        {
            ipmisel::OutputFile out(std::nullopt);
            table.Print(out, {.width = c.width});
            out.Commit();
        }
        EXPECT_THAT(testing::internal::GetCapturedStdout(), testing::StartsWith(c.titles));
    }
}

TEST_F(Table, AnEventIsOneLineWhereItFits) {
    Instance hot = Event(1, "critical", "upper critical high");
    hot.properties.insert(
        hot.properties.end(),
        {{"Reading", 80.5}, {"Threshold", 69.0}, {"Unit", std::string("degrees C")}});
    const Instance over = Event(2, "ok", "no longer: machine check");
    Instance young = Event(3, "", "boot?");
    young.properties.erase(young.properties.begin() + 3, young.properties.begin() + 5);
    young.properties.emplace_back("SecondsSinceStart", std::int64_t{3754});
    EXPECT_EQ(Print({hot, over, young}), R"(
No problem found.

Time                 Severity  Part         What happened
2026-03-09 02:31:45  critical  Processor 1  CPU1 Temp: upper critical high; 80.5 degrees C, limit 69
2026-03-09 02:31:46  ok        Processor 1  no longer: machine check
start +1:02:34       -         Processor 1  boot?

Collected: 3 IPMI_Event. Complete.
)");
    look.width = 60;
    EXPECT_THAT(Print({hot}), testing::HasSubstr(R"(
Time      Severity  Part         What happened
2026-03-09
02:31:45  critical  Processor 1  CPU1 Temp: upper critical
                                 high; 80.5 degrees C, limit
                                 69
)"));
    look = {160, true};
    EXPECT_THAT(Print({hot}),
                testing::HasSubstr("1       2026-03-09 02:31:45  \x1b[1;31mcritical\x1b[0m  open   "
                                   "Processor 1  CPU1 Temp  upper critical high  80.5 degrees "
                                   "C, limit 69\n"));
}

TEST_F(Table, FindingsStandFirstWithWhatToOrder) {
    const Instance finding{"IPMI_Finding",
                           {{"Severity", std::string("critical")},
                            {"Title", std::string("DIMM_11: uncorrectable error")},
                            {"PartNumber", std::string("MC4")},
                            {"SerialNumber", std::string("0A1B")},
                            {"PartCandidates", std::vector<std::string>{"DIMM_11", "DIMM_12"}},
                            {"FirstTime", NQORTQR20::Time{1773023504}},
                            {"LastTime", NQORTQR20::Time{1773023508}},
                            {"Count", std::int64_t{2}},
                            {"StillPresent", true}}};
    end.completeness = {{"sim:x", {1, 1}, {}, {{"Read FRU Data", "0005", "no response", false}}}};
    EXPECT_EQ(Print({Event(1, "critical", "x"), finding}), R"(
1 problem, critical.
critical  DIMM_11: uncorrectable error
          one of: DIMM_11; DIMM_12
          part number MC4, serial number 0A1B
          2026-03-09 02:31:44 to 2026-03-09 02:31:48, still present now

Time                 Severity  Part         What happened
2026-03-09 02:31:45  critical  Processor 1  x

Not read
  Read FRU Data 0005: no response

Collected: 1 IPMI_Event, 1 IPMI_Finding. Event log and sensors are complete.
)");
}

TEST_F(Table, AClassThatIsNamedIsShownByItsProperties) {
    head.named = true;
    head.wanted = {"NEW_Class\x1b"};
    const Instance one{"NEW_Class\x1b", {{"Name", std::string("a\nb")}, {"Last", std::string()}}};
    const Instance other{"NEW_Class\x1b",
                         {{"RawData", std::vector<std::uint8_t>{1, 0xAB}},
                          {"Log", NQORTQR20::ObjectPath{"NEW_Y", {{"Name", "z"}}}},
                          {"Real", 1.5},
                          {"Truth", true},
                          {"At", NQORTQR20::Time{0}},
                          {"Texts", std::vector<std::string>{"p", "q"}},
                          {"Long", std::string(90, 'x')}}};
    EXPECT_EQ(Print({one, other, {"OTHER_Class", {{"Name", std::string("not asked for")}}}}),
              "\nNEW_Class\uFFFD\n"
              "  Name:                    a b\n"
              "\n"
              "  RawData:                 01 ab\n"
              "  Log:                     NEW_Y Name=z\n"
              "  Real:                    1.5\n"
              "  Truth:                   yes\n"
              "  At:                      1970-01-01 00:00:00\n"
              "  Texts:                   p; q\n"
              "  Long:                    " +
                  std::string(73, 'x') + "\n" + std::string(27, ' ') + std::string(17, 'x') +
                  "\n\nCollected: 2 NEW_Class\uFFFD, 1 OTHER_Class. Complete.\n");
}

TEST(Outcome, SaysHowItWentAndWhatIsMissing) {
    NQORTQR20::NodeCompleteness whole;
    whole.log = {5, 5};
    NQORTQR20::NodeCompleteness fru = whole;
    fru.faults = {{"Read FRU Data", "0003", "no response", false}};
    NQORTQR20::NodeCompleteness part = whole;
    part.source = "lan:b";
    part.log.read = 3;
    part.sensors = {7, 6};
    part.faults = {{"Read FRU Data", "0001", "no response", false},
                   {"Get SEL Entry", "0004", "short answer", true},
                   {"Get SDR", "0001", "no response", true}};
    const std::string partly = "collected in part: ";
    const std::string missing =
        "2 of 5 log records not read, 1 of 7 sensor records not read, Get SEL Entry 0004: short "
        "answer";
    NQORTQR20::NodeCompleteness dropped = whole;
    dropped.log.exported = 4;
    const struct {
        int status;
        bool hasBmc;
        StopReason stopped;
        std::vector<NQORTQR20::NodeCompleteness> nodes;
        int exitStatus;
        std::string problem;
    } cases[] = {
        {0, true, StopReason::kNone, {whole, fru}, 0, ""},
        {0, true, StopReason::kNone, {part}, 4, partly + missing},
        {0, true, StopReason::kNone, {whole, part}, 4, partly + "node 2 (lan:b): " + missing},
        {0, true, StopReason::kNone, {dropped}, 4, partly + "1 of 5 log records not exported"},
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
    ReportEnd end;
    end.completeness = {whole};
    end.unreachable = {{"lan:a", "lan:a: no answer"}, {"lan:c", "lan:c: no answer"}};
    EXPECT_EQ(OutcomeOf(end).exitStatus, 4);
    EXPECT_EQ(OutcomeOf(end).problem,
              partly + "lan:a could not be opened; lan:c could not be opened");
}

TEST(Timeline, MarksWhatAnEventChangesOfTheMachine) {
    const struct {
        std::int64_t sensorType, offset;
        const char* direction;
        const char* change;  // null: none
    } cases[] = {{0x09, 0, "asserted", "power off"},
                 {0x09, 0, "deasserted", "power on"},
                 {0x09, 4, "asserted", nullptr},
                 {0x12, 5, "asserted", "clock set"},
                 {0x22, 0, "asserted", "power on"},
                 {0x22, 3, "asserted", "sleep"},
                 {0x22, 4, "asserted", "power off"},
                 {0x22, 8, "asserted", "sleep"},
                 {0x22, 11, "asserted", "power on"},
                 {0x22, 12, "asserted", "power off"},
                 {0x22, 14, "asserted", nullptr},
                 {0x22, 0, "deasserted", nullptr},
                 {0x20, 1, "asserted", "operating system stops"},
                 {0x20, 5, "asserted", nullptr}};
    for (const auto& c : cases) {
        ipmisel::Event event;
        event.eventTypeCode = 0x6F;
        event.sensorTypeCode = c.sensorType;
        event.offset = c.offset;
        event.direction = c.direction;
        ipmisel::Timeline timeline;
        timeline.Add(event, "");
        const std::string svg = timeline.Svg();
        const auto at = svg.find("<circle class=\"mark\"");  // in the machine's lane
        EXPECT_EQ(at != std::string::npos, c.change != nullptr) << c.sensorType << ' ' << c.offset;
        if (c.change == nullptr || at == std::string::npos) continue;
        EXPECT_THAT(svg.substr(at), testing::HasSubstr(std::string("<title>") + c.change + "<"));
    }
}

}  // namespace
