#include <string>
#include <vector>

#include "base/text.h"
#include "plugins/ipmisel/export/firmware_export.h"
#include "plugins/ipmisel/log.h"
#include "plugins/ipmisel/pass/discovery.h"
#include "plugins/ipmisel/pass/sections.h"
#include "plugins/ipmisel/pass/state.h"

// Firmware versions are read in-band only. Where they stand, a machine's family says; of a machine
// of no family none is guessed.

namespace ipmisel {
namespace {

std::vector<FirmwareQuery> QueriesFor(FirmwareKind kind) {
    std::vector<FirmwareQuery> queries;
    const MachineFamily* const family = FindMachineFamily(Module().fMachineType);
    if (family == nullptr) return queries;
    for (const FirmwareQuery& query : family->firmwareQueries) {
        if (query.kind == kind) queries.push_back(query);
    }
    return queries;
}

/// Several nodes are distinguished as in the inventory.
void Write(Node& node, const char* className, FirmwareElement element) {
    if (node.count > 1) element.name = Format("Node %d : ", node.number) + element.name;
    IPMIVPDEntry& collector = *node.objects.vpdEntry;
    AddFirmwareElement(className, element, &collector);
    collector.GenerateCIMInstance(node.output, className);
    collector.SetFruInstances({});
}

/// From the BMC, else from the machine's SMBIOS; empty when neither tells.
std::string IPMIGetBMCBuildInfo(const Node& node, const DeviceID& device) {
    if (device.auxiliaryRevision) return Format("%08X", *device.auxiliaryRevision);
    std::string release = DiscoverFirmwareRelease(node.context);
    if (release.empty()) {
        WriteLog(kWarning, "IPMIGetBMCBuildInfo:error Could not obtain BMC build information.\n");
    }
    return release;
}

/// What the log says when a version cannot be had.
struct VersionWords {
    const char* noAnswer;   ///< or no command for it
    const char* noVersion;  ///< the answer has none where it should stand
    Severity noVersionSeverity = kWarning;
};

/// The version of the part that a machine has one of; empty when it cannot be had.
std::string ReadVersion(const Node& node, const std::vector<FirmwareQuery>& queries,
                        const VersionWords& words) {
    std::string version;
    const unsigned result = queries.empty() ? kFailed
                                            : node.objects.vpd->IPMIGetFirmwareVersion(
                                                  node.context, queries.front(), &version);
    if (result == kFailed) WriteLog(kInfo, words.noAnswer);
    if (result == kEndOfData) WriteLog(words.noVersionSeverity, words.noVersion);
    return version;
}

}  // namespace

void CollectBmcFirmware(Node& node) {
    if (ReachedOverLan()) return;
    WriteLog(kInfo, "Getting BMC firmware data.");
    DeviceID device;
    const bool known = node.objects.vpd->IPMIGetDeviceID(node.context, &device) == kOk;
    const std::string build = IPMIGetBMCBuildInfo(node, device);
    if (!known) {
        WriteLog(kWarning, "Could not obtain BMC firmware information.\n");
        return;
    }
    Write(node, kBmcFirmwareClass, BmcElement(device, build));
}

void CollectCpldFirmware(Node& node) {
    if (ReachedOverLan()) return;
    WriteLog(kInfo, "Getting CPLD firmware data.");
    constexpr VersionWords kWords{"Could not obtain CPLD information for this instance.\n",
                                  "Could not obtain CPLD offsets for this instance.\n"};
    const std::string version = ReadVersion(node, QueriesFor(FirmwareKind::kCpld), kWords);
    Write(node, kCpldFirmwareClass, CpldElement(version));
}

void CollectFpgaFirmware(Node& node) {
    if (ReachedOverLan()) return;
    WriteLog(kInfo, "Getting FPGA firmware data.");
    constexpr VersionWords kWords{"Could not obtain FPGA information for this instance.\n",
                                  "Could not obtain FPGA offsets for this instance.\n"};
    constexpr const char* kNoBuild = "Could not obtain FPGA build_id for this instance.\n";
    constexpr VersionWords kPageWords{kNoBuild, kNoBuild, kInfo};

    const std::vector<FirmwareQuery> queries = QueriesFor(FirmwareKind::kFpga);
    const bool propertyPage = !queries.empty() && queries.front().propertyPage;
    if (propertyPage) {
        WriteLog(kInfo, "This is Zorvanek, call netfn 0x3A, cmd 0x90, and read property page.\n");
    }
    const std::string revision = ReadVersion(node, queries, propertyPage ? kPageWords : kWords);
    if (!revision.empty()) Write(node, kFpgaFirmwareClass, FpgaElement(revision));
}

void CollectBackplaneFirmware(Node& node) {
    if (ReachedOverLan()) return;
    WriteLog(kInfo, "Getting AMI backplane firmware data.");
    // Only controllers of the integrated kind know the backplanes' commands.
    if (node.library == nullptr || !node.library->IsiBMCMachine()) return;
    for (const FirmwareQuery& query : QueriesFor(FirmwareKind::kBackplane)) {
        std::string version;
        const bool known =
            node.objects.vpd->IPMIGetFirmwareVersion(node.context, query, &version) == kOk;
        WriteLog(kInfo, Format("%s BusID[%d] information for AMI backplane.\n",
                               known ? "Got" : "Could not create the instance for", query.busId));
        if (known) Write(node, kBackplaneFirmwareClass, BackplaneElement(query.busId, version));
    }
}

}  // namespace ipmisel
