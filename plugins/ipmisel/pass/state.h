#pragma once

#include <cstdint>
#include <ctime>
#include <memory>
#include <string>
#include <vector>

#include "plugins/ipmisel/inventory/vpd_entry.h"
#include "tqr/plugin.h"

namespace ipmisel {

/// What the plug-in keeps from one call of the host to the next. The host calls from one thread at
/// a time.
struct ModuleState {
    // Written by the initialise and de-initialise callbacks.
    std::int32_t gStarted = 0;  ///< never anything else
    NQORTQR20::TCPluginCallbacks* gPluginHandle = nullptr;

    // Settled once in the life of the process.
    bool fMTonce = false;  ///< the machine type has been read
    std::string fMachineType;
    std::int32_t gPass = 0;    ///< 0 until a BMC has been confirmed
    std::int32_t nodeNum = 0;  ///< BMC nodes, as counted when it was

    // The FRU inventory, which is collected once in a while and written in every pass that wants
    // it.
    bool ipmifruonce = false;                        ///< it has been collected
    std::uint32_t fCurrentTime = 0;                  ///< seconds; when ipmifruonce was last cleared
    std::unique_ptr<IPMIVPDEntry> fIpmiVpdentryFru;  ///< collector of one pass
    std::vector<std::vector<PropertyMap>> fIpmiFruVector;  ///< the instances kept, by node
    bool collectonce = false;                              ///< nothing depends on it

    std::time_t (*clock)(std::time_t*) = std::time;
};

/// Made at the first use, which is the registration.
ModuleState& Module();

/// The state of a library that has just been loaded.
inline void ResetModuleState() { Module() = {}; }

}  // namespace ipmisel
