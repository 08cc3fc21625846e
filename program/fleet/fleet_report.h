#pragma once

#include <cstddef>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "program/fleet/file_descriptor.h"
#include "program/fleet/fleet_summary.h"
#include "program/fleet/worker.h"
#include "program/reports/output_file.h"
#include "program/reports/report.h"
#include "program/reports/saved_report.h"

namespace ipmisel {

/// How the collection from one controller of a list went.
struct ControllerEnd {
    std::size_t index;   ///< in the list
    std::string source;  ///< as in the list
    std::string name;    ///< of the system
    WorkerResult result;
    FileDescriptor report;  ///< in the format of WorkerFormat
};

/// The report of many controllers, which are added as they are done. Operations throw Failure.
class FleetReport {
public:
    virtual ~FleetReport() = default;
    virtual void Add(const ControllerEnd& end) = 0;
    virtual void Finish(const Outcome& outcome) = 0;
};

/// What one controller's worker writes for a report of all.
std::string_view WorkerFormat(std::string_view format);
/// `head` is that of the whole, without systems. Lines come in the order in which the controllers
/// are done; a report of whole machines has them in the order of the list, one for people has the
/// worst first.
std::unique_ptr<FleetReport> MakeFleetReport(const FormatInfo& format, OutputFile& out,
                                             const ReportHead& head, const ReportLook& look);

/// The report in JSON that a worker wrote, as long as the file is open. Throws Failure.
SavedReport ReadWorkerReport(const std::string& name, int file);

/// Takes reports in JSON into summaries, and in the end sorts them, the worst first.
std::unique_ptr<FleetReport> MakeSummaries(std::vector<SystemSummary>* systems);

/// What all of them make together: the status that all have, else collected in part.
class FleetOutcome {
public:
    void Add(const Outcome& outcome);
    Outcome Get() const;

private:
    std::size_t all_ = 0, whole_ = 0, notReached_ = 0;
    int common_ = 0;
    bool mixed_ = false;
};

}  // namespace ipmisel
