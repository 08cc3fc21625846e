#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "ipmi/reading.h"

namespace ipmi {

/// The three unit bytes of a sensor record (IPMI 2.0, table 43-1).
struct SensorUnits {
    std::uint8_t flags = 0;  ///< sensor units 1: number format, rate, modifier use, percentage
    std::uint8_t base = 0;
    std::uint8_t modifier = 0;

    NumberFormat Format() const { return static_cast<NumberFormat>(flags >> 6); }
    bool IsPercentage() const { return (flags & 0x01) != 0; }
};

/// The name of a unit type code (table 43-15); empty for unspecified, reserved and undefined ones.
std::string_view UnitName(std::uint8_t code);

/// The whole unit: percentage, base unit, modifier unit and rate, as in "percent", "Volts",
/// "error per hour", "Amps*hour". Empty when nothing is specified.
std::string UnitText(const SensorUnits& units);

}  // namespace ipmi
