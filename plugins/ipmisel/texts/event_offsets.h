#pragma once

#include <string>

#include "plugins/ipmisel/texts/event_data.h"
#include "plugins/ipmisel/texts/sensor_mod_units.h"
#include "tqr/plugin.h"

// The "event data" texts of the three classes of events. Every text fetched from the numbered ones
// is followed by ". ", lead-ins excepted; a failed fetch leaves the piece and its ". " out.

namespace ipmisel {

std::string ThresholdOffsetText(NQORTQR20::TCPluginCallbacks* context, const EventData& event,
                                const s_SDR_Mod_Units& units);
std::string GenericOffsetText(NQORTQR20::TCPluginCallbacks* context, const EventData& event,
                              int readingType, std::uint8_t sensorType, std::uint8_t sensorNumber);
std::string SensorOffsetText(NQORTQR20::TCPluginCallbacks* context, std::uint8_t sensorType,
                             const EventData& event, int readingType);

}  // namespace ipmisel
