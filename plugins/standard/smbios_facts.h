#pragma once

#include <optional>
#include <vector>

#include "ipmi/smbios.h"
#include "tqr/plugin.h"

namespace standard {

/// What the firmware of the machine tells of it, in the order of its tables. Empty where the host
/// has no SMBIOS, as over the network.
struct SmbiosFacts {
    std::optional<ipmi::SmbiosSystem> system;
    std::vector<ipmi::SmbiosMemoryDevice> memoryDevices;
    std::vector<ipmi::SmbiosProcessor> processors;
    std::vector<ipmi::SmbiosSlot> slots;
};

/// Reads the structures of the host's machine.
SmbiosFacts ReadSmbios(const NQORTQR20::TPluginManagerProvider* provider);

}  // namespace standard
