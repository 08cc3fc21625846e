#pragma once

#include "program/commands/command.h"

namespace ipmisel {

/// `ipmisel watch`: visits controllers again and again, and tells what is new.
Command AddWatchCommand(CLI::App* program);

}  // namespace ipmisel
