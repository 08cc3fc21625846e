#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "plugins/ipmisel/inventory/vpd_entry.h"
#include "plugins/ipmisel/records/fru_locator.h"
#include "plugins/ipmisel/requests/request_fru_locator.h"
#include "plugins/ipmisel/requests/request_vpd.h"
#include "plugins/ipmisel/texts/machine_families.h"
#include "tqr/plugin.h"

// The FRU inventory as instances of QORSG_IPMIFRU. A device yields one when its data has four
// strings at least, the fourth of them readable. They are gathered in a collector, which the pass
// writes.

namespace ipmisel {

/// Whose inventory it is.
struct FruNode {
    NQORTQR20::TCPluginCallbacks* context;
    int number;  ///< from 0
    int count;   ///< of all nodes; with several, names tell the node
};

/// Device 0 of the node that the request goes to. It is read in any case; false when there is no
/// collector to take it.
bool ExportFruDeviceZero(NQORTQR20::TCPluginCallbacks* context, IPMIRequestFRULocator* request,
                         IPMIVPDEntry* collector);

/// The devices that the sensor repository locates; their inventory is read into `locators`. Of
/// memory modules that answer their serial presence detect data, manufacturer and numbers are
/// exported. Whether there was an instance.
bool ExportLocatedFrus(const FruNode& node, IPMIRequestFRULocator* request,
                       std::vector<IPMIFRULocator>* locators, IPMIVPDEntry* collector);

/// The devices that the machine's family is known to have.
void ExportListedFrus(const FruNode& node, IPMIRequestVPD* request,
                      std::span<const VpdDevice> devices, IPMIVPDEntry* collector);

}  // namespace ipmisel
