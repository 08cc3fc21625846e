#include "ipmi/sensor_types.h"

#include <array>

namespace ipmi {

namespace {

constexpr std::array<std::string_view, 45> kNames{
    "",
    "Temperature",
    "Voltage",
    "Current",
    "Fan",
    "Physical Security",
    "Platform Security",
    "Processor",
    "Power Supply",
    "Power Unit",
    "Cooling Device",
    "Other Units-based Sensor",
    "Memory",
    "Drive Slot",
    "POST Memory Resize",
    "System Firmware Progress",
    "Event Logging Disabled",
    "Watchdog 1",
    "System Event",
    "Critical Interrupt",
    "Button/Switch",
    "Module/Board",
    "Microcontroller/Coprocessor",
    "Add-in Card",
    "Chassis",
    "Chip Set",
    "Other FRU",
    "Cable/Interconnect",
    "Terminator",
    "System Boot/Restart Initiated",
    "Boot Error",
    "OS Boot/Installation",
    "OS Stop/Shutdown",
    "Slot/Connector",
    "System ACPI Power State",
    "Watchdog 2",
    "Platform Alert",
    "Entity Presence",
    "Monitor ASIC/IC",
    "LAN",
    "Management Subsystem Health",
    "Battery",
    "Session Audit",
    "Version Change",
    "FRU State",
};
static_assert(kNames[sensor_type::kMemory] == "Memory" &&
              kNames[sensor_type::kButton] == "Button/Switch" &&
              kNames[sensor_type::kOsStop] == "OS Stop/Shutdown" &&
              kNames[sensor_type::kFruState] == "FRU State");

}  // namespace

std::string_view SensorTypeName(std::uint8_t sensorType) {
    if (sensorType >= sensor_type::kFirstOem) return "OEM";
    return sensorType < kNames.size() ? kNames[sensorType] : std::string_view();
}

}  // namespace ipmi
