#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "host/core/host.h"
#include "host/core/plugin_set.h"
#include "host/core/sink.h"
#include "host/spdriver/completeness.h"
#include "host/spdriver/source.h"
#include "host/spdriver/stop.h"
#include "program/reports/output_file.h"
#include "tqr/status.h"

namespace ipmisel {

/// Version of what the formats for programs write: within one, keys and values keep their names and
/// their meaning, and new ones may come.
inline constexpr std::string_view kFormatVersion = "ipmisel/1";

/// A node as the user knows it, and what it said of itself; what is not known is empty.
struct SystemInfo {
    std::string name;    ///< what --name says, else the host of the source
    std::string source;  ///< as the user wrote it
    std::string guid, manufacturer, product, serial;
};

struct ReportHead {
    std::string source;
    NQORTQR20::PluginInfo plugin;  ///< the first one, of the described classes
    std::string machineType;
    std::size_t nodes = 0;
    std::vector<SystemInfo> systems{};  ///< by node; as far as known before the collection
    NQORTQR20::Time collected{};        ///< when the collection began
    /// Of every plug-in: where the node of an instance stands, and what is wanted by default.
    std::vector<NQORTQR20::ClassInfo> classes{};
    std::vector<std::string> wanted{};  ///< the classes that are collected, in their order
    bool named = false;                 ///< the user named them
};

/// How a collection went: the exit status, and unless it is 0 what was wrong and what to do.
struct Outcome {
    int exitStatus;
    std::string problem;  ///< a few words, for the end of a report
    std::string advice;
};

struct ReportEnd {
    NQORTQR20::TTQRStatusCode status{};  ///< the first of the plug-ins' that is not 0
    bool hasBmc = true;
    NQORTQR20::StopReason stopped = NQORTQR20::StopReason::kNone;
    std::vector<std::string> notices;
    std::vector<NQORTQR20::NodeCompleteness> completeness;
    /// Log records written, by node: the fewest of the classes with one instance for each record.
    /// Empty when no such class was asked for.
    std::vector<unsigned> exported;
    std::vector<NQORTQR20::UnreachableNode> unreachable{};
    std::vector<NQORTQR20::PluginStatus> plugins{};
    std::vector<SystemInfo> systems{};  ///< by node, with what the controllers said of themselves
    std::optional<double> seconds{};    ///< that the collection took
    std::size_t hiddenEvents = 0;       ///< that the reader did not want to see
    std::optional<Outcome> recorded{};  ///< of a report that is read again
};

/// The number of the node that an instance belongs to, from 1, as the property of that name says,
/// or that of its class; empty when it belongs to none.
std::optional<std::int64_t> NodeOf(const NQORTQR20::Instance& instance, std::string_view property);
std::optional<std::int64_t> NodeOf(const NQORTQR20::Instance& instance, const ReportHead& head);
/// The property that says so in a class.
std::string_view NodeProperty(std::string_view className, const ReportHead& head);

/// How a report for people looks.
struct ReportLook {
    std::size_t width = 100;  ///< columns
    bool colour = false;
};

/// One report on its way out: the instances as they come, the rest at the end. Memory does not grow
/// with the number of instances. Every operation throws Failure when the output cannot be written.
class ReportWriter {
public:
    virtual ~ReportWriter() = default;
    virtual void Add(const NQORTQR20::Instance& instance) = 0;
    virtual void Finish(const ReportEnd& end) = 0;
};

struct FormatInfo {
    std::string_view name;
    std::string_view description;
    std::unique_ptr<ReportWriter> (*make)(OutputFile& out, const ReportHead& head,
                                          const ReportLook& look);
    /// The classes that are collected for it when none is named; none: the default ones.
    std::span<const std::string_view> classes;
    bool forPeople = false;  ///< shows events, of which fewer may be wanted
};

/// The formats, one line each.
std::span<const FormatInfo> KnownFormats();
/// Null for a name that none has.
const FormatInfo* FindFormat(std::string_view name);

using MakeReport = std::unique_ptr<ReportWriter>(OutputFile& out, const ReportHead& head,
                                                 const ReportLook& look);
MakeReport MakeTableReport, MakeJsonReport, MakeNdjsonReport, MakeEventsReport, MakeCsvReport,
    MakeHtmlReport, MakeRedfishReport, MakePrometheusReport, MakeOtlpReport;

Outcome OutcomeOf(const ReportEnd& end);
/// The problem and what to do about it, for standard error.
std::string LineOf(const Outcome& outcome);

}  // namespace ipmisel
