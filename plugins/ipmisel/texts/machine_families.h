#pragma once

#include <cstdint>
#include <span>
#include <string_view>

// What differs from one model of server to the next, as data: one row a family. Described for the
// people who configure it in docs/machine-families.md.

namespace ipmisel {

/// A device whose vital product data is read directly when the sensor repository locates none.
struct VpdDevice {
    std::string_view name;
    std::uint8_t fruDevice;  ///< FRU device ID on the BMC
    /// Listed as soon as it has an inventory: it seldom has readable strings.
    bool listedWithoutStrings = false;
};

/// Which event data bytes an OEM detail is taken from. A byte that event data 1 does not declare as
/// OEM counts as absent.
enum class OemData {
    kData2,
    kData3,
    kBoth,  ///< event data 2 the low byte, event data 3 the high one
};
enum class OemForm {
    kBits,  ///< one name for every set bit
    kCode,  ///< one name for the value
};

/// How the OEM event data of some sensors is shown: a heading, then names.
struct OemDetail {
    std::uint8_t sensorType;
    std::uint8_t firstSensor;  ///< sensor numbers firstSensor to lastSensor
    std::uint8_t lastSensor;
    OemData data;
    OemForm form;
    std::string_view heading;                 ///< with its colon and blank
    std::span<const std::string_view> names;  ///< by bit or by code; without the full stop
};

enum class FirmwareKind { kCpld, kFpga, kBackplane };
enum class VersionForm {
    kMajorMinor,  ///< bytes in order, decimal, points between
    kHex,         ///< bytes in order, two hexadecimal digits each
    kText,        ///< characters up to a NUL
};

/// A command that reads one version, and where the version stands in the answer.
struct FirmwareQuery {
    FirmwareKind kind;
    std::uint8_t busId;  ///< of a backplane; 0 for the others
    std::uint8_t netFn;
    std::uint8_t command;
    std::span<const std::uint8_t> request;
    std::uint8_t versionAt;      ///< from the first byte after the completion code
    std::uint8_t versionLength;  ///< in bytes; 0 is all that follows
    VersionForm form;
    bool propertyPage;  ///< the answer is a property page, which the log mentions
};

/// Logged when a machine has no list of devices.
inline constexpr std::string_view kNoVpdDeviceList =
    "Could not find vital product data Device list for Baseboard Management Controller machine.";

struct MachineFamily {
    std::string_view name;
    std::span<const std::string_view> machineTypes;
    std::span<const VpdDevice> vpdDevices;
    std::span<const OemDetail> oemDetails;
    std::span<const FirmwareQuery> firmwareQueries;
    std::string_view noVpdDeviceList = kNoVpdDeviceList;
    bool headless = false;  ///< its models are run without a display
};

/// The family of a machine type, compared as a whole; null when there is none. `index`, when given,
/// becomes the family's place in the table; it is left alone when there is none.
const MachineFamily* FindMachineFamily(std::string_view machineType, int* index = nullptr);

/// Whether the inventory passes over a located device, by its ID string: boards of several families
/// and processors.
bool IsPassedOver(std::string_view idString);

/// A supervisor adapter on board, which forwards text, is named so in SMBIOS.
inline constexpr std::string_view kSupervisorAdapter = "TSB II";

}  // namespace ipmisel
