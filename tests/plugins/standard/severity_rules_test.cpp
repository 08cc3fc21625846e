#include "plugins/standard/severity_rules.h"

#include <gtest/gtest.h>

#include "tests/plugins/standard/log_builder.h"

namespace standard {

// The severity that the rules give an event of the power supply "PS1 Status": failed.
std::string SeverityBy(const std::string& rules, bool deasserted = false) {
    LogBuilder log;
    EXPECT_EQ(SeverityRules::Parse(rules, &log.rules), std::nullopt) << rules;
    log.Sensor(0x71, kPowerSupply, 0x6F, "PS1 Status");
    log.Event(kPowerSupply, 0x71, deasserted ? kDeasserted : kAsserted, {0x01, 0xFF, 0xFF});
    const Event event = log.Derive()[0];
    if (event.severityFrom != SeverityOrigin::kUser) return "not the user's";
    return event.severity ? std::string(SeverityName(*event.severity)) : "none";
}

TEST(SeverityRules, TheFirstWhoseConditionsAllHoldGivesTheSeverity) {
    const struct {
        const char *rules, *severity;
    } cases[] = {
        {"", "not the user's"},
        {"# nothing\n\n   \n", "not the user's"},
        {"warning sensor-type=8", "warning"},
        {"warning sensor-type=0x08", "warning"},
        {"warning sensor-type=9", "not the user's"},
        {"warning event-type=0x6f", "warning"},
        {"warning event-type=1", "not the user's"},
        {"warning offset=1", "warning"},
        {"warning offset=2", "not the user's"},
        {"warning number=0x71", "warning"},
        {"warning number=0x72", "not the user's"},
        {"warning owner=0x20", "warning"},
        {"warning owner=0x2C", "not the user's"},
        {"warning sensor=\"PS1 Status\"", "warning"},
        {"warning sensor=\"PS1\"", "not the user's"},
        {"warning offset=1 direction=asserted", "warning"},
        {"warning offset=1 direction=deasserted", "not the user's"},
        {"warning offset=1 sensor-type=9\nfatal offset=1\nok offset=1", "fatal"},
        {"none offset=1", "none"},
        {"\t information \toffset=1\t# why\r\n", "information"},
    };
    for (const auto& c : cases) EXPECT_EQ(SeverityBy(c.rules), c.severity) << c.rules;
}

TEST(SeverityRules, HoldForADeassertionOnlyWhenTheySaySo) {
    EXPECT_EQ(SeverityBy("fatal offset=1", true), "not the user's");
    EXPECT_EQ(SeverityBy("fatal offset=1 direction=deasserted", true), "fatal");
}

TEST(SeverityRules, ABadLineIsRefusedWithItsNumber) {
    const struct {
        const char *line, *problem;
    } cases[] = {
        {"bad offset=1",
         "\"bad\" is no severity: information, ok, warning, critical, fatal or none"},
        {"warning", "a rule needs a condition"},
        {"warning # offset=1", "a rule needs a condition"},
        {"warning offset", "\"offset\" is no condition of the form name=value"},
        {"warning color=1", "\"color\" is no condition"},
        {"warning offset=16", "offset is a number from 0 to 15"},
        {"warning offset=", "offset is a number from 0 to 15"},
        {"warning offset=1x", "offset is a number from 0 to 15"},
        {"warning offset=-1", "offset is a number from 0 to 15"},
        {"warning event-type=0x80", "event-type is a number from 0 to 127"},
        {"warning number=256", "number is a number from 0 to 255"},
        {"warning number=0x", "number is a number from 0 to 255"},
        {"warning sensor=Fan", "the name of a sensor stands in quotation marks, sensor=\"Fan 1\""},
        {"warning sensor=\"\"", "the name of a sensor stands in quotation marks, sensor=\"Fan 1\""},
        {"warning sensor=\"Fan 1",
         "the name of a sensor stands in quotation marks, sensor=\"Fan 1\""},
        {"warning sensor=\"Fan\"1\"",
         "the name of a sensor stands in quotation marks, sensor=\"Fan 1\""},
        {"warning offset=1 number=2 offset=1", "offset stands twice"},
        {"warning direction=up", "direction is asserted or deasserted"},
    };
    for (const auto& c : cases) {
        SeverityRules rules;
        const auto problem =
            SeverityRules::Parse("# a comment\nok offset=1\n" + std::string(c.line) + "\n", &rules);
        ASSERT_TRUE(problem) << c.line;
        EXPECT_EQ(problem->line, 3u) << c.line;
        EXPECT_EQ(problem->text, c.problem) << c.line;
    }
}

}  // namespace standard
