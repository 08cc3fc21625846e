#include "program/commands/report.h"

#include <CLI/CLI.hpp>
#include <algorithm>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "program/commands/arguments.h"
#include "program/commands/collect.h"
#include "program/commands/failure.h"
#include "program/commands/plugins.h"
#include "program/commands/report_output.h"
#include "program/reports/saved_report.h"
#include "program/store/store.h"
#include "program/store/store_report.h"

namespace ipmisel {
namespace {

struct SavedOptions {
    std::optional<std::string> file;
    std::optional<std::string> store;
    std::vector<std::string> systems;  ///< of the store; none: all
    ReportOptions report;
    std::vector<std::string> plugins;
};

/// A SavedReport, or a StoreReport.
template <typename Saved>
int WriteSaved(const Saved& saved, const SavedOptions& options) {
    const FormatInfo& format = *FindFormat(options.report.format);
    ReportOutput output(options.report);
    ReportHead head = saved.Head();
    if (options.store) head.source = *options.store;
    const auto plugins = LoadPlugins(options.plugins);
    if (head.plugin.name.empty()) head.plugin = plugins->Plugins().front()->Info();
    head.classes = plugins->Classes();
    head.named = !options.report.classes.empty();
    head.wanted = head.named
                      ? options.report.classes
                      : std::vector<std::string>(format.classes.begin(), format.classes.end());
    const std::unique_ptr<ReportWriter> report = output.Make(head);
    saved.ForEach([&](const NQORTQR20::Instance& instance) {
        const auto& wanted = head.wanted;
        const bool takes = wanted.empty() || std::find(wanted.begin(), wanted.end(),
                                                       instance.className) != wanted.end();
        if (takes) report->Add(instance);
    });
    report->Finish(saved.End());
    output.Commit();
    return OutcomeOf(saved.End()).exitStatus;
}

int Report(const SavedOptions& options) {
    if (options.store) {
        const Store store(*options.store, IfMissing::kRefuse);
        // Where a name has one place, that is of the controller which answers now.
        const std::string& format = options.report.format;
        const bool past = format != "prometheus" && format != "redfish";
        return WriteSaved(StoreReport(store.database(), options.systems, past), options);
    }
    RequireStore(options.systems.empty(), "--system");
    if (!options.file) {
        throw Failure(kExitUsage, "name a saved report or a capture, or a store with --store");
    }
    if (!IsCapture(*options.file)) return WriteSaved(SavedReport(*options.file), options);
    CollectOptions replay;
    replay.access.sources = {"replay:" + *options.file};
    replay.report = options.report;
    replay.plugins = options.plugins;
    return Collect(replay);
}

}  // namespace

Command AddReportCommand(CLI::App* program) {
    CLI::App* const command = program->add_subcommand(
        "report", "Write a saved report, a capture or what a store has in another format");
    const auto options = std::make_shared<SavedOptions>();
    CLI::Option* const file =
        command
            ->add_option("FILE", options->file, "Report of --format json, or capture of --record")
            ->check(FileName());
    command
        ->add_option("--store", options->store,
                     "What a store has instead, with every event that was ever in a log")
        ->type_name("URI")
        ->check(NotEmpty("the store is empty; give sqlite:FILE or postgresql://..."))
        ->excludes(file);
    command->add_option("--system", options->systems, "A system of the store; else all")
        ->type_name("NAME")
        ->allow_extra_args(false);
    AddReportOptions(command, &options->report);
    AddPluginOption(command, &options->plugins);
    command->footer(FormatHelp());
    return {command, [options] { return Report(*options); }};
}

}  // namespace ipmisel
