#include "plugins/ipmisel/export/firmware_export.h"

#include <cstdint>
#include <optional>
#include <utility>

#include "base/text.h"

namespace ipmisel {
namespace {

// IDs that name nobody and nothing (IPMI 2.0, table 20-2).
constexpr std::uint32_t kUnspecified = 0;
constexpr std::uint32_t kReservedManufacturer = 0x0FFFFF;
constexpr std::uint32_t kReservedProduct = 0xFFFF;

template <typename Id>
bool Names(const std::optional<Id>& id, std::uint32_t reserved) {
    return id && *id != kUnspecified && *id != reserved;
}

}  // namespace

FirmwareElement BmcElement(const DeviceID& device, const std::string& build) {
    FirmwareElement element;
    element.name = "BMC";
    element.majorVersion = std::to_string(device.majorVersion);
    element.minorVersion = Format("%02x", device.minorVersion);
    element.version = element.majorVersion + "." + element.minorVersion;
    element.revision = build;
    element.identifyingNumber = Format("Device ID 0x%02X", device.deviceId);
    if (Names(device.product, kReservedProduct)) {
        element.identifyingNumber += Format(", Product ID 0x%04X", *device.product);
    }
    if (Names(device.manufacturer, kReservedManufacturer)) {
        element.manufacturer = std::to_string(*device.manufacturer);
    }
    return element;
}

FirmwareElement CpldElement(const std::string& version) {
    FirmwareElement element;
    element.name = "CPLD";
    element.version = "CPLD version - ";
    element.version += version.empty() ? "Unknown CPLD" : version;
    return element;
}

FirmwareElement FpgaElement(const std::string& revision) {
    FirmwareElement element;
    element.name = "FPGA";
    element.version = "FPGA Revision - ";
    element.version += revision;
    return element;
}

FirmwareElement BackplaneElement(unsigned busId, const std::string& version) {
    FirmwareElement element;
    element.name = "AMI backplane";
    element.version = version;
    element.identifyingNumber = Format("BusID %u", busId);
    return element;
}

void AddFirmwareElement(const char* className, const FirmwareElement& element,
                        IPMIVPDEntry* collector) {
    const std::pair<const char*, const std::string&> properties[] = {
        {"Name", element.name},
        {"Manufacturer", element.manufacturer},
        {"VersionString", element.version},
        {"MajorVersion", element.majorVersion},
        {"MinorVersion", element.minorVersion},
        {"Revision", element.revision},
        {"IdentifyingNumber", element.identifyingNumber},
    };
    collector->AddProperty("CreationClassName", className);
    for (const auto& [name, value] : properties) {
        if (!value.empty()) collector->AddProperty(name, value);
    }
    collector->AddInstance();
}

}  // namespace ipmisel
