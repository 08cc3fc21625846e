#pragma once

#include "program/commands/command.h"

namespace ipmisel {

/// `ipmisel collect`: collects and writes a report.
Command AddCollectCommand(CLI::App* program);

}  // namespace ipmisel
