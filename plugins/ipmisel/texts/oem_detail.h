#pragma once

#include <span>
#include <string>

#include "plugins/ipmisel/texts/event_data.h"
#include "plugins/ipmisel/texts/machine_families.h"

namespace ipmisel {

/// The headings and names of an event whose event data 2 is OEM; empty when no row is about the
/// sensor.
std::string OemDetailText(std::span<const OemDetail> rows, std::uint8_t sensorType,
                          std::uint8_t sensorNumber, const EventData& event);

}  // namespace ipmisel
