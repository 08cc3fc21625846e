#pragma once

#include <cstdint>

namespace ipmisel {

/// What event data 1 says that event data 2 or 3 holds (IPMI 2.0, table 29-6). What kStandard means
/// depends on the class of event: of data 2 the reading, or severity and previous state; of data 3
/// the threshold.
enum class DataUse { kNone = 0, kStandard = 1, kOem = 2, kSensorSpecific = 3 };

/// The three event data bytes.
struct EventData {
    std::uint8_t data1;
    std::uint8_t data2;
    std::uint8_t data3;

    int Offset() const { return data1 & 0x0F; }
    DataUse Use2() const { return static_cast<DataUse>(data1 >> 6); }
    DataUse Use3() const { return static_cast<DataUse>(data1 >> 4 & 0x03); }
    int Low2() const { return data2 & 0x0F; }
    int High2() const { return data2 >> 4; }
};

}  // namespace ipmisel
