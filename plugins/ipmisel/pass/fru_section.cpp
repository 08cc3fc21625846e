#include <cstdint>
#include <vector>

#include "plugins/ipmisel/export/fru_export.h"
#include "plugins/ipmisel/log.h"
#include "plugins/ipmisel/pass/entry_points.h"
#include "plugins/ipmisel/pass/sections.h"
#include "plugins/ipmisel/pass/state.h"

namespace ipmisel {
namespace {

constexpr std::int64_t kKeptSeconds = 600;

/// Whether this node's inventory is to be collected now. It is kept for a while, because reading it
/// is slow and it seldom changes.
bool IsDue(const Node& node) {
    const auto now = static_cast<std::uint32_t>(Module().clock(nullptr));
    if (std::int64_t{now} - Module().fCurrentTime > kKeptSeconds) {
        Module().fCurrentTime = now;
        Module().ipmifruonce = false;
        WriteLog(kInfo, "Resetting ipmifruonce.");
    }
    if (Module().ipmifruonce) return false;
    if (node.number == node.count - 1) {
        Module().ipmifruonce = true;
        WriteLog(kInfo, "Setting ipmifruonce.");
    }
    return true;
}

/// The instances of one node, gathered in the collector of the pass.
std::vector<PropertyMap> CollectInstances(const Node& node) {
    IPMIVPDEntry& collector = *Module().fIpmiVpdentryFru;
    collector.SetFruInstances({});
    IPMIRequestFRULocator request(node.library);
    std::vector<IPMIFRULocator> locators;
    request.IPMIGetSDREntry(node.context, &locators);  // what was found before a failure counts
    IPMISELGetDataZero(node.context, node.output, &request);

    const FruNode fruNode{node.context, node.number, node.count};
    const bool any = ExportLocatedFrus(fruNode, &request, &locators, &collector);
    WriteLog(kTrace, "Obtained the following FRU Locators.");
    request.printFRUVector(node.context, &locators);
    if (!any) ExportListedFrus(fruNode, node.objects.vpd.get(), node.vpdDevices, &collector);
    return collector.GetFruInstances();
}

}  // namespace

void CollectFru(Node& node) {
    if (ReachedOverLan() || !IsDue(node)) return;
    WriteLog(kInfo, "Getting VPD records.");
    WriteLog(kInfo, "Obtaining FRU Locator info.");
    auto& kept = Module().fIpmiFruVector;
    kept.resize(static_cast<std::size_t>(node.count));
    kept[static_cast<std::size_t>(node.number)] = CollectInstances(node);
}

}  // namespace ipmisel
