#pragma once

#include "program/commands/command.h"

namespace ipmisel {

/// `ipmisel report`: writes a saved report, or what a capture gives, in another format.
Command AddReportCommand(CLI::App* program);

}  // namespace ipmisel
