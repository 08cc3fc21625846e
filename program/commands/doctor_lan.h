#pragma once

#include "program/commands/access.h"
#include "program/commands/doctor_steps.h"

namespace ipmisel {

/// The steps for a BMC over the network, from its name to how many requests it takes at a time.
/// The exit status. Throws Failure.
int ExamineLan(AccessOptions access, Steps* steps);

}  // namespace ipmisel
