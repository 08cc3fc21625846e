#include "program/fleet/watch.h"

#include <algorithm>
#include <chrono>
#include <csignal>
#include <cstdio>
#include <map>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "base/text.h"
#include "host/spdriver/stop.h"
#include "program/commands/failure.h"
#include "program/commands/stop_signals.h"
#include "program/fleet/event_stream.h"
#include "program/fleet/fleet_report.h"
#include "program/fleet/fork_server.h"
#include "program/fleet/service_notifier.h"
#include "program/fleet/watch_schedule.h"
#include "program/fleet/worker.h"
#include "program/fleet/worker_pool.h"
#include "program/reports/saved_report.h"
#include "program/reports/terminal_text.h"
#include "program/reports/view.h"

namespace ipmisel {
namespace {

using Clock = WatchSchedule::Clock;

constexpr std::chrono::seconds kMaxWait{60};

volatile std::sig_atomic_t gReload = 0;

/// SIGHUP asks for the lists to be read again while it lives.
class ReloadSignal {
public:
    ReloadSignal() {
        struct sigaction action {};
        action.sa_handler = [](int) { gReload = 1; };
        sigaction(SIGHUP, &action, &before_);
    }
    ~ReloadSignal() { sigaction(SIGHUP, &before_, nullptr); }
    ReloadSignal(const ReloadSignal&) = delete;
    ReloadSignal& operator=(const ReloadSignal&) = delete;

private:
    struct sigaction before_ {};
};

/// What is remembered of a controller from visit to visit.
struct Watched {
    CollectOptions options{};
    std::set<std::string> keys{};  ///< of the events that were in its log; without a store
    bool visited = false;
    std::string problem{};  ///< of the last visit
};

class Watcher {
public:
    explicit Watcher(const WatchOptions& options)
        : options_(options),
          schedule_(std::chrono::seconds(options.everySeconds)),
          server_([&] { PrepareWorkers(options.collect); }, RunWorker),
          lostVisits_(options.collect.store),
          pool_(server_, options.hosts.jobs, PassLogLine) {
        options_.collect.onlyNew = options_.collect.store.has_value();
        options_.collect.report.format = WorkerFormat("json");
        options_.collect.report.classes = {std::string(kControllerClass), std::string(kEventClass)};
        Load();
    }

    void Run() {
        const SignalsHeld held;
        StopSignals::BeginCollecting();
        notifier_.Ready(Format("%zu controllers", controllers_.size()));
        bool stopping = false;
        while (!stopping || pool_.Running() > 0) {
            if (!stopping && NQORTQR20::Stopped() != NQORTQR20::StopReason::kNone) {
                stopping = true;
                notifier_.Stopping();
                pool_.Stop();
            }
            if (!stopping && std::exchange(gReload, 0) != 0) Reload();
            if (!stopping) StartDue();
            for (WorkerEnd& end : pool_.Wait(NextWake(stopping))) {
                Take(end);
                notifier_.Alive(Clock::now());
            }
            notifier_.Alive(Clock::now());
        }
        StopSignals::EndCollecting();
    }

private:
    void Load() {
        HostPlan plan(options_.collect, options_.hosts);
        std::map<std::string, CollectOptions> wanted;
        for (const HostEntry& host : plan.hosts) wanted[host.source] = plan.own.Of(host);
        std::erase_if(controllers_, [&](const auto& each) { return !wanted.contains(each.first); });
        std::vector<std::string> sources;
        for (auto& [source, options] : wanted) {
            controllers_[source].options = std::move(options);
            sources.push_back(source);
        }
        schedule_.Set(sources, Clock::now());
    }
    void Reload() {
        notifier_.Reloading();
        try {
            Load();
        } catch (const Failure& failure) {
            Say(std::string(failure.what()) + "; going on with the lists as they were");
        }
        notifier_.Ready(Format("%zu controllers", controllers_.size()));
    }

    void StartDue() {
        while (pool_.HasRoom()) {
            const auto source = schedule_.TakeDue(Clock::now());
            if (!source) return;
            const std::size_t id = started_++;
            underWay_[id] = *source;
            StartWorker(&pool_, id, controllers_.at(*source).options);
        }
    }
    Clock::time_point NextWake(bool stopping) const {
        auto wake = Clock::now() + kMaxWait;
        if (const auto due = schedule_.NextDue(); due && !stopping && pool_.HasRoom()) {
            wake = std::min(wake, *due);
        }
        return std::min(wake, notifier_.NextAlive().value_or(wake));
    }

    void Take(const WorkerEnd& end) {
        const std::string source = std::exchange(underWay_[end.id], "");
        underWay_.erase(end.id);
        const bool wasRead = end.result.reported;
        // What the options name, as the store, may be out of order: no fault of the controller.
        const bool isOfAll = end.result.outcome.exitStatus == kExitUsage;
        schedule_.Done(source, wasRead || isOfAll, Clock::now());
        const auto place = controllers_.find(source);
        if (place == controllers_.end()) return;  // no longer in the lists
        Watched& controller = place->second;
        if (isOfAll) {
            TellProblemOfAll(LineOf(end.result.outcome));
        } else {
            TellProblem(end.result.outcome, &controller);
        }
        lostVisits_.Add(controller.options.names.front(), end);
        if (wasRead) TakeEvents(source, end, &controller);
    }
    /// Once, and when it is over, not at each visit.
    static void TellProblem(const Outcome& outcome, Watched* controller) {
        if (outcome.problem == controller->problem) return;
        const std::string& name = controller->options.names.front();
        Say(name + ": " + (outcome.problem.empty() ? "read whole again" : outcome.problem));
        controller->problem = outcome.problem;
    }
    /// Not for each controller, and not at each visit.
    void TellProblemOfAll(const std::string& problem) {
        const auto now = Clock::now();
        if (problem == problemOfAll_ && now < problemToldUntil_) return;
        Say(problem);
        problemOfAll_ = problem;
        problemToldUntil_ = now + std::chrono::seconds(options_.everySeconds);
    }
    void TakeEvents(const std::string& source, const WorkerEnd& end, Watched* controller) {
        const SavedReport report = ReadWorkerReport(source, end.report.get());
        std::set<std::string> keys;
        report.ForEach([&](const NQORTQR20::Instance& instance) {
            if (instance.className != kEventClass) return;
            if (options_.collect.store) return events_.Add(instance, report.Head());
            const std::string key = EventOf(instance).key;
            const bool isNew = keys.insert(key).second && !controller->keys.contains(key);
            if (isNew && controller->visited) events_.Add(instance, report.Head());
        });
        events_.Flush();
        // What could not be read this time is not gone.
        if (end.result.outcome.exitStatus != kExitCollected) keys.merge(controller->keys);
        controller->keys = std::move(keys);
        controller->visited = true;
    }

    WatchOptions options_;
    ServiceNotifier notifier_;
    WatchSchedule schedule_;
    EventStream events_;
    std::map<std::string, Watched> controllers_;  ///< by source
    std::size_t started_ = 0;
    std::map<std::size_t, std::string> underWay_;  ///< source by worker
    std::string problemOfAll_;
    Clock::time_point problemToldUntil_{};
    ForkServer server_;
    LostVisits lostVisits_;
    WorkerPool pool_;
};

}  // namespace

int Watch(const WatchOptions& options) {
    Watcher watcher(options);
    const StopSignals signals;
    const ReloadSignal reload;
    watcher.Run();
    return kExitCollected;
}

}  // namespace ipmisel
