#include "program/commands/report_output.h"

#include <unistd.h>

#include <CLI/CLI.hpp>
#include <chrono>
#include <utility>

#include "program/commands/arguments.h"
#include "program/commands/configuration.h"
#include "program/commands/failure.h"
#include "program/commands/stop_signals.h"
#include "program/reports/event_filter.h"
#include "program/reports/severity.h"
#include "program/reports/terminal_text.h"

namespace ipmisel {
namespace {

/// Starts the pager with the first line, which a report for people writes when all is known.
class PagedReport : public ReportWriter {
public:
    PagedReport(std::unique_ptr<ReportWriter> report, Pager& pager)
        : report_(std::move(report)), pager_(pager) {}
    void Add(const NQORTQR20::Instance& instance) override { report_->Add(instance); }
    void Finish(const ReportEnd& end) override {
        if (pager_.Start()) StopSignals::LeaveTime();
        report_->Finish(end);
    }

private:
    std::unique_ptr<ReportWriter> report_;
    Pager& pager_;
};

EventWish WishOf(const ReportOptions& options) {
    EventWish wish;
    if (options.severity) wish.severity = ParseSeverity(*options.severity);
    wish.last = options.last;
    if (options.since) {
        const auto now = std::chrono::system_clock::now().time_since_epoch();
        wish.since = ParseMoment(*options.since,
                                 {std::chrono::duration_cast<std::chrono::seconds>(now).count()});
        if (!wish.since) {
            throw Failure(kExitUsage, "--since \"" + *options.since +
                                          "\" is no time; give a date such as 2026-03-09, a date "
                                          "and time in UTC, or how long ago such as 12h or 7d");
        }
    }
    return wish;
}

}  // namespace

void AddReportOptions(CLI::App* command, ReportOptions* options) {
    command->add_option("--class", options->classes, "Class to report; see \"ipmisel classes\"")
        ->type_name("CLASS")
        ->allow_extra_args(false);
    command->add_option("--format", options->format, "Form of the report; see below")
        ->type_name("FORMAT")
        ->capture_default_str()
        ->check(OneOf(Names(KnownFormats())));
    command->add_option("--output", options->output, "Write the report here, whole or not at all")
        ->type_name("FILE")
        ->check(FileName());
    command->add_option("--color", options->colour, "Colours in a table")
        ->type_name("WHEN")
        ->capture_default_str()
        ->check(OneOf({"auto", "always", "never"}));
    command->add_flag_callback(
        "--no-pager", [options] { options->pager = false; }, "Show a long table without a pager");
    command
        ->add_option("--since", options->since,
                     "Only events since a date, a date and time in UTC, or some time ago (12h, 7d)")
        ->type_name("TIME");
    command->add_option("--severity", options->severity, "Only events of this severity or worse")
        ->type_name("SEVERITY")
        ->check(OneOf(Names(Severities())));
    command->add_option("--last", options->last, "Only the last N events of each node")
        ->type_name("N")
        ->check(Number(1, 65535));
}

std::string FormatHelp() {
    std::string text = "Formats (--format):\n";
    for (const FormatInfo& info : KnownFormats()) {
        text += "  " + Fit(info.name, 12) + std::string(info.description) + "\n";
    }
    return text;
}

ReportOutput::ReportOutput(const ReportOptions& options)
    : options_(options), file_(options.output) {}

std::unique_ptr<ReportWriter> ReportOutput::Make(const ReportHead& head) {
    const FormatInfo& format = *FindFormat(options_.format);
    const EventWish wish = WishOf(options_);
    if (!wish.Everything() && !format.forPeople) {
        const char* const given = wish.since ? "since" : wish.severity ? "severity" : "last";
        throw Failure(kExitUsage,
                      OptionWithOrigin(given) +
                          " goes with a report for people; leave it out with --format " +
                          options_.format);
    }
    const bool toFile = options_.output.has_value() && *options_.output != "-";
    auto report =
        FilterEvents(format.make(file_, head, LookOfOutput(options_.colour, toFile)), wish);
    const bool paged = format.name == "table" && options_.pager && !toFile;
    return paged ? std::make_unique<PagedReport>(std::move(report), pager_) : std::move(report);
}

bool ReportOutput::StreamsToTerminal() const {
    const bool toFile = options_.output.has_value() && *options_.output != "-";
    return !toFile && !FindFormat(options_.format)->forPeople && isatty(STDOUT_FILENO) == 1;
}

void ReportOutput::Commit() {
    file_.Commit();
    pager_.Wait();
}

}  // namespace ipmisel
