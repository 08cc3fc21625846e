#include "ipmi/entities.h"

#include <algorithm>
#include <array>

#include "base/hex.h"

namespace ipmi {

namespace {

// 00h to 37h. 36h is reserved.
constexpr std::array<std::string_view, 0x38> kNames{
    "",
    "Other",
    "Unknown",
    "Processor",
    "Disk",
    "Peripheral Bay",
    "System Management Module",
    "System Board",
    "Memory Module",
    "Processor Module",
    "Power Supply",
    "Add-in Card",
    "Front Panel Board",
    "Back Panel Board",
    "Power System Board",
    "Drive Backplane",
    "System Internal Expansion Board",
    "Other System Board",
    "Processor Board",
    "Power Unit",
    "Power Module",
    "Power Management Board",
    "Chassis Back Panel Board",
    "System Chassis",
    "Sub-Chassis",
    "Other Chassis Board",
    "Disk Drive Bay",
    "Peripheral Bay",
    "Device Bay",
    "Fan",
    "Cooling Unit",
    "Cable",
    "Memory Device",
    "System Management Software",
    "System Firmware",
    "Operating System",
    "System Bus",
    "Group",
    "Remote Management Communication Device",
    "External Environment",
    "Battery",
    "Processing Blade",
    "Connectivity Switch",
    "Processor/Memory Module",
    "I/O Module",
    "Processor/I/O Module",
    "Management Controller Firmware",
    "IPMI Channel",
    "PCI Bus",
    "PCI Express Bus",
    "SCSI Bus",
    "SATA/SAS Bus",
    "Processor Bus",
    "Real Time Clock",
    "",
    "Air Inlet",
};
static_assert(kNames[entity::kPowerSupply] == "Power Supply" && kNames[0x20] == "Memory Device" &&
              kNames[0x2E] == "Management Controller Firmware" &&
              kNames[0x35] == "Real Time Clock");

// 40h to 42h, which DCMI added.
constexpr std::array<std::string_view, 3> kDcmiNames{"Air Inlet", "Processor", "System Board"};

constexpr auto kNotPhysical =
    std::to_array<std::uint8_t>({0x00, 0x01, 0x02, 0x21, 0x22, 0x23, 0x24, 0x25, 0x27, 0x2E, 0x2F,
                                 0x30, 0x31, 0x32, 0x33, 0x34, 0x37, 0x40});

}  // namespace

std::string EntityName(std::uint8_t id) {
    if (id < kNames.size()) return std::string(kNames[id]);
    if (id >= 0x40 && id < 0x40 + kDcmiNames.size()) return std::string(kDcmiNames[id - 0x40]);
    if (id >= 0xD0) return "OEM Entity " + ipmisel::HexByte(id);
    if (id >= 0xB0) return "Board-set-specific Entity " + ipmisel::HexByte(id);
    if (id >= 0x90) return "Chassis-specific Entity " + ipmisel::HexByte(id);
    return {};
}

std::string EntityText(std::uint8_t id, std::uint8_t instance) {
    std::string text = EntityName(id);
    if (!text.empty()) text += ' ' + std::to_string(InstanceNumber(instance));
    return text;
}

bool IsPhysicalEntity(std::uint8_t id) {
    return !EntityName(id).empty() && std::ranges::find(kNotPhysical, id) == kNotPhysical.end();
}

}  // namespace ipmi
