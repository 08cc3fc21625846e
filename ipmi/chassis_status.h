#pragma once

#include <cstdint>
#include <optional>
#include <span>
#include <string_view>
#include <vector>

namespace ipmi {

/// Answer of Get Chassis Status (IPMI 2.0, 28.2).
struct ChassisStatus {
    bool powerOn = false;
    bool chassisIntrusion = false;
    bool frontPanelLockout = false;
    bool driveFault = false;
    bool coolingFault = false;
    /// In the words of the standard, in the order of their bits.
    std::vector<std::string_view> powerFaults;     ///< what is wrong with the power now
    std::vector<std::string_view> lastPowerEvent;  ///< why it was last switched

    /// From the data after the completion code; empty when there are fewer than three bytes.
    static std::optional<ChassisStatus> Parse(std::span<const std::uint8_t> data);
};

}  // namespace ipmi
