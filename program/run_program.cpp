#include "program/run_program.h"

#include <CLI/CLI.hpp>
#include <algorithm>
#include <csignal>
#include <exception>
#include <string>
#include <vector>

#include "program/commands/classes.h"
#include "program/commands/collect.h"
#include "program/commands/command.h"
#include "program/commands/diff.h"
#include "program/commands/failure.h"
#include "program/commands/report.h"
#include "program/reports/terminal_text.h"

namespace ipmisel {
namespace {

/// In the order of the help.
constexpr Command (*kCommands[])(CLI::App* program) = {AddCollectCommand, AddReportCommand,
                                                       AddDiffCommand, AddClassesCommand};

int Run(int argc, char** argv) {
    CLI::App app("Reads what a server's management controller (BMC) knows.", "ipmisel");
    app.set_version_flag("--version", "ipmisel " IPMISEL_VERSION);
    app.require_subcommand(1);
    std::vector<Command> commands;
    for (const auto add : kCommands) commands.push_back(add(&app));
    const auto named = [&] {
        return std::find_if(commands.begin(), commands.end(),
                            [](const Command& command) { return command.arguments->parsed(); });
    };
    try {
        app.parse(argc, argv);
    } catch (const CLI::Success& wanted) {  // help or version
        return app.exit(wanted);
    } catch (const CLI::ParseError& error) {
        const auto command = named();
        throw Failure(kExitUsage,
                      std::string(error.what()) + "; see ipmisel " +
                          (command == commands.end() ? "" : command->arguments->get_name() + " ") +
                          "--help");
    }
    return named()->run();
}

}  // namespace

int RunProgram(int argc, char** argv) {
    std::signal(SIGPIPE, SIG_IGN);  // a reader that leaves shows as a write error
    try {
        return Run(argc, argv);
    } catch (const Failure& failure) {
        Say(failure.what());
        return failure.exitStatus;
    } catch (const std::exception& error) {
        Say(std::string("ended by an error of its own: ") + error.what());
        return kExitPassFailed;
    }
}

}  // namespace ipmisel
