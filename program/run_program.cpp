#include "program/run_program.h"

#include <CLI/CLI.hpp>
#include <algorithm>
#include <csignal>
#include <exception>
#include <new>
#include <numeric>
#include <string>
#include <string_view>
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
#include "program/commands/watch.h"
#include "program/reports/terminal_text.h"

namespace ipmisel {
namespace {

/// In the order of the help.
constexpr Command (*kCommands[])(CLI::App* program) = {
    AddCollectCommand, AddReportCommand, AddDiffCommand,   AddCheckCommand,
    AddWatchCommand,   AddAckCommand,    AddDoctorCommand, AddClassesCommand};

/// Letters to put in, take out or change to make one word the other.
std::size_t Distance(std::string_view a, std::string_view b) {
    std::vector<std::size_t> row(b.size() + 1);
    std::iota(row.begin(), row.end(), 0U);
    for (std::size_t i = 1; i <= a.size(); ++i) {
        std::size_t diagonal = std::exchange(row[0], i);
        for (std::size_t j = 1; j <= b.size(); ++j) {
            const std::size_t changed = diagonal + (a[i - 1] == b[j - 1] ? 0 : 1);
            diagonal = row[j];
            row[j] = std::min({row[j] + 1, row[j - 1] + 1, changed});
        }
    }
    return row.back();
}

/// The first word is a command, unless it is an option of the program's own.
void RefuseUnknownCommand(const std::vector<Command>& commands, int argc, char** argv) {
    if (argc < 2 || argv[1][0] == '-') return;
    const std::string word = std::string(argv[1]).substr(0, 64);
    std::string known;
    std::string near;
    for (const Command& command : commands) {
        const std::string name = command.arguments->get_name();
        if (name == argv[1]) return;
        known += (known.empty() ? "" : ", ") + name;
        if (near.empty() && Distance(word, name) <= 2) near = name;
    }
    throw Failure(kExitUsage, "there is no command \"" + word + "\"; " +
                                  (near.empty() ? "" : "did you mean " + near + "? ") +
                                  "There are " + known);
}

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
    RefuseUnknownCommand(commands, argc, argv);
    try {
        app.parse(argc, argv);
    } catch (const CLI::Success& wanted) {  // help or version
        return app.exit(wanted);
    } catch (const CLI::ParseError& error) {
        const auto command = named();
        const Failure failure(
            kExitUsage,
            std::string(error.what()) + "; see ipmisel " +
                (command == commands.end() ? "" : command->arguments->get_name() + " ") + "--help");
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
