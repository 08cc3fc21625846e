#pragma once

#include <functional>

namespace CLI {
class App;
}

namespace ipmisel {

/// A command of the program, as it stands on the command line: what it does once that is parsed
/// gives the exit status, or throws Failure. Each command's own header has the function that adds
/// it; run_program.cpp has their list.
struct Command {
    CLI::App* arguments;
    std::function<int()> run;
};

}  // namespace ipmisel
