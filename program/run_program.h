#pragma once

namespace ipmisel {

/// The whole program: reads the command line, does what it says and reports what fails; the exit
/// status.
int RunProgram(int argc, char** argv);

}  // namespace ipmisel
