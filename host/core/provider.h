#pragma once

#include "host/core/host.h"

namespace NQORTQR20 {

/// What the host libraries beside the core may see through a plug-in's context.
struct TPluginManagerProvider {
    /// The machine that is collected from at this moment; follows SetMachineFacts.
    const MachineFacts* facts;
};

}  // namespace NQORTQR20
