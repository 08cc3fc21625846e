#pragma once

#include <optional>
#include <string>
#include <vector>

#include "program/commands/access.h"
#include "program/commands/command.h"
#include "program/commands/log_lines.h"
#include "program/commands/report_output.h"

namespace ipmisel {

/// What is to be collected, and where it goes.
struct CollectOptions {
    AccessOptions access;
    ReportOptions report;
    std::optional<std::string> record;
    LogOptions log;
    std::vector<std::string> plugins;  ///< further plug-in files
    std::optional<double> deadlineSeconds;
    std::vector<std::string> names;  ///< of the systems, as their sources follow each other
    std::optional<std::string> severities;
    bool progress = true;              ///< on standard error, where that is a terminal
    bool alone = true;                 ///< not one of many, all of which are told once
    std::optional<std::string> store;  ///< URI of the store that the systems are visited for
    bool onlyNew = false;              ///< report only the events that the store does not have
};

/// Adds --store and --new to a command.
void AddStoreOptions(CLI::App* command, CollectOptions* options);

/// Collects and writes a report; how it went, of which whoever runs it is still to be told. Throws
/// Failure.
Outcome CollectOutcome(const CollectOptions& options);
/// The same, told; the exit status.
int Collect(const CollectOptions& options);

/// The options of a command that collects for a purpose of its own: deadline, severities, further
/// plug-ins, log level. Only errors are logged unless told otherwise, and no progress is shown.
void AddPassOptions(CLI::App* command, CollectOptions* options);

/// `ipmisel collect`.
Command AddCollectCommand(CLI::App* program);

}  // namespace ipmisel
