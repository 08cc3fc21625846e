#pragma once

#include <cstdint>
#include <string_view>

namespace ipmi {

/// Sensor types, IPMI 2.0 table 42-3. C0h to FFh are the vendor's.
namespace sensor_type {
enum : std::uint8_t {
    kTemperature = 0x01,
    kVoltage = 0x02,
    kCurrent = 0x03,
    kFan = 0x04,
    kPhysicalSecurity = 0x05,
    kPlatformSecurity = 0x06,
    kProcessor = 0x07,
    kPowerSupply = 0x08,
    kPowerUnit = 0x09,
    kCoolingDevice = 0x0A,
    kOtherUnitsBased = 0x0B,
    kMemory = 0x0C,
    kDriveSlot = 0x0D,
    kPostMemoryResize = 0x0E,
    kSystemFirmwareProgress = 0x0F,
    kEventLoggingDisabled = 0x10,
    kWatchdog1 = 0x11,
    kSystemEvent = 0x12,
    kCriticalInterrupt = 0x13,
    kButton = 0x14,
    kModule = 0x15,
    kMicrocontroller = 0x16,
    kAddInCard = 0x17,
    kChassis = 0x18,
    kChipSet = 0x19,
    kOtherFru = 0x1A,
    kCable = 0x1B,
    kTerminator = 0x1C,
    kSystemBoot = 0x1D,
    kBootError = 0x1E,
    kOsBoot = 0x1F,
    kOsStop = 0x20,
    kSlot = 0x21,
    kAcpiPowerState = 0x22,
    kWatchdog2 = 0x23,
    kPlatformAlert = 0x24,
    kEntityPresence = 0x25,
    kMonitorAsic = 0x26,
    kLan = 0x27,
    kManagementSubsystemHealth = 0x28,
    kBattery = 0x29,
    kSessionAudit = 0x2A,
    kVersionChange = 0x2B,
    kFruState = 0x2C,
    kFirstOem = 0xC0,
};
}  // namespace sensor_type

/// "Temperature", "Drive Slot", "OEM"; empty for 00h and what the standard reserves.
std::string_view SensorTypeName(std::uint8_t sensorType);

}  // namespace ipmi
