#pragma once

#include <CLI/CLI.hpp>
#include <string>
#include <vector>

#include "program/commands/command.h"

// What is said of a word of the command line that nothing expects, and of what was perhaps meant.

namespace ipmisel {

/// Throws Failure when the first word is neither one of the commands nor an option of the program's
/// own.
void RefuseUnknownCommand(const std::vector<Command>& commands, const CLI::App& program, int argc,
                          char** argv);

/// One line about the words that were left over when `command` was parsed, in their order: about
/// the first option among them, since the rest may be its values, else about the first word.
std::string AboutUnexpected(const CLI::App& command, const std::vector<std::string>& words);

}  // namespace ipmisel
