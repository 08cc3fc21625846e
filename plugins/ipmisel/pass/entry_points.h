#pragma once

#include "plugins/ipmisel/exported.h"
#include "tqr/plugin.h"

class IPMIRequestFRULocator;

// What the host calls, by the registration record or by name. No exception leaves them.

/// Registers the plug-in; runs when the library is loaded.
IPMISEL_EXPORTED void IPMISELInit();
IPMISEL_EXPORTED NQORTQR20::TTQRStatusCode IPMISELPluginInit(NQORTQR20::TCPluginCallbacks* context);
/// Frees nothing: every pass releases what it has made.
IPMISEL_EXPORTED NQORTQR20::TTQRStatusCode IPMISELPluginDeInit(
    NQORTQR20::TCPluginCallbacks* context);
/// One collection: 0 (also without a BMC), 3 when a section failed, 4 when an object could not be
/// created.
IPMISEL_EXPORTED NQORTQR20::TTQRStatusCode IPMISELGetData(NQORTQR20::TCPluginCallbacks* context,
                                                          NQORTQR20::fdriIOHandle* output,
                                                          const char** classNames, int classCount);
IPMISEL_EXPORTED NQORTQR20::fdrPluginInfo IPMISELGetInfo(NQORTQR20::TCPluginCallbacks* context);
/// Not in the registration record; always 3.
IPMISEL_EXPORTED NQORTQR20::TTQRStatusCode IPMISELGetStatus();
/// Collects FRU device 0; 3 when the pass's collector of FRU instances does not exist.
IPMISEL_EXPORTED NQORTQR20::TTQRStatusCode IPMISELGetDataZero(NQORTQR20::TCPluginCallbacks* context,
                                                              NQORTQR20::fdriIOHandle* output,
                                                              IPMIRequestFRULocator* request);
