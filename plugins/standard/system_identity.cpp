#include "plugins/standard/system_identity.h"

namespace standard {

SystemIdentity IdentifySystem(const SmbiosFacts& smbios, const std::optional<FruDevice>& own) {
    SystemIdentity identity;
    if (smbios.system) {
        identity = {smbios.system->manufacturer, smbios.system->product,
                    smbios.system->serialNumber};
    }
    if (!own) return identity;
    if (identity.manufacturer.empty()) identity.manufacturer = own->Manufacturer();
    if (identity.product.empty()) identity.product = own->Product();
    if (identity.serialNumber.empty()) identity.serialNumber = own->SerialNumber();
    return identity;
}

}  // namespace standard
