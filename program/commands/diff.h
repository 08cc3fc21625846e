#pragma once

#include "program/commands/command.h"

namespace ipmisel {

/// `ipmisel diff`: tells what changed from one saved report to another: problems, parts, firmware.
Command AddDiffCommand(CLI::App* program);

}  // namespace ipmisel
