#pragma once

#include "collector/options.h"

namespace ipmisel {

/// Runs a collection and writes its report; the exit status.
int Collect(const Options& options);
/// Lists the classes; the exit status.
int ListClasses();

}  // namespace ipmisel
