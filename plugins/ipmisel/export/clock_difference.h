#pragma once

#include "plugins/ipmisel/records/calendar_time.h"
#include "tqr/datetime.h"
#include "tqr/plugin.h"
#include "tqr/splibrary.h"

namespace ipmisel {

/// How far the BMC's clock stands from the operating system's: measured once per export, handed to
/// the time stamps of every record.
struct ClockDifference {
    NQORTQR20::TCIMDateTime difference{kNoTime};
    bool bmcNotBehind = false;
    bool synchronise = true;  ///< false when the difference could not be measured
};

ClockDifference MeasureClock(NQORTQR20::TCPluginCallbacks* context, NQORTQR20::SPLibrary* library);

}  // namespace ipmisel
