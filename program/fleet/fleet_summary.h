#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "program/reports/output_file.h"
#include "program/reports/report.h"
#include "program/reports/saved_report.h"
#include "program/reports/view.h"

namespace ipmisel {

/// One controller on a page of many.
struct SystemSummary {
    std::size_t index = 0;  ///< in the list
    std::string name;
    SystemInfo system{};  ///< what it said of itself
    Outcome outcome{};
    bool reported = false;                   ///< there is a report of it
    std::vector<Finding> findings{};         ///< the worst first, no more than are shown
    std::size_t problems = 0;                ///< all of them
    std::size_t critical = 0;                ///< that are critical or fatal
    Integer records{};                       ///< in the event logs, where known
    std::optional<double> logUsedPercent{};  ///< of the fullest log

    std::optional<Severity> Worst() const;
};

/// Takes what a summary says from a report.
void Summarize(const SavedReport& report, SystemSummary* summary);
void AddFinding(const Finding& finding, SystemSummary* summary);
/// The worst first; behind those with a problem those that could not be read whole; the others as
/// in the list.
void SortWorstFirst(std::vector<SystemSummary>* systems);

/// "12 controllers: 1 critical, 2 warning, 8 without a problem, 1 not read".
std::string FleetVerdict(const std::vector<SystemSummary>& systems);

void WriteTableOverview(const std::vector<SystemSummary>& systems, const Outcome& outcome,
                        const ReportHead& head, const ReportLook& look, OutputFile& out);
void WriteHtmlOverview(const std::vector<SystemSummary>& systems, const Outcome& outcome,
                       const ReportHead& head, OutputFile& out);

}  // namespace ipmisel
