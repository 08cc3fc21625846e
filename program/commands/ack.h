#pragma once

#include "program/commands/command.h"

namespace ipmisel {

/// `ipmisel ack`: acknowledges findings of a store.
Command AddAckCommand(CLI::App* program);

}  // namespace ipmisel
