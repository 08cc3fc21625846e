#pragma once

#include <span>

#include "tqr/plugin.h"

namespace ipmisel {

/// One pass over every BMC node for the classes in the host's order; names that are not known are
/// passed over. Throws SectionFailure with the status of a pass that could not be finished.
void Collect(NQORTQR20::TCPluginCallbacks* context, NQORTQR20::fdriIOHandle* output,
             std::span<const char* const> classNames);

}  // namespace ipmisel
