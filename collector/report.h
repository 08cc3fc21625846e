#pragma once

#include <cstdio>
#include <memory>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "host/core/host.h"
#include "host/core/sink.h"
#include "host/spdriver/transport.h"
#include "tqr/status.h"

namespace ipmisel {

struct ReportHead {
    std::string source;
    tqrhost::PluginInfo plugin;
};

struct ReportEnd {
    NQORTQR20::TTQRStatusCode status{};
    std::vector<std::string> notices;
    std::vector<tqrhost::NodeCompleteness> completeness;
    std::vector<unsigned> exported;  ///< log records written, by node
};

/// One report on its way to a stream: a sink for the instances as they come, and the rest at the
/// end. Memory does not grow with the number of instances.
class ReportWriter : public tqrhost::WholeInstanceSink {
public:
    virtual void Finish(const ReportEnd& end) = 0;
};

struct FormatInfo {
    std::string_view name;
    std::unique_ptr<ReportWriter> (*make)(std::FILE* out, const ReportHead& head);
};

/// The formats, one line each.
std::span<const FormatInfo> KnownFormats();

std::unique_ptr<ReportWriter> MakeTableReport(std::FILE* out, const ReportHead& head);
std::unique_ptr<ReportWriter> MakeJsonReport(std::FILE* out, const ReportHead& head);
std::unique_ptr<ReportWriter> MakeNdjsonReport(std::FILE* out, const ReportHead& head);

/// What is missing of a collection, in one line; empty when nothing is.
std::string MissingText(const ReportEnd& end);

}  // namespace ipmisel
