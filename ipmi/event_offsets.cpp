#include "ipmi/event_offsets.h"

#include <array>
#include <cstddef>
#include <span>

#include "ipmi/event_types.h"
#include "ipmi/sensor_types.h"

namespace ipmi {

namespace {

using Words = std::span<const std::string_view>;

constexpr auto Row(auto... words) {
    return std::array<std::string_view, sizeof...(words)>{words...};
}

// Threshold and generic types 01h to 0Ch, table 42-2.
constexpr auto kThreshold = Row(
    "below the lower non-critical threshold", "risen above the lower non-critical threshold",
    "below the lower critical threshold", "risen above the lower critical threshold",
    "below the lower non-recoverable threshold", "risen above the lower non-recoverable threshold",
    "fallen below the upper non-critical threshold", "above the upper non-critical threshold",
    "fallen below the upper critical threshold", "above the upper critical threshold",
    "fallen below the upper non-recoverable threshold",
    "above the upper non-recoverable threshold");
constexpr auto kUsage = Row("idle", "active", "busy");
constexpr auto kDigitalState = Row("state deasserted", "state asserted");
constexpr auto kPredictiveFailure = Row("no failure predicted", "failure predicted");
constexpr auto kLimit = Row("limit not exceeded", "limit exceeded");
constexpr auto kPerformance = Row("performance met", "performance lags");
constexpr auto kSeverity =
    Row("OK", "non-critical (from OK)", "critical (from less severe)",
        "non-recoverable (from less severe)", "non-critical (from more severe)",
        "critical (from non-recoverable)", "non-recoverable", "monitor", "informational");
constexpr auto kPresence = Row("device removed or absent", "device inserted or present");
constexpr auto kEnabled = Row("device disabled", "device enabled");
constexpr auto kAvailability = Row("running", "in test", "powered off", "on line", "off line",
                                   "off duty", "degraded", "in power save", "installation error");
constexpr auto kRedundancy =
    Row("fully redundant", "redundancy lost", "redundancy degraded",
        "non-redundant, sufficient resources (from redundant)",
        "non-redundant, sufficient resources (from insufficient resources)",
        "non-redundant, insufficient resources", "redundancy degraded (from fully redundant)",
        "redundancy degraded (from non-redundant)");
constexpr auto kAcpiDevice = Row("device power state D0", "device power state D1",
                                 "device power state D2", "device power state D3");

constexpr std::array<Words, 13> kByEventType{
    Words(),   kThreshold, kUsage,   kDigitalState, kPredictiveFailure, kLimit,     kPerformance,
    kSeverity, kPresence,  kEnabled, kAvailability, kRedundancy,        kAcpiDevice};
static_assert(kByEventType[kSeverityEvents].size() == 9);
static_assert(kByEventType[kAcpiDeviceEvents].size() == 4);

// Sensor-specific offsets, table 42-3.
constexpr auto kPhysicalSecurity =
    Row("chassis intrusion", "drive bay intrusion", "I/O card area intrusion",
        "processor area intrusion", "LAN leash lost (unplugged from the LAN)",
        "unauthorized docking", "fan area intrusion");
constexpr auto kPlatformSecurity =
    Row("secure mode violated (front panel lockout)", "wrong pre-boot user password",
        "wrong pre-boot setup password", "wrong pre-boot network boot password",
        "other wrong pre-boot password", "wrong password for out-of-band access");
constexpr auto kProcessor =
    Row("internal error (IERR)", "thermal trip", "FRB1 or built-in self-test failed",
        "hang in POST (FRB2)", "processor did not start or initialize (FRB3)",
        "configuration error", "uncorrectable CPU complex error (SMBIOS)", "processor present",
        "processor disabled", "terminator present", "processor throttled",
        "uncorrectable machine check exception", "correctable machine check error");
constexpr auto kPowerSupply =
    Row("power supply present", "power supply failed", "failure predicted",
        "power supply input lost (AC/DC)", "power supply input lost or out of range",
        "power supply input out of range, but present", "configuration error",
        "power supply inactive (standby)");
constexpr auto kPowerUnit =
    Row("power off", "power cycle", "power-down by the 240 VA limit", "power-down by an interlock",
        "power input lost (AC)", "soft power control failed, no reaction to a power-on request",
        "power unit failed", "failure predicted");
constexpr auto kMemory =
    Row("correctable memory error (ECC or other)", "uncorrectable memory error (ECC or other)",
        "memory parity error", "memory scrub failed (stuck bit)", "memory device disabled",
        "logging limit of correctable memory errors reached", "memory present",
        "memory configuration error", "spare memory", "memory throttled",
        "memory critically overheated");
constexpr auto kDriveSlot =
    Row("drive present", "drive failed", "drive failure predicted", "hot spare",
        "consistency or parity check in progress", "in a critical array", "in a failed array",
        "rebuild or remap in progress", "rebuild or remap aborted");
constexpr auto kFirmwareProgress =
    Row("system firmware error (POST error)", "system firmware hang", "system firmware progress");
constexpr auto kLoggingDisabled =
    Row("logging of correctable memory errors disabled", "logging of an event type disabled",
        "log cleared", "all event logging disabled", "log full", "log almost full",
        "logging of correctable machine check errors disabled");
constexpr auto kWatchdog1 =
    Row("reset by the BIOS watchdog", "reset by the OS watchdog", "shutdown by the OS watchdog",
        "power-down by the OS watchdog", "power cycle by the OS watchdog",
        "NMI or diagnostic interrupt by the OS watchdog", "OS watchdog expired, status only",
        "pre-timeout interrupt by the OS watchdog, no NMI");
constexpr auto kSystemEvent =
    Row("system reconfigured", "OEM system boot event", "undetermined system hardware failure",
        "auxiliary log", "platform event filter (PEF) action", "time stamp clock set");
constexpr auto kCriticalInterrupt =
    Row("front panel NMI or diagnostic interrupt", "bus timeout", "I/O channel check NMI",
        "software NMI", "PCI parity error (PERR)", "PCI system error (SERR)",
        "EISA fail-safe timeout", "correctable bus error", "uncorrectable bus error",
        "fatal NMI (port 61h, bit 7)", "fatal bus error", "bus degraded");
constexpr auto kButton = Row("power button pressed", "sleep button pressed", "reset button pressed",
                             "FRU latch open", "FRU service request button pressed");
constexpr auto kChipSet =
    Row("soft power control failed, no reaction to a power state request", "thermal trip");
constexpr auto kCable =
    Row("cable connected", "configuration error, wrong cable or wrong interconnection");
constexpr auto kSystemBoot =
    Row("boot initiated by power-up", "boot initiated by hard reset",
        "boot initiated by warm reset", "PXE boot requested by the user",
        "automatic boot to diagnostics", "hard reset initiated by the OS or run-time software",
        "warm reset initiated by the OS or run-time software", "system restart");
constexpr auto kBootError =
    Row("no bootable medium", "non-bootable diskette in the drive", "PXE server not found",
        "invalid boot sector", "timeout waiting for the selection of a boot source");
constexpr auto kOsBoot =
    Row("boot from A: completed", "boot from C: completed", "PXE boot completed",
        "diagnostic boot completed", "CD-ROM boot completed", "ROM boot completed",
        "boot completed, device not specified", "OS or hypervisor installation started",
        "OS or hypervisor installation completed", "OS or hypervisor installation aborted",
        "OS or hypervisor installation failed");
constexpr auto kOsStop =
    Row("critical stop while the OS was loading", "run-time critical stop of the OS",
        "graceful OS stop, the system stays powered on", "graceful OS shutdown",
        "soft shutdown initiated by PEF", "agent not responding to a shutdown request");
constexpr auto kSlot = Row("fault status asserted", "identify status asserted",
                           "device installed or attached", "ready for device installation",
                           "ready for device removal", "slot power off", "device removal requested",
                           "interlock asserted", "slot disabled", "slot holds a spare device");
constexpr auto kAcpiPowerState =
    Row("S0/G0, working", "S1, sleeping with hardware and processor context maintained",
        "S2, sleeping with processor context lost",
        "S3, sleeping with processor and hardware context lost, memory retained",
        "S4, suspended to disk", "S5/G2, soft off", "soft off, S4 or S5", "G3, mechanical off",
        "sleeping in S1, S2, or S3", "G1, sleeping in S1 to S4", "S5, entered by override",
        "legacy on", "legacy off", "", "power state unknown");
constexpr auto kWatchdog2 = Row("watchdog timer expired, status only", "hard reset by the watchdog",
                                "power-down by the watchdog", "power cycle by the watchdog", "", "",
                                "", "", "watchdog timer interrupt");
constexpr auto kPlatformAlert = Row("page sent", "LAN alert sent", "platform event trap sent",
                                    "SNMP trap sent in the vendor's format");
constexpr auto kEntityPresence = Row("present", "absent", "disabled");
constexpr auto kLan = Row("LAN heartbeat lost", "LAN heartbeat");
constexpr auto kManagementHealth =
    Row("sensor access degraded or unavailable", "controller access degraded or unavailable",
        "management controller off line", "management controller unavailable", "sensor failed",
        "FRU failed");
constexpr auto kBattery = Row("battery low", "battery failed", "battery present");
constexpr auto kSessionAudit =
    Row("session activated", "session deactivated", "invalid user name or password",
        "user disabled after invalid passwords");
constexpr auto kVersionChange =
    Row("hardware change detected", "firmware or software change detected",
        "hardware incompatibility detected", "firmware or software incompatibility detected",
        "invalid or unsupported hardware version",
        "invalid or unsupported firmware or software version", "hardware change succeeded",
        "firmware or software change succeeded");
constexpr auto kFruState =
    Row("FRU not installed", "FRU inactive", "FRU activation requested",
        "FRU activation in progress", "FRU active", "FRU deactivation requested",
        "FRU deactivation in progress", "FRU communication lost");

constexpr std::array<Words, 45> kBySensorType = [] {
    namespace type = sensor_type;
    std::array<Words, 45> table{};
    table[type::kPhysicalSecurity] = kPhysicalSecurity;
    table[type::kPlatformSecurity] = kPlatformSecurity;
    table[type::kProcessor] = kProcessor;
    table[type::kPowerSupply] = kPowerSupply;
    table[type::kPowerUnit] = kPowerUnit;
    table[type::kMemory] = kMemory;
    table[type::kDriveSlot] = kDriveSlot;
    table[type::kSystemFirmwareProgress] = kFirmwareProgress;
    table[type::kEventLoggingDisabled] = kLoggingDisabled;
    table[type::kWatchdog1] = kWatchdog1;
    table[type::kSystemEvent] = kSystemEvent;
    table[type::kCriticalInterrupt] = kCriticalInterrupt;
    table[type::kButton] = kButton;
    table[type::kChipSet] = kChipSet;
    table[type::kCable] = kCable;
    table[type::kSystemBoot] = kSystemBoot;
    table[type::kBootError] = kBootError;
    table[type::kOsBoot] = kOsBoot;
    table[type::kOsStop] = kOsStop;
    table[type::kSlot] = kSlot;
    table[type::kAcpiPowerState] = kAcpiPowerState;
    table[type::kWatchdog2] = kWatchdog2;
    table[type::kPlatformAlert] = kPlatformAlert;
    table[type::kEntityPresence] = kEntityPresence;
    table[type::kLan] = kLan;
    table[type::kManagementSubsystemHealth] = kManagementHealth;
    table[type::kBattery] = kBattery;
    table[type::kSessionAudit] = kSessionAudit;
    table[type::kVersionChange] = kVersionChange;
    table[type::kFruState] = kFruState;
    return table;
}();

std::string_view WordAt(Words words, std::size_t offset) {
    return offset < words.size() ? words[offset] : std::string_view();
}

}  // namespace

std::string_view EventOffsetText(std::uint8_t eventType, std::uint8_t sensorType,
                                 std::uint8_t offset) {
    if (eventType == kSensorSpecificEvents) {
        if (sensorType >= kBySensorType.size()) return {};
        return WordAt(kBySensorType[sensorType], offset);
    }
    if (eventType >= kByEventType.size()) return {};
    return WordAt(kByEventType[eventType], offset);
}

}  // namespace ipmi
