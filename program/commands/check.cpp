#include "program/commands/check.h"

#include <CLI/CLI.hpp>
#include <chrono>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "program/commands/arguments.h"
#include "program/commands/collect.h"
#include "program/commands/failure.h"
#include "program/fleet/collect_hosts.h"
#include "program/fleet/fleet_summary.h"
#include "program/fleet/service_check.h"
#include "program/reports/output_file.h"
#include "program/reports/saved_report.h"
#include "program/reports/view.h"
#include "program/store/store.h"

namespace ipmisel {
namespace {

struct CheckOptions {
    std::vector<std::string> files;
    std::optional<std::string> store;
    std::vector<std::string> systems;  ///< of the store; none: all
    double maxAgeSeconds = 86400;      ///< of a visit of the store
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

/// What is open in a store and not acknowledged, as it was at the last visits.
std::vector<SystemSummary> Stored(const std::string& uri, const std::vector<std::string>& names,
                                  double maxAgeSeconds) {
    Store store(uri, IfMissing::kRefuse);
    const auto now = std::chrono::duration_cast<std::chrono::seconds>(
        std::chrono::system_clock::now().time_since_epoch());
    std::vector<SystemSummary> systems;
    std::map<std::string, std::size_t> index;
    for (const StoredVisit& visit : store.LastVisits(names)) {
        index[visit.system] = systems.size();
        SystemSummary& system = systems.emplace_back();
        system.index = systems.size();
        system.name = visit.system;
        if (!visit.complete) {
            const int status = visit.kind == "failed" ? kExitNoSource : kExitPart;
            system.outcome = {status, visit.problem, ""};
        }
        if (static_cast<double>(now.count() - visit.finished) > maxAgeSeconds) {
            system.outcome = {kExitNoSource,
                              "not visited since " + NQORTQR20::TimeText({visit.finished}),
                              "see that it is still collected from"};
        }
    }
    for (const StoredFinding& stored : store.OpenFindings(names)) {
        const auto place = index.find(stored.system);
        if (stored.acknowledged || place == index.end()) continue;
        Finding finding;
        finding.severity = ParseSeverity(stored.severity);
        finding.title = stored.title;
        finding.part = stored.part;
        finding.partNumber = stored.partNumber;
        finding.serialNumber = stored.serial;
        AddFinding(finding, &systems[place->second]);
    }
    for (const std::string& name : names) {
        if (index.contains(name)) continue;
        SystemSummary& system = systems.emplace_back();
        system.index = systems.size();
        system.name = name;
        system.outcome = {kExitNoSource, "the store has no system of this name", "check --system"};
    }
    SortWorstFirst(&systems);
    return systems;
}

int Check(CheckOptions options) {
    if (options.store)
        return Print(CheckSystems(Stored(*options.store, options.systems, options.maxAgeSeconds)));
    RequireStore(options.systems.empty(), "--system");
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
    command->add_option("FILE", options->files, "Saved reports of --format json, instead of --from")
        ->check(FileName());
    CLI::Option* const store =
        command
            ->add_option("--store", options->store, "What a store has instead, by its last visits")
            ->type_name("URI")
            ->check(NotEmpty("the store is empty; give sqlite:FILE or postgresql://..."));
    command->add_option("--system", options->systems, "A system of the store; else all")
        ->type_name("NAME")
        ->allow_extra_args(false);
    command
        ->add_option("--max-age", options->maxAgeSeconds,
                     "Seconds after which a last visit of the store tells nothing any more")
        ->type_name("SECONDS")
        ->capture_default_str()
        ->check(Seconds(365 * kSecondsPerDay));
    AddAccessOptions(command, &options->collect.access);
    for (const char* other : {"FILE", "--from"}) store->excludes(command->get_option(other));
    AddHostsOptions(command, &options->hosts);
    store->excludes(command->get_option("--hosts"));
    AddPassOptions(command, &options->collect);
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
