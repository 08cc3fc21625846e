#include "plugins/standard/facts.h"

#include <algorithm>

namespace standard {

const SensorFacts* NodeFacts::FindSensor(const ipmi::SensorKey& key) const {
    const auto found = std::ranges::find_if(
        sensors, [&key](const SensorFacts& facts) { return facts.sensor.key == key; });
    return found == sensors.end() ? nullptr : &*found;
}

}  // namespace standard
