#include "plugins/ipmisel/export/clock_difference.h"

#include <exception>
#include <string>

#include "plugins/ipmisel/log.h"
#include "plugins/ipmisel/requests/diff_time.h"

namespace ipmisel {

ClockDifference MeasureClock(NQORTQR20::TCPluginCallbacks* context, NQORTQR20::SPLibrary* library) {
    ClockDifference clock;
    clock.difference.Set(0, 0, 0, 0, 0);
    try {
        if (GetDiffTime(context, &clock.difference, &clock.bmcNotBehind, library) == kFailed) {
            WriteLog(kNotice, "Not synchronizing BMC time with OS time.");
            clock.synchronise = false;
        }
    } catch (const std::exception& exception) {
        WriteLog(kInfo, std::string("Unable to obtain DiffTime due to caught exception ") +
                            exception.what());
        clock.synchronise = false;
    }
    return clock;
}

}  // namespace ipmisel
