#pragma once

#include <span>

#include "tqr/plugin.h"

namespace standard {

// What the host calls, by the registration record. No exception leaves them.

NQORTQR20::TTQRStatusCode Initialise(NQORTQR20::TCPluginCallbacks* context);
NQORTQR20::TTQRStatusCode Deinitialise(NQORTQR20::TCPluginCallbacks* context);
/// One collection: kStatusFailed when the user's severities are not to be read or the host has
/// refused an instance.
NQORTQR20::TTQRStatusCode GetData(NQORTQR20::TCPluginCallbacks* context,
                                  NQORTQR20::fdriIOHandle* output, const char** classNames,
                                  int classCount);
/// As NQORTQR20::fdrCheckOption.
NQORTQR20::TTQRStatusCode CheckOption(const char* name, const char* value, std::span<char> problem);
NQORTQR20::fdrPluginInfo GetInfo(NQORTQR20::TCPluginCallbacks* context);

}  // namespace standard
