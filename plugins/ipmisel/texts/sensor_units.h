#pragma once

#include <string>

#include "plugins/ipmisel/texts/sensor_mod_units.h"
#include "tqr/plugin.h"

namespace ipmisel {

/// A one's complement byte in decimal, "-0" included.
std::string OnesComplementText(char value);

/// A raw reading as value and unit, with the log lines of the whole operation.
std::string SensorUnitsText(NQORTQR20::TCPluginCallbacks* context, const s_SDR_Mod_Units& units,
                            int reading);

}  // namespace ipmisel
