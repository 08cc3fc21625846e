#include "program/reports/view.h"

#include <gmock/gmock.h>

#include "program/reports/event_filter.h"
#include "program/reports/severity.h"
#include "program/reports/systems.h"
#include "program/reports/wording.h"

namespace {

using ipmisel::ParseTime;
using NQORTQR20::Instance;
using NQORTQR20::Time;

TEST(View, ATimeIsReadInEveryFormOfRfc3339AndNothingElse) {
    const struct {
        const char* text;
        std::int64_t seconds;
    } cases[] = {
        {"1970-01-01T00:00:00Z", 0},
        {"2026-03-09T02:31:44Z", 1773023504},
        {"2026-03-09T02:31:44z", 1773023504},
        {"2026-03-09 03:31:44+01:00", 1773023504},
        {"2026-03-08T21:01:44-05:30", 1773023504},
        {"1969-12-31T23:59:59Z", -1},
        {"2100-01-01T00:00:00Z", 4102444800},
    };
    for (const auto& c : cases) EXPECT_EQ(ParseTime(c.text), Time{c.seconds}) << c.text;
    for (const char* text : {"2026-02-29T02:31:44Z", "2026-03-09T24:00:00Z", "2026-03-09T02:60:00Z",
                             "2026-13-09T02:31:44Z", "2026-03-09T02:31:44", "2026-03-09T02:31:44Zx",
                             "2026-03-09T02:31:44+1:00", "2026-03-09T02:31:44+24:00",
                             "-026-03-09T02:31:44Z", "2026-03-+9T02:31:44Z", ""}) {
        EXPECT_EQ(ParseTime(text), std::nullopt) << text;
    }
}

TEST(View, PropertiesAreTakenByNameInAnyOrderAndOnlyInTheirType) {
    const ipmisel::Event event =
        ipmisel::EventOf({"IPMI_Event",
                          {{"Raw", std::string("0100022080a5695b0004013001595045")},
                           {"Reading", std::int64_t{80}},
                           {"Later", std::string("a property of a later version")},
                           {"Time", std::string("2026-03-09T02:31:44Z")},
                           {"ResolvedTime", Time{7}},
                           {"Severity", std::string("fatal")},
                           {"PartCertain", false},
                           {"PartCandidates", std::vector<std::string>{"A", "B"}},
                           {"RecordID", std::string("1")}}});
    EXPECT_EQ(event.reading, 80.0);
    EXPECT_EQ(event.time, Time{1773023504});
    EXPECT_EQ(event.resolvedTime, Time{7});
    EXPECT_EQ(event.severity, ipmisel::Severity::kFatal);
    EXPECT_EQ(event.partCertain, false);
    EXPECT_THAT(event.partCandidates, testing::ElementsAre("A", "B"));
    EXPECT_EQ(event.recordId, std::nullopt);
    EXPECT_EQ(event.stillPresent, std::nullopt);
    ASSERT_TRUE(event.Record());
    EXPECT_EQ((*event.Record())[0], 0x01);
    EXPECT_EQ((*event.Record())[15], 0x45);
    for (const char* raw :
         {"", "01", "0100022080a5695b000401300159504", "0100022080a5695b00040130015950g5",
          "0100022080a5695b00040130015950+5"}) {
        ipmisel::Event broken;
        broken.raw = raw;
        EXPECT_FALSE(broken.Record()) << raw;
    }
}

TEST(View, FindingsOfSeveralNodesAreTheWorstFirst) {
    ipmisel::MachineState machine;
    const std::pair<const char*, const char*> findings[] = {
        {"critical", "a"}, {"warning", "b"}, {"fatal", "c"}, {"critical", "d"}, {"warning", "e"}};
    for (const auto& [severity, title] : findings) {
        machine.Add(
            {"IPMI_Finding", {{"Severity", std::string(severity)}, {"Title", std::string(title)}}});
    }
    std::string order;
    for (const ipmisel::Finding& finding : machine.findings) order += finding.title;
    EXPECT_EQ(order, "cadbe");
}

TEST(View, ANodeIsCalledByItsNumberWhereAnotherHasItsName) {
    const auto label = [](std::vector<std::string> names, std::int64_t node) {
        ipmisel::ReportHead head;
        head.nodes = names.size();
        for (const std::string& name : names) head.systems.emplace_back().name = name;
        return ipmisel::Systems(head).LabelOf(node);
    };
    EXPECT_EQ(label({"a"}, 1), "");
    EXPECT_EQ(label({"a", "b"}, 2), "b");
    EXPECT_EQ(label({"a", "a"}, 2), "node 2");
    EXPECT_EQ(label({"", ""}, 1), "node 1");
}

TEST(View, AMomentIsADateATimeOrHowLongAgo) {
    const Time now{1773100800};  // 2026-03-10
    const struct {
        const char* text;
        std::int64_t seconds;
    } cases[] = {
        {"2026-03-09", 1773014400},
        {"2026-03-09 02:31", 1773023460},
        {"2026-03-09 02:31:44", 1773023504},
        {"2026-03-09T03:31:44+01:00", 1773023504},
        {"90m", 1773095400},
        {"12h", 1773057600},
        {"7d", 1772496000},
        {"0d", 1773100800},
    };
    for (const auto& c : cases) {
        EXPECT_EQ(ipmisel::ParseMoment(c.text, now), Time{c.seconds}) << c.text;
    }
    for (const char* text : {"7", "7w", "d", "-1d", "99999999999d", "yesterday", ""}) {
        EXPECT_EQ(ipmisel::ParseMoment(text, now), std::nullopt) << text;
    }
}

/// Takes down which events come through.
class Records : public ipmisel::ReportWriter {
public:
    explicit Records(std::string* seen) : seen_(seen) {}
    void Add(const Instance& instance) override {
        const auto record = ipmisel::EventOf(instance).recordId;
        *seen_ += record ? std::to_string(*record) : "x";
    }
    void Finish(const ipmisel::ReportEnd& end) override {
        *seen_ += "-" + std::to_string(end.hiddenEvents);
    }

private:
    std::string* seen_;
};

TEST(View, FewerEventsAreShownWhenFewerAreWanted) {
    using ipmisel::Severity;
    const struct {
        ipmisel::EventWish wish;
        const char* seen;
    } cases[] = {
        {{}, "12345x-0"},
        {{.since = Time{20}}, "234x-2"},  // a record without a time is as old as the one before it
        {{.severity = Severity::kWarning}, "24x-3"},
        {{.last = 2}, "x345-2"},  // of each node
        {{.since = Time{20}, .severity = Severity::kWarning, .last = 1}, "x4-4"},
    };
    const std::vector<std::pair<std::optional<Time>, const char*>> events = {
        {Time{10}, "ok"},
        {Time{20}, "critical"},
        {std::nullopt, ""},
        {Time{30}, "warning"},
        {Time{5}, "information"}};
    for (const auto& c : cases) {
        std::string seen;
        const auto report = ipmisel::FilterEvents(std::make_unique<Records>(&seen), c.wish);
        std::int64_t record = 0;
        for (const auto& [time, severity] : events) {
            Instance event{"IPMI_Event",
                           {{"Node", std::int64_t{record < 4 ? 1 : 2}},
                            {"RecordID", ++record},
                            {"Severity", std::string(severity)}}};
            if (time) event.properties.emplace_back("Time", *time);
            report->Add(event);
        }
        report->Add({"IPMI_Finding", {}});
        report->Finish({});
        EXPECT_EQ(seen, c.seen);
    }
}

TEST(Wording, SaysHowAClockGoes) {
    ipmisel::Controller controller;
    controller.time = Time{1773023504};
    controller.clockUncertainty = 0.5;
    const struct {
        double offset;
        const char* text;
    } cases[] = {{0.4, " UTC, right"},
                 {-0.5, " UTC, right"},
                 {1.5, " UTC, 1.5 seconds fast"},
                 {-119, " UTC, 119 seconds slow"},
                 {-121, " UTC, 2 minutes slow"},
                 {7300, ", 2 hours ahead of UTC, its time zone not known"},  // wrong, or local time
                 {-18000, ", 5 hours behind UTC, its time zone not known"},
                 {-200000, " UTC, 2 days slow"}};
    for (const auto& c : cases) {
        controller.clockOffset = c.offset;
        EXPECT_EQ(ClockText(controller), std::string("2026-03-09 02:31:44") + c.text);
    }
    controller.utcOffset = 0;
    EXPECT_EQ(ClockText(controller), "2026-03-09 02:31:44 UTC, 2 days slow, time zone UTC+00:00");
    controller.clockOffset = 7300;
    EXPECT_EQ(ClockText(controller), "2026-03-09 02:31:44 UTC, 2 hours fast, time zone UTC+00:00");
    controller.time.reset();
    controller.clockOffset.reset();
    controller.utcOffset = -330;
    EXPECT_EQ(ClockText(controller), "time zone UTC-05:30");
}

TEST(Wording, SaysWhyThereIsNoEvent) {
    const struct {
        std::optional<unsigned> first, second;  ///< announced, and none read
        int exitStatus;
        const char *ofFirst, *ofSecond, *ofAll;
    } cases[] = {
        {0, 0, 4, "No events.", "No events.", "No events."},
        {0, 3, 4, "No events.", "No event could be read.", "No event could be read."},
        {std::nullopt, 0, 4, "No event could be read.", "No events.", "No event could be read."},
        {std::nullopt, 3, 0, "No events.", "No events.", "No events."},  // nobody wanted to
    };
    for (const auto& c : cases) {
        ipmisel::ReportEnd end;
        end.recorded = ipmisel::Outcome{c.exitStatus, "", ""};
        end.completeness = {{"a", {c.first}, {}, {}}, {"b", {c.second}, {}, {}}};
        EXPECT_EQ(ipmisel::NoEventsText(end, 0), c.ofFirst);
        EXPECT_EQ(ipmisel::NoEventsText(end, 1), c.ofSecond);
        EXPECT_EQ(ipmisel::NoEventsText(end), c.ofAll);
        end.hiddenEvents = 2;
        EXPECT_EQ(ipmisel::NoEventsText(end, 0), "No such events.");
    }
}

TEST(Severities, AreOrderedAndNamedOnce) {
    EXPECT_EQ(ipmisel::ParseSeverity("fatal"), ipmisel::Severity::kFatal);
    EXPECT_EQ(ipmisel::ParseSeverity("Fatal"), std::nullopt);
    for (const auto& info : ipmisel::Severities()) {
        EXPECT_EQ(ipmisel::ParseSeverity(info.name), info.severity);
        EXPECT_LE(info.shortName.size(), 8U);
    }
}

}  // namespace
