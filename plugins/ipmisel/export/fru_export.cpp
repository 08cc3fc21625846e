#include "plugins/ipmisel/export/fru_export.h"

#include <algorithm>
#include <array>
#include <utility>

#include "base/text.h"
#include "plugins/ipmisel/inventory/spd.h"
#include "plugins/ipmisel/log.h"

namespace ipmisel {
namespace {

using Strings = std::vector<std::string>;

/// The first of the strings that are exported, which decides about all of them.
constexpr std::size_t kFirstString = 3;
/// What the strings from kFirstString on are. What stands before and after them is not told.
constexpr std::array<const char*, 4> kStringProperties{"Vendor", "Name", "SerialNumber",
                                                       "PartNumber"};

Strings StringsOf(const IPMIFRULocator& locator) {
    Strings strings;
    locator.GetFRUDataString(strings);
    return strings;
}

bool IsAcceptable(const Strings& strings) {
    return strings.size() > kFirstString && isPrintable(strings[kFirstString]);
}

void AddStrings(const Strings& strings, IPMIVPDEntry* collector) {
    for (std::size_t i = 0; i < kStringProperties.size(); ++i) {
        if (kFirstString + i >= strings.size()) break;
        collector->AddProperty(kStringProperties[i], strings[kFirstString + i]);
    }
}

/// What every instance ends with.
void Close(IPMIVPDEntry* collector) {
    collector->AddProperty("FRUNumber", " ");
    collector->AddProperty("IdentifyingNumber", " ");
    collector->AddInstance();
}

/// The prefix tells the node where there are several.
void AddName(const FruNode& node, const std::string& prefix, std::string_view name,
             IPMIVPDEntry* collector) {
    std::string shown = node.count > 1 ? prefix : std::string();
    collector->AddProperty("ElementName", shown.append(name));
}

// ---- Located devices ----------------------------------------------------------------------------

std::span<const std::uint8_t> DataOf(const IPMIFRULocator& locator) {
    return {locator.GetFRUData(), IPMIFRULocator::kFruDataLength};
}

/// The properties of a memory module, whose data has no strings of its own. Nothing when they
/// cannot be had.
bool AddMemoryModule(const FruNode& node, const IPMIFRULocator& locator, SpdKind kind,
                     IPMIVPDEntry* collector) {
    const auto module = DecodeSpd(kind, DataOf(locator));
    if (!module) {
        WriteLog(kInfo, "The memory module's identity lies beyond what is read of its data.");
        return false;
    }
    AddName(node, Format("Node %d : ", node.number), locator.GetIDString(), collector);
    collector->AddProperty("Vendor", module->vendor);
    collector->AddProperty("SerialNumber", module->serialNumber);
    collector->AddProperty("PartNumber", module->partNumber);
    Close(collector);
    return true;
}

bool AddLocated(const FruNode& node, const IPMIFRULocator& locator, IPMIVPDEntry* collector) {
    if (const auto kind = RecogniseSpd(DataOf(locator))) {
        return AddMemoryModule(node, locator, *kind, collector);
    }
    const Strings strings = StringsOf(locator);
    if (!IsAcceptable(strings)) return false;
    AddName(node, Format("Node %d : ", node.number), locator.GetIDString(), collector);
    AddStrings(strings, collector);
    Close(collector);
    return true;
}

bool ExportLocated(const FruNode& node, IPMIRequestFRULocator* request, IPMIFRULocator& locator,
                   IPMIVPDEntry* collector) {
    const std::string idString = locator.GetIDString();
    const bool skipped = IsPassedOver(idString);
    if (!skipped) {
        request->IPMIGetFRUData(node.context, &locator, false);  // what it has read counts
        if (LogEnabled(kInfo)) {
            WriteLog(kInfo, "Current FRU Data: " + DumpBytes(DataOf(locator), Digits::kUpperHex));
        }
    }
    WriteLog(kInfo, "FRULocatorInstance.GetIDString() = " + idString);
    WriteLog(kInfo, skipped ? "Skipping this VPD.\n" : "Adding this VPD.\n");
    return !skipped && AddLocated(node, locator, collector);
}

// ---- Listed devices -----------------------------------------------------------------------------

bool HasData(const IPMIFRULocator& locator) {
    const auto data = DataOf(locator);
    return std::any_of(data.begin(), data.end(), [](std::uint8_t byte) { return byte != 0; });
}

}  // namespace

bool ExportFruDeviceZero(NQORTQR20::TCPluginCallbacks* context, IPMIRequestFRULocator* request,
                         IPMIVPDEntry* collector) {
    IPMIFRULocator board;
    request->IPMIGetFRUData(context, &board, true);  // a failed read leaves no strings
    if (collector == nullptr) return false;
    const Strings strings = StringsOf(board);
    if (IsAcceptable(strings)) {
        AddStrings(strings, collector);
        Close(collector);
    }
    return true;
}

bool ExportLocatedFrus(const FruNode& node, IPMIRequestFRULocator* request,
                       std::vector<IPMIFRULocator>* locators, IPMIVPDEntry* collector) {
    bool any = false;
    for (IPMIFRULocator& locator : *locators) {
        any |= ExportLocated(node, request, locator, collector);
    }
    return any;
}

void ExportListedFrus(const FruNode& node, IPMIRequestVPD* request,
                      std::span<const VpdDevice> devices, IPMIVPDEntry* collector) {
    WriteLog(kInfo, "Using hard-coded VPD info.");
    for (const VpdDevice& device : devices) {
        IPMIFRULocator data;
        request->IPMIGetVPDEntryData(node.context, device, &data);  // what it has read counts
        const Strings strings = StringsOf(data);
        if (!IsAcceptable(strings) && !(device.listedWithoutStrings && HasData(data))) {
            continue;
        }
        AddName(node, Format("Node:%d ", node.number), device.name, collector);
        AddStrings(strings, collector);
        collector->AddProperty("Status", "NORMAL");
        Close(collector);
    }
}

}  // namespace ipmisel
