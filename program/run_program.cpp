#include "program/run_program.h"

#include <CLI/CLI.hpp>
#include <algorithm>
#include <csignal>
#include <exception>
#include <new>
#include <string>
#include <utility>
#include <vector>

#include "program/commands/ack.h"
#include "program/commands/check.h"
#include "program/commands/classes.h"
#include "program/commands/collect.h"
#include "program/commands/command.h"
#include "program/commands/configuration.h"
#include "program/commands/diff.h"
#include "program/commands/doctor.h"
#include "program/commands/failure.h"
#include "program/commands/out_of_memory.h"
#include "program/commands/report.h"
#include "program/commands/unknown_words.h"
#include "program/commands/watch.h"
#include "program/reports/terminal_text.h"

namespace ipmisel {
namespace {

/// In the order of the help.
constexpr Command (*kCommands[])(CLI::App* program) = {
    AddCollectCommand, AddReportCommand, AddDiffCommand,   AddCheckCommand,
    AddWatchCommand,   AddAckCommand,    AddDoctorCommand, AddClassesCommand};

std::string OwnError(const std::exception& error) {
    if (dynamic_cast<const std::bad_alloc*>(&error) != nullptr) {
        return std::string(kOutOfMemory) + "; " + kOutOfMemoryAdvice;
    }
    return std::string("ended by an error of its own: ") + error.what();
}

int Run(int argc, char** argv) {
    CLI::App app("Reads what a server's management controller (BMC) knows.", "ipmisel");
    app.set_version_flag("--version", "ipmisel " IPMISEL_VERSION);
    app.require_subcommand(1);
    std::vector<Command> commands;
    for (const auto add : kCommands) commands.push_back(add(&app));
    std::vector<Command> configurable;
    for (const Command& command : commands) {
        command.arguments->add_flag("--no-config")
            ->description("Take no option from files or the environment");
        configurable.push_back(command);
    }
    commands.push_back(AddConfigCommand(
        &app, [&configurable] { return Configuration(ConfigurationFiles(), configurable); }));
    const auto named = [&] {
        return std::find_if(commands.begin(), commands.end(),
                            [](const Command& command) { return command.arguments->parsed(); });
    };
    if (argc < 2) {
        throw Failure(kExitUsage,
                      "no command is named; ipmisel collect reads this machine, "
                      "ipmisel --help lists the others");
    }
    RefuseUnknownCommand(commands, app, argc, argv);
    try {
        app.parse(argc, argv);
    } catch (const CLI::Success& wanted) {  // help or version
        return app.exit(wanted);
    } catch (const CLI::ParseError& error) {
        const auto command = named();
        const bool isUnexpected = dynamic_cast<const CLI::ExtrasError*>(&error) != nullptr;
        const Failure failure(
            kExitUsage,
            isUnexpected && command != commands.end()
                ? AboutUnexpected(*command->arguments, app.remaining(true))
                : std::string(error.what()) + "; see ipmisel " +
                      (command == commands.end() ? "" : command->arguments->get_name() + " ") +
                      "--help");
        if (command == commands.end() || !command->fail) throw failure;
        return command->fail(failure);
    }
    const Command& command = *named();
    const auto run = [&] {
        const CLI::Option* const alone = command.arguments->get_option_no_throw("--no-config");
        if (alone != nullptr && alone->empty()) {
            UseConfiguration({ConfigurationFiles(), configurable}, command.arguments);
        }
        return command.run();
    };
    if (!command.fail) return run();
    try {
        return run();
    } catch (const Failure& failure) {
        return command.fail(failure);
    } catch (const std::exception& error) {
        return command.fail({kExitPassFailed, OwnError(error)});
    }
}

}  // namespace

int RunProgram(int argc, char** argv) {
    std::signal(SIGPIPE, SIG_IGN);  // a reader that leaves shows as a write error
    PrepareForOutOfMemory();
    try {
        return Run(argc, argv);
    } catch (const Failure& failure) {
        Say(failure.what());
        return failure.exitStatus;
    } catch (const std::exception& error) {
        Say(OwnError(error));
        return kExitPassFailed;
    }
}

}  // namespace ipmisel
