#pragma once

#include "program/commands/command.h"

namespace ipmisel {

/// `ipmisel classes`: lists the classes that the plug-ins declare.
Command AddClassesCommand(CLI::App* program);

}  // namespace ipmisel
