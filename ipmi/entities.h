#pragma once

#include <cstdint>
#include <string>
#include <string_view>

namespace ipmi {

/// Entity IDs of IPMI 2.0 table 43-13 that code asks for by name; the table has them all.
namespace entity {
enum : std::uint8_t {
    kProcessor = 0x03,
    kSystemBoard = 0x07,
    kMemoryModule = 0x08,
    kPowerSupply = 0x0A,
    kMemoryDevice = 0x20,
};
}  // namespace entity

/// "Power Supply"; "Chassis-specific Entity 90h" and the like for the ranges that a chassis, a
/// board set or a vendor defines; empty for 00h and what the standard reserves.
std::string EntityName(std::uint8_t id);

/// Instances from 60h to 7Fh count within the device (the controller) that the sensor belongs to.
constexpr bool IsDeviceRelative(std::uint8_t instance) {
    return instance >= 0x60 && instance <= 0x7F;
}
/// The instance as a person counts it: 60h stands for a controller's own 0.
constexpr std::uint8_t InstanceNumber(std::uint8_t instance) {
    return IsDeviceRelative(instance) ? instance - 0x60 : instance;
}

/// "Power Supply 1": name and instance number; empty without a name.
std::string EntityText(std::uint8_t id, std::uint8_t instance);

/// Whether the entity is a thing that can be held in hand: no operating system, firmware or other
/// software, no group, channel or bus, no surroundings, and nothing unspecified.
bool IsPhysicalEntity(std::uint8_t id);

}  // namespace ipmi
