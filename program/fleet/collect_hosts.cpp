#include "program/fleet/collect_hosts.h"

#include <unistd.h>

#include <CLI/CLI.hpp>
#include <algorithm>
#include <chrono>
#include <memory>
#include <utility>

#include "host/spdriver/stop.h"
#include "program/commands/arguments.h"
#include "program/commands/configuration.h"
#include "program/commands/failure.h"
#include "program/commands/plugins.h"
#include "program/commands/stop_signals.h"
#include "program/fleet/fleet_report.h"
#include "program/fleet/fork_server.h"
#include "program/fleet/host_list.h"
#include "program/fleet/host_options.h"
#include "program/fleet/worker.h"
#include "program/fleet/worker_pool.h"
#include "program/reports/progress.h"
#include "program/reports/terminal.h"
#include "program/reports/terminal_text.h"
#include "program/store/store.h"

namespace ipmisel {
namespace {

using Clock = WorkerPool::Clock;

constexpr int kMaxJobs = 4096;
/// Beyond its deadline, for a worker to write what it has.
constexpr std::chrono::seconds kTimeToEnd{5};
constexpr std::chrono::seconds kMaxWait{1};
constexpr std::chrono::seconds kStorePause{60};

/// What goes with one machine only.
void RefuseOptions(const CollectOptions& options) {
    const auto refuse = [](bool given, const char* option) {
        if (!given) return;
        throw Failure(kExitUsage, OptionWithOrigin(option) +
                                      " goes with one collection; leave it out, or collect from "
                                      "this controller alone with --from");
    };
    refuse(options.record.has_value(), "record");
    refuse(options.log.file.has_value(), "log-file");
    refuse(!options.names.empty(), "name");
    refuse(options.report.since.has_value(), "since");
    refuse(options.report.severity.has_value(), "severity");
    refuse(options.report.last.has_value(), "last");
}

std::vector<HostEntry> HostsOf(const CollectOptions& options, const HostsOptions& hosts) {
    std::vector<HostEntry> all;
    for (const std::string& source : options.access.sources) all.push_back({source});
    for (HostEntry& host : ParseHostLists(hosts.lists, FindConfiguredGroup)) {
        const bool isNew = std::none_of(
            all.begin(), all.begin() + static_cast<std::ptrdiff_t>(options.access.sources.size()),
            [&](const HostEntry& before) { return before.source == host.source; });
        if (isNew) all.push_back(std::move(host));
    }
    return all;
}

std::string AsNamed(const CollectOptions& options, const HostsOptions& hosts) {
    std::string text;
    for (const auto* const names : {&options.access.sources, &hosts.lists}) {
        for (const std::string& name : *names) text += (text.empty() ? "" : ",") + name;
    }
    return text + (hosts.shard ? ", part " + *hosts.shard : "");
}

class Collection {
public:
    Collection(ForkServer& server, const CollectOptions& common, std::size_t jobs,
               FleetReport& report)
        : report_(report), lostVisits_(common.store), pool_(server, jobs, PassLogLine) {
        if (common.progress) progress_.emplace();
    }

    Outcome Run(const std::vector<HostEntry>& hosts, HostOptions* own) {
        const SignalsHeld held;
        StopSignals::BeginCollecting();
        std::size_t next = 0;
        while (next < hosts.size() || pool_.Running() > 0) {
            if (NQORTQR20::Stopped() != NQORTQR20::StopReason::kNone) {
                if (!std::exchange(stopped_, true)) pool_.Stop();
                for (; next < hosts.size(); ++next) LeaveOut(next, own->Of(hosts[next]));
            }
            for (; next < hosts.size() && pool_.HasRoom(); ++next) {
                Start(next, own->Of(hosts[next]));
            }
            for (WorkerEnd& end : pool_.Wait(Clock::now() + kMaxWait)) Take(std::move(end));
            ShowProgress(hosts.size());
        }
        StopSignals::EndCollecting();
        progress_.reset();
        return outcome_.Get();
    }

private:
    void Start(std::size_t index, const CollectOptions& options) {
        names_.resize(std::max(names_.size(), index + 1));
        names_[index] = {options.access.sources.front(), options.names.front()};
        StartWorker(&pool_, index, options);
    }
    void LeaveOut(std::size_t index, const CollectOptions& options) {
        Add({index,
             options.access.sources.front(),
             options.names.front(),
             {{kExitNoSource, "interrupted before it was its turn", ""}},
             {}});
    }
    void Take(WorkerEnd end) {
        const auto& [source, name] = names_[end.id];
        const Outcome& outcome = end.result.outcome;
        if (outcome.exitStatus != kExitCollected) {
            Say(name + ": " + LineOf(outcome));
        }
        lostVisits_.Add(name, end);
        Add({end.id, source, name, std::move(end.result), std::move(end.report)});
    }
    void Add(const ControllerEnd& end) {
        outcome_.Add(end.result.outcome);
        ++done_;
        if (end.result.outcome.exitStatus != kExitCollected) ++failed_;
        report_.Add(end);
    }
    void ShowProgress(std::size_t all) {
        if (!progress_ || !progress_->Enabled()) return;
        const std::string note = failed_ == 0 ? "" : std::to_string(failed_) + " not read whole";
        progress_->Show({.what = "collecting",
                         .done = done_,
                         .total = all,
                         .unit = "controllers",
                         .note = note});
    }

    FleetReport& report_;
    LostVisits lostVisits_;
    FleetOutcome outcome_;
    std::optional<ProgressLine> progress_;
    std::size_t done_ = 0, failed_ = 0;
    bool stopped_ = false;
    std::vector<std::pair<std::string, std::string>> names_;  ///< source and name, by index
    WorkerPool pool_;
};

/// Collects from the controllers that are meant, as `common` says, into a report.
Outcome CollectInto(FleetReport& report, const CollectOptions& common, const HostsOptions& hosts) {
    // Before there is a password in memory.
    ForkServer server([&] { PrepareWorkers(common); }, RunWorker);
    HostPlan plan(common, hosts);
    const StopSignals signals;
    return Collection(server, common, hosts.jobs, report).Run(plan.hosts, &plan.own);
}

}  // namespace

HostPlan::HostPlan(const CollectOptions& common, const HostsOptions& meant)
    : hosts(HostsOf(common, meant)), own(common, hosts) {
    if (!meant.shard) return;
    std::erase_if(hosts, [shard = *ParseShard(*meant.shard)](const HostEntry& host) {
        return !shard.Has(host.source);
    });
}

void StartWorker(WorkerPool* pool, std::size_t id, const CollectOptions& options) {
    const std::chrono::duration<double> deadline(*options.deadlineSeconds);
    const auto limit =
        Clock::now() + std::chrono::duration_cast<Clock::duration>(deadline) + kTimeToEnd;
    pool->Start(id, options.names.front(), WriteWorkerRequest(options), limit);
}

LostVisits::LostVisits(std::optional<std::string> uri) : uri_(std::move(uri)) {
    if (uri_) const Store store(*uri_);
}

void LostVisits::Add(const std::string& name, const WorkerEnd& end) {
    if (!uri_ || !end.lost || Clock::now() < notBefore_) return;
    const auto now = std::chrono::duration_cast<std::chrono::seconds>(
                         std::chrono::system_clock::now().time_since_epoch())
                         .count();
    try {
        Store(*uri_).AddFailed(name, now, now, end.result.outcome.problem);
    } catch (const Failure& failure) {
        notBefore_ = Clock::now() + kStorePause;
        Say(failure.what());
    }
}

void PassLogLine(std::string_view line) {
    HideProgress();
    std::fprintf(stderr, "%.*s\n", static_cast<int>(line.size()), line.data());
}

void AddHostsOptions(CLI::App* command, HostsOptions* options) {
    command
        ->add_option("--hosts", options->lists,
                     "Many controllers: node[001-128]-bmc,rack7, @FILE with a host per line, "
                     "%GROUP of the configuration; each in a process of its own")
        ->type_name("LIST")
        ->allow_extra_args(false)
        ->check(NotEmpty("the list is empty; name hosts"));
    command->add_option("--jobs", options->jobs, "Controllers of --hosts at a time")
        ->type_name("N")
        ->capture_default_str()
        ->check(Number(1, kMaxJobs));
    command->add_option("--shard", options->shard, "The I-th of N parts of the list")
        ->type_name("I/N")
        ->check(CLI::Validator(
            [](const std::string& text) {
                return ParseShard(text) ? std::string()
                                        : "\"" + text +
                                              "\" is no part; write it as 3/8, from 1/8 "
                                              "to 8/8";
            },
            ""));
}

int CollectHosts(const CollectOptions& options, const HostsOptions& hosts) {
    RefuseOptions(options);
    const FormatInfo& format = *FindFormat(options.report.format);
    CollectOptions common = options;
    ReportHead head{.source = AsNamed(options, hosts),
                    .plugin = {},
                    .machineType = "",
                    .collected = {std::chrono::duration_cast<std::chrono::seconds>(
                                      std::chrono::system_clock::now().time_since_epoch())
                                      .count()}};
    {
        const auto plugins = LoadPlugins(options.plugins);
        head.plugin = plugins->Plugins().front()->Info();
        head.classes = plugins->Classes();
        head.wanted = ClassesToCollect(options.report.classes, format.classes, *plugins);
        head.named = !options.report.classes.empty();
        TellInbandOnly(options.report.classes, *plugins);
    }
    common.report.format = WorkerFormat(format.name);
    const bool lines = common.report.format == format.name && format.name != "json";
    // What a worker makes of its own is for another format than this one.
    if (common.report.format != format.name) common.report.classes = head.wanted;
    const bool toFile = options.report.output.has_value() && *options.report.output != "-";
    // Lines on a terminal show for themselves how far it is.
    if (lines && !toFile && isatty(STDOUT_FILENO) == 1) common.progress = false;
    OutputFile out(options.report.output);
    const auto report =
        MakeFleetReport(format, out, head, LookOfOutput(options.report.colour, toFile));
    const Outcome outcome = CollectInto(*report, common, hosts);
    Pager pager;
    if (format.name == "table" && options.report.pager && !toFile) pager.Start();
    report->Finish(outcome);
    out.Commit();
    pager.Wait();
    if (outcome.exitStatus != kExitCollected) Say(LineOf(outcome));
    return outcome.exitStatus;
}

std::vector<SystemSummary> SummarizeHosts(const CollectOptions& options,
                                          const HostsOptions& hosts) {
    CollectOptions common = options;
    common.report.format = WorkerFormat("table");
    std::vector<SystemSummary> systems;
    const auto summaries = MakeSummaries(&systems);
    summaries->Finish(CollectInto(*summaries, common, hosts));
    return systems;
}

}  // namespace ipmisel
