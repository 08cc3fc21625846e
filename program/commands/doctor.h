#pragma once

#include "program/commands/command.h"

namespace ipmisel {

/// `ipmisel doctor`: step by step, what of a source works and what to do about the rest.
Command AddDoctorCommand(CLI::App* program);

}  // namespace ipmisel
