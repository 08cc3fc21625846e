#pragma once

#include <string_view>

namespace ipmisel {

/// Name of a sensor type; the sensor number tells OEM types apart.
std::string_view SensorTypeName(int sensorType, unsigned sensorNumber);

}  // namespace ipmisel
