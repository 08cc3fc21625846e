#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "plugins/standard/node.h"

namespace standard {

/// The states that a sensor reports as asserted, in words.
std::vector<std::string> StateTexts(const ipmi::Sensor& sensor, const ipmi::SensorReading& reading);

/// "ok", "warning", "critical" or "unavailable"; empty where nothing tells: a sensor that was not
/// read, or whose states are neither good nor bad.
std::string_view StatusOf(const ipmi::Sensor& sensor, const SensorState& state);

}  // namespace standard
