#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <vector>

#include "program/commands/collect.h"
#include "program/fleet/fleet_summary.h"

namespace ipmisel {

/// A collection from many controllers: those of the lists and those that --from names.
struct HostsOptions {
    std::vector<std::string> lists;  ///< as the user wrote them
    std::size_t jobs = 64;           ///< collections at a time
    std::optional<std::string> shard;
};
/// Adds --hosts, --jobs and --shard to a command.
void AddHostsOptions(CLI::App* command, HostsOptions* options);

/// Collects from each controller in a process of its own, and writes the report of all; the exit
/// status. Throws Failure.
int CollectHosts(const CollectOptions& options, const HostsOptions& hosts);
/// What is wrong with each of them instead, the worst first; `options` name the classes for it.
std::vector<SystemSummary> SummarizeHosts(const CollectOptions& options, const HostsOptions& hosts);

}  // namespace ipmisel
