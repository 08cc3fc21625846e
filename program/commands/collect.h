#pragma once

#include "program/commands/options.h"

namespace ipmisel {

/// Runs a collection and writes its report; the exit status. Throws Failure.
int Collect(const Options& options);
/// Lists the classes; the exit status. Throws Failure.
int ListClasses(const Options& options);

/// The whole program: reads the command line, does what it says and tells what fails; the exit
/// status.
int RunProgram(int argc, char** argv);

}  // namespace ipmisel
