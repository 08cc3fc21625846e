#pragma once

#include <memory>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "host/core/host.h"
#include "host/core/sink.h"
#include "host/spdriver/completeness.h"
#include "host/spdriver/stop.h"
#include "program/reports/output_file.h"
#include "tqr/status.h"

namespace ipmisel {

struct ReportHead {
    std::string source;
    tqrhost::PluginInfo plugin;
    std::string machineType;
    std::size_t nodes = 0;
};

struct ReportEnd {
    NQORTQR20::TTQRStatusCode status{};
    bool hasBmc = true;
    tqrhost::StopReason stopped = tqrhost::StopReason::kNone;
    std::vector<std::string> notices;
    std::vector<tqrhost::NodeCompleteness> completeness;
    std::vector<unsigned> exported;  ///< log records written, by node
};

/// One report on its way out: the instances as they come, the rest at the end. Memory does not grow
/// with the number of instances. Every operation throws Failure when the output cannot be written.
class ReportWriter {
public:
    virtual ~ReportWriter() = default;
    virtual void Add(const tqrhost::Instance& instance) = 0;
    virtual void Finish(const ReportEnd& end) = 0;
};

struct FormatInfo {
    std::string_view name;
    std::unique_ptr<ReportWriter> (*make)(OutputFile& out, const ReportHead& head);
};

/// The formats, one line each.
std::span<const FormatInfo> KnownFormats();

std::unique_ptr<ReportWriter> MakeTableReport(OutputFile& out, const ReportHead& head);
std::unique_ptr<ReportWriter> MakeJsonReport(OutputFile& out, const ReportHead& head);
std::unique_ptr<ReportWriter> MakeNdjsonReport(OutputFile& out, const ReportHead& head);

/// How a collection went: the exit status, and unless it is 0 what was wrong and what to do.
struct Outcome {
    int exitStatus;
    std::string problem;  ///< a few words, for the end of a report
    std::string advice;
};
Outcome OutcomeOf(const ReportEnd& end);

}  // namespace ipmisel
