#pragma once

#include <functional>

namespace CLI {
class App;
}

namespace ipmisel {

struct Failure;

/// A command of the program, as it stands on the command line: what it does once that is parsed
/// gives the exit status, or throws Failure. Each command's own header has the function that adds
/// it; run_program.cpp has their list.
struct Command {
    CLI::App* arguments;
    std::function<int()> run;
    /// What comes of a failure, wrong usage included; null: it is said, with its own exit status.
    std::function<int(const Failure& failure)> fail = {};
};

}  // namespace ipmisel
