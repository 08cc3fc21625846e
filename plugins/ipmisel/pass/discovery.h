#pragma once

#include <string>

#include "tqr/plugin.h"

// What the plug-in finds out about the machine: from the host, and from its SMBIOS structures
// (DSP0134).

/// The machine type as the host knows it; always 0. Settles that it has been read.
NQORTQR20::TTQRStatusCode getMachineType(NQORTQR20::TCPluginCallbacks* context,
                                         std::string* machineType);
/// 0 when the machine has an IPMI Device Information structure (type 38), else 1.
unsigned DiscoverBMC(NQORTQR20::TCPluginCallbacks* context);
/// Whether the OEM strings (type 11) tell of the part.
bool DiscoverCPLD();
bool DiscoverFPGA();
/// "major.minor" of the embedded controller's firmware as the firmware structure (type 0) has it;
/// empty when it has none.
std::string DiscoverFirmwareRelease(NQORTQR20::TCPluginCallbacks* context);
/// Whether the machine names a supervisor adapter among its on-board devices or OEM strings.
bool IPMIselHasTSB2onBoardsmBios();

/// True when the driver's library cannot be loaded. No pass of a collection calls these.
bool DiscoverQORSP6WDriver();
bool DiscoverOSADriver();
bool DiscoverMSIDriver();
