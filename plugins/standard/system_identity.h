#pragma once

#include <optional>
#include <string>

#include "plugins/standard/fru_device.h"
#include "plugins/standard/smbios_facts.h"

namespace standard {

/// Who made the machine and what it is. What is not known is empty.
struct SystemIdentity {
    std::string manufacturer;
    std::string product;
    std::string serialNumber;
};

/// Each by SMBIOS, else by the product area, else by the board area of FRU device 0, `own`.
SystemIdentity IdentifySystem(const SmbiosFacts& smbios, const std::optional<FruDevice>& own);

}  // namespace standard
