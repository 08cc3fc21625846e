#pragma once

#include "tqr/datetime.h"
#include "tqr/plugin.h"
#include "tqr/splibrary.h"

/// How far the SEL clock of the BMC stands from the clock of the operating system, and whether it
/// is not behind. 1 when it leaves the outputs unset (no library object, a failed send, a
/// completion code, a time that is none), else 0.
unsigned GetDiffTime(NQORTQR20::TCPluginCallbacks* context, NQORTQR20::TCIMDateTime* difference,
                     bool* bmcNotBehind, NQORTQR20::SPLibrary* library);
