#pragma once

#include <cstdint>

/// Unit and conversion record of one sensor, raw as the sensor data record holds it (IPMI 2.0,
/// table 43-1). All zero when no record matched.
struct s_SDR_Mod_Units {
    std::uint8_t SDRType;  ///< the value is converted only for 1, a full sensor record
    std::uint8_t
        SensorUnits1;  ///< 7-6 analog data format, 5-3 rate, 2-1 modifier use, 0 percentage
    std::uint8_t SensorUnits2;   ///< base unit code
    std::uint8_t SensorUnits3;   ///< modifier unit code
    std::uint8_t Linearization;  ///< 0 is linear
    std::uint16_t M;             ///< 10 bits, two's complement, sign not yet applied
    std::uint16_t B;             ///< 10 bits
    std::uint16_t Rexp;          ///< 4 bits
    std::uint16_t Bexp;          ///< 4 bits
};
