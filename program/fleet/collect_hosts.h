#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "program/commands/collect.h"
#include "program/fleet/fleet_summary.h"
#include "program/fleet/host_list.h"
#include "program/fleet/host_options.h"
#include "program/fleet/worker_pool.h"

namespace ipmisel {

/// A collection from many controllers: those of the lists and those that --from names.
struct HostsOptions {
    std::vector<std::string> lists;  ///< as the user wrote them
    std::size_t jobs = 64;           ///< collections at a time
    std::optional<std::string> shard;
};
/// Adds --hosts, --jobs and --shard to a command.
void AddHostsOptions(CLI::App* command, HostsOptions* options);

/// The controllers that are meant, in their order, and what each of them takes. Throws Failure.
struct HostPlan {
    HostPlan(const CollectOptions& common, const HostsOptions& meant);

    std::vector<HostEntry> hosts;
    HostOptions own;
};

/// Starts a worker with these options, as HostOptions gives them, and kills it some time after its
/// deadline.
void StartWorker(WorkerPool* pool, std::size_t id, const CollectOptions& options);
/// Stores that visits failed whose workers could not do so themselves. A store that cannot be used
/// is said to be so, and is not tried again for a while: many may be lost with it.
class LostVisits {
public:
    /// Throws Failure when the store, if there is one, cannot be used from the beginning.
    explicit LostVisits(std::optional<std::string> uri);
    void Add(const std::string& name, const WorkerEnd& end);

private:
    std::optional<std::string> uri_;
    WorkerPool::Clock::time_point notBefore_{};
};
/// Hands a worker's line on to standard error.
void PassLogLine(std::string_view line);

/// Collects from each controller in a process of its own, and writes the report of all; the exit
/// status. Throws Failure.
int CollectHosts(const CollectOptions& options, const HostsOptions& hosts);
/// What is wrong with each of them instead, the worst first; `options` name the classes for it.
std::vector<SystemSummary> SummarizeHosts(const CollectOptions& options, const HostsOptions& hosts);

}  // namespace ipmisel
