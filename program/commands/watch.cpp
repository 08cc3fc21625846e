#include "program/commands/watch.h"

#include <CLI/CLI.hpp>
#include <memory>

#include "program/commands/arguments.h"
#include "program/commands/collect.h"
#include "program/commands/failure.h"
#include "program/fleet/watch.h"

namespace ipmisel {
namespace {

/// Controllers of little power have more to do than to be asked.
constexpr int kMinEverySeconds = 60;

}  // namespace

Command AddWatchCommand(CLI::App* program) {
    CLI::App* const command = program->add_subcommand(
        "watch", "Visit controllers again and again, a line for each new event");
    const auto options = std::make_shared<WatchOptions>();
    AddAccessOptions(command, &options->collect.access);
    AddHostsOptions(command, &options->hosts);
    command
        ->add_option("--every", options->everySeconds,
                     "Seconds from one visit of a controller to its next")
        ->type_name("SECONDS")
        ->capture_default_str()
        ->check(Number(kMinEverySeconds, static_cast<int>(kSecondsPerDay)));
    command
        ->add_option("--store", options->collect.store,
                     "Keep what is read here, and tell only what is not there yet; without it what "
                     "comes after the first visit")
        ->type_name("URI")
        ->check(NotEmpty("the store is empty; give sqlite:FILE or postgresql://..."));
    AddPassOptions(command, &options->collect);
    command->footer(
        "Exit status:\n"
        "  0  ended by SIGTERM or SIGINT\n"
        "  2  wrong usage, or a file that it names cannot be used\n");
    return {command, [options] {
                if (options->hosts.lists.empty()) {
                    options->collect.access.sources = options->collect.access.Sources();
                }
                return Watch(*options);
            }};
}

}  // namespace ipmisel
