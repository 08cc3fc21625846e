#pragma once

#include <cstdint>
#include <string_view>

namespace ipmi {

/// What an offset says, in words that name the state or the occurrence ("fully redundant", "power
/// button pressed") and need no more than a sensor before them: IPMI 2.0 table 42-2 for the
/// threshold and generic types, table 42-3 for sensor-specific ones. Empty where the standard gives
/// no meaning, so for every OEM type and OEM sensor type.
std::string_view EventOffsetText(std::uint8_t eventType, std::uint8_t sensorType,
                                 std::uint8_t offset);

}  // namespace ipmi
