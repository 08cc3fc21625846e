#include "program/commands/report.h"

#include <CLI/CLI.hpp>
#include <algorithm>
#include <memory>
#include <string>
#include <vector>

#include "program/commands/arguments.h"
#include "program/commands/collect.h"
#include "program/commands/plugins.h"
#include "program/commands/report_output.h"
#include "program/reports/saved_report.h"

namespace ipmisel {
namespace {

struct SavedOptions {
    std::string file;
    ReportOptions report;
    std::vector<std::string> plugins;
};

int WriteSaved(const SavedOptions& options) {
    const SavedReport saved(options.file);
    const FormatInfo& format = *FindFormat(options.report.format);
    ReportOutput output(options.report);
    ReportHead head = saved.Head();
    head.classes = LoadPlugins(options.plugins)->Classes();
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
    if (!IsCapture(options.file)) return WriteSaved(options);
    CollectOptions replay;
    replay.access.sources = {"replay:" + options.file};
    replay.report = options.report;
    replay.plugins = options.plugins;
    return Collect(replay);
}

}  // namespace

Command AddReportCommand(CLI::App* program) {
    CLI::App* const command =
        program->add_subcommand("report", "Write a saved report or a capture in another format");
    const auto options = std::make_shared<SavedOptions>();
    command->add_option("FILE", options->file, "Report of --format json, or capture of --record")
        ->required()
        ->check(FileName());
    AddReportOptions(command, &options->report);
    AddPluginOption(command, &options->plugins);
    command->footer(FormatHelp());
    return {command, [options] { return Report(*options); }};
}

}  // namespace ipmisel
