#pragma once

#include "program/commands/command.h"

namespace ipmisel {

/// `ipmisel check`: the state of systems as a service check of a monitoring system.
Command AddCheckCommand(CLI::App* program);

}  // namespace ipmisel
