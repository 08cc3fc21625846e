#include "program/fleet/service_check.h"

#include "program/commands/failure.h"

namespace ipmisel {
namespace {

using namespace ::testing;

/// A system with problems of these severities.
SystemSummary System(const std::string& name,
                     const std::vector<std::optional<Severity>>& severities,
                     int exitStatus = kExitCollected) {
    SystemSummary system;
    system.name = name;
    system.records = 40;
    if (exitStatus != kExitCollected)
        system.outcome = {exitStatus, "two records not read", "again"};
    for (const auto& severity : severities) {
        Finding finding;
        finding.severity = severity;
        finding.title = "Fan 3: below";
        system.findings.push_back(finding);
        if (severity >= Severity::kCritical) ++system.critical;
    }
    system.problems = severities.size();
    return system;
}

TEST(ServiceCheck, TheWorstProblemGivesTheStatus) {
    const struct {
        std::vector<std::optional<Severity>> severities;
        int exitStatus, status;
        const char* text;
    } cases[] = {
        {{}, kExitCollected, 0, "IPMI OK - no problem | critical=0;;0;0 warning=0;0;;0 "},
        {{Severity::kWarning},
         kExitCollected,
         1,
         "IPMI WARNING - Fan 3: below | critical=0;;0;0 warning=1;"},
        {{Severity::kCritical, {}},
         kExitCollected,
         2,
         "IPMI CRITICAL - Fan 3: below; 1 more | critical=1;;0;0 warning=1;"},
        {{Severity::kFatal}, kExitCollected, 2, "IPMI CRITICAL - Fan 3: below | critical=1;"},
        {{std::nullopt}, kExitCollected, 1, "IPMI WARNING - "},
        {{}, kExitPart, 3, "IPMI UNKNOWN - two records not read; again | "},
        {{}, kExitNoSource, 3, "IPMI UNKNOWN - two records not read; again | "},
        {{Severity::kWarning},
         kExitPart,
         1,
         "IPMI WARNING - Fan 3: below; two records not read; again | "},
    };
    for (const auto& c : cases) {
        const CheckResult result = CheckSystems({System("a", c.severities, c.exitStatus)});
        EXPECT_EQ(result.status, c.status) << result.line;
        EXPECT_THAT(result.line, StartsWith(c.text));
    }
}

TEST(ServiceCheck, SeveralSystemsAreNamedAndCountedTogether) {
    SystemSummary fuller = System("b", {Severity::kWarning});
    fuller.logUsedPercent = 81.25;
    const CheckResult result = CheckSystems({System("a", {Severity::kCritical}), fuller,
                                             System("c", {}, kExitNoSource), System("d", {})});
    EXPECT_EQ(result.status, kCheckCritical);
    EXPECT_EQ(result.line,
              "IPMI CRITICAL - a: Fan 3: below; 1 more; c: two records not read; again | "
              "critical=1;;0;0 warning=1;0;;0 records=160;;;0 log_used=81.2%;;;0;100 systems=4 "
              "not_whole=1;;;0;4");
    EXPECT_THAT(CheckSystems({System("a", {}), System("b", {})}).line,
                StartsWith("IPMI OK - no problem in 2 systems | "));
}

TEST(ServiceCheck, WhatAControllerSaysStaysOneLineWithOneBar) {
    SystemSummary system = System("a", {Severity::kWarning});
    system.findings[0].title = "Fan|=1\n\x1b[2J" + std::string(5000, 'x') + "\xC3";
    const std::string line = CheckSystems({system}).line;
    EXPECT_EQ(std::count(line.begin(), line.end(), '|'), 1);
    EXPECT_THAT(line, Not(AnyOf(HasSubstr("\n"), HasSubstr("\x1b"))));
    EXPECT_LT(line.size(), 1300u);
}

TEST(ServiceCheck, WithoutASystemItIsUnknown) {
    EXPECT_EQ(CheckSystems({}).status, kCheckUnknown);
    EXPECT_EQ(CheckFailed("a\nb|c").line, "IPMI UNKNOWN - a b/c");
}

}  // namespace
}  // namespace ipmisel
