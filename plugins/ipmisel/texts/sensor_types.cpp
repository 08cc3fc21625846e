#include "plugins/ipmisel/texts/sensor_types.h"

#include <array>

namespace ipmisel {
namespace {

// Sensor type codes, IPMI 2.0 table 42-3. The first and the last entry are never looked up.
// Compatibility: "Managment" is how the text has always read
// (SensorType.NamesStandardAndOemTypes).
constexpr std::array<std::string_view, 46> kSensorTypes{
    "Unknown Sensor Type",
    "Temperature",
    "Voltage",
    "Current",
    "Fan",
    "Physical Security (Chassis Intrusion)",
    "Platform Security Violation Attempt",
    "Processor",
    "Power Supply",
    "Power Unit",
    "Cooling Device",
    "Other Units-based Sensor",
    "Memory",
    "Drive Slot (Bay)",
    "POST Memory Resize",
    "System Firmware Progress",
    "Event Logging Disabled",
    "Watchdog 1",
    "System Event",
    "Critical Interrupt",
    "Button",
    "Module/Board",
    "Microcontroller/Coprocessor",
    "Add-in Card",
    "Chassis",
    "Chip Set",
    "Other FRU",
    "Cable/Interconnect",
    "Terminator",
    "System Boot Initiated",
    "Boot Error",
    "OS Boot",
    "OS Critical Stop",
    "Slot/Connector",
    "System ACPI Power State",
    "Watchdog 2",
    "Platform Alert",
    "Entity Presence",
    "Monitor ASIC/IC",
    "LAN",
    "Managment Subsystem Health",
    "Battery",
    "Session Audit",
    "Version Change",
    "FRU State",
    "Reserved",
};
constexpr int kFirstType = 0x01;
constexpr int kLastType = 0x2C;
static_assert(kSensorTypes[0x28] == "Managment Subsystem Health" &&
              kSensorTypes[kLastType] == "FRU State" && kSensorTypes.size() == kLastType + 2);

// OEM types by sensor number; the first row that holds the number counts.
struct OemType {
    int sensorType;
    unsigned firstSensor;
    unsigned lastSensor;
    std::string_view name;
};
constexpr unsigned kAnySensor = ~0U;
constexpr std::array<OemType, 13> kOemTypes{{
    {0xC1, 0x60, 0x67, "Drive Status"},
    {0xC1, 0x94, 0x94, "CPU 1 Mismatch"},
    {0xC1, 0x95, 0x95, "CPU 2 Mismatch"},
    {0xC1, 0x96, 0x96, "CPU 3 Mismatch"},
    {0xC1, 0x97, 0x97, "CPU 4 Mismatch"},
    {0xC1, 0, kAnySensor, "Drive/Slot Status"},
    {0xD1, 0x60, 0x67, "Drive Status"},
    {0xD1, 0x94, 0x94, "CPU 1 Mismatch"},
    {0xD1, 0x95, 0x95, "CPU 2 Mismatch"},
    {0xD1, 0x96, 0x96, "CPU 3 Mismatch"},
    {0xD1, 0x97, 0x97, "CPU 4 Mismatch"},
    {0xD1, 0, kAnySensor, "Drive/Slot Status"},
    {0xD0, 0, kAnySensor, "SEL Fullness"},
}};

}  // namespace

std::string_view SensorTypeName(int sensorType, unsigned sensorNumber) {
    if (sensorType >= kFirstType && sensorType <= kLastType) {
        return kSensorTypes[static_cast<std::size_t>(sensorType)];
    }
    for (const OemType& row : kOemTypes) {
        if (row.sensorType == sensorType && sensorNumber >= row.firstSensor &&
            sensorNumber <= row.lastSensor) {
            return row.name;
        }
    }
    return kSensorTypes[0];
}

}  // namespace ipmisel
