#pragma once

#include <string>

#include "plugins/ipmisel/inventory/vpd_entry.h"
#include "plugins/ipmisel/requests/request_vpd.h"

// Firmware as instances; the properties are named as those of CIM_SoftwareIdentity are.

namespace ipmisel {

/// One piece of firmware. What is empty is not known and not written.
struct FirmwareElement {
    std::string name;
    std::string manufacturer;
    std::string version;
    std::string majorVersion;
    std::string minorVersion;
    std::string revision;
    std::string identifyingNumber;
};

/// `build` is the build information, which becomes the revision.
FirmwareElement BmcElement(const DeviceID& device, const std::string& build);
/// An empty version is an unknown one.
FirmwareElement CpldElement(const std::string& version);
FirmwareElement FpgaElement(const std::string& revision);
FirmwareElement BackplaneElement(unsigned busId, const std::string& version);

/// Adds one instance of the class.
void AddFirmwareElement(const char* className, const FirmwareElement& element,
                        IPMIVPDEntry* collector);

}  // namespace ipmisel
