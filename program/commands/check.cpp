#include "program/commands/check.h"

#include <CLI/CLI.hpp>
#include <memory>
#include <string>
#include <vector>

#include "program/commands/arguments.h"
#include "program/commands/collect.h"
#include "program/commands/failure.h"
#include "program/commands/log_lines.h"
#include "program/commands/plugins.h"
#include "program/fleet/collect_hosts.h"
#include "program/fleet/fleet_summary.h"
#include "program/fleet/service_check.h"
#include "program/reports/output_file.h"
#include "program/reports/saved_report.h"
#include "program/reports/view.h"

namespace ipmisel {
namespace {

struct CheckOptions {
    std::vector<std::string> files;
    CollectOptions collect;
    HostsOptions hosts;
};

int Print(const CheckResult& result) {
    OutputFile out(std::nullopt);
    out.Write(result.line + "\n");
    out.Commit();
    return result.status;
}

std::vector<SystemSummary> Saved(const std::vector<std::string>& files) {
    std::vector<SystemSummary> systems;
    for (const std::string& file : files) {
        const SavedReport saved(file);
        SystemSummary& system = systems.emplace_back();
        system.index = systems.size();
        system.outcome = OutcomeOf(saved.End());
        Summarize(saved, &system);
        system.name = system.system.name.empty() ? file : system.system.name;
    }
    SortWorstFirst(&systems);
    return systems;
}

int Check(CheckOptions options) {
    const bool live = !options.collect.access.sources.empty() || !options.hosts.lists.empty();
    if (!options.files.empty()) {
        if (live) {
            throw Failure(kExitUsage,
                          "a saved report goes without --from and --hosts; name one of them");
        }
        return Print(CheckSystems(Saved(options.files)));
    }
    if (!live) options.collect.access.sources = options.collect.access.Sources();
    options.collect.report.classes = {std::string(kControllerClass), std::string(kEventLogClass),
                                      std::string(kFindingClass)};
    return Print(CheckSystems(SummarizeHosts(options.collect, options.hosts)));
}

}  // namespace

Command AddCheckCommand(CLI::App* program) {
    CLI::App* const command =
        program->add_subcommand("check", "Tell in one line what is wrong, for a monitoring system");
    const auto options = std::make_shared<CheckOptions>();
    options->collect.deadlineSeconds = 50;  // a monitoring system waits for a minute
    options->collect.log.level = NQORTQR20::ILogger::kError;
    options->collect.progress = false;
    command->add_option("FILE", options->files, "Saved reports of --format json, instead of --from")
        ->check(FileName());
    AddAccessOptions(command, &options->collect.access);
    AddHostsOptions(command, &options->hosts);
    AddDeadlineOption(command, &options->collect.deadlineSeconds);
    AddSeveritiesOption(command, &options->collect.severities);
    AddPluginOption(command, &options->collect.plugins);
    AddLogLevelOption(command, &options->collect.log);
    command->footer(
        "Exit status:\n"
        "  0  no problem\n"
        "  1  a warning is the worst\n"
        "  2  a critical or fatal problem\n"
        "  3  unknown: not all could be read and nothing is wrong in what was, or the check "
        "failed\n");
    return {command, [options] { return Check(*options); },
            [](const Failure& failure) { return Print(CheckFailed(failure.what())); }};
}

}  // namespace ipmisel
