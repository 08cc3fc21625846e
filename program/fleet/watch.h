#pragma once

#include "program/commands/collect.h"
#include "program/fleet/collect_hosts.h"

namespace ipmisel {

struct WatchOptions {
    CollectOptions collect;
    HostsOptions hosts;
    int everySeconds = 300;
};

/// Visits the controllers again and again, and writes each event that has come since the first
/// visit of its controller as a line; ends at SIGTERM or SIGINT, reads the lists again at SIGHUP.
/// The exit status. Throws Failure.
int Watch(const WatchOptions& options);

}  // namespace ipmisel
