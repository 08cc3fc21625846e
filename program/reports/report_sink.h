#pragma once

#include <cstddef>
#include <functional>
#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "host/core/plugin_set.h"
#include "host/core/sink.h"
#include "program/commands/failure.h"
#include "program/reports/report.h"

namespace ipmisel {

/// The collection was stopped, and the time that is left for what had been read until then is over:
/// no instance is taken any more.
bool OutputIsOver();

/// Takes the instances of a collection to the report and counts log records by node on their way.
/// Once the report cannot be written, it takes nothing any more.
class ReportSink : public NQORTQR20::InstanceSink {
public:
    ReportSink(ReportWriter& report, const NQORTQR20::PluginSet& plugins,
               const std::vector<std::string>& wanted, std::size_t nodes);

    /// As ReportEnd::exported.
    std::vector<unsigned> Exported() const;
    /// Throws what has kept the report from being written. No exception goes through the plug-in.
    void Check() const;

    /// False as soon as nothing is taken any more: what would be refused whole need not be made.
    bool OpenInstance(std::string_view className) override;

protected:
    bool Take(const NQORTQR20::Instance& instance) override;

private:
    bool IsOver() const { return failure_ || OutputIsOver(); }

    /// A class with one instance for each log record.
    struct Counted {
        std::string nodeProperty;
        std::vector<unsigned> byNode;
        unsigned times = 0;  ///< that the user named it: it is collected so often
    };

    ReportWriter& report_;
    std::size_t nodes_;
    std::map<std::string, Counted, std::less<>> counted_;
    std::optional<Failure> failure_;
};

}  // namespace ipmisel
