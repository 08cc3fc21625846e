#pragma once

#include <string>
#include <vector>

#include "program/fleet/fleet_summary.h"

namespace ipmisel {

/// Exit statuses of a service check, by the guidelines of the Monitoring Plugins project.
constexpr int kCheckOk = 0;
constexpr int kCheckWarning = 1;
constexpr int kCheckCritical = 2;
constexpr int kCheckUnknown = 3;

/// What a monitoring system takes: one line, in which performance data stand after a bar.
struct CheckResult {
    int status;
    std::string line;
};

/// The state of some systems, which are sorted with the worst first. Unknown only where nothing is
/// wrong in what could be read, and not all could be.
CheckResult CheckSystems(const std::vector<SystemSummary>& systems);
/// The check could not be made.
CheckResult CheckFailed(const std::string& why);

}  // namespace ipmisel
