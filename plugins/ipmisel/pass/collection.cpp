#include "plugins/ipmisel/pass/collection.h"

#include <algorithm>
#include <memory>
#include <new>
#include <string>
#include <utility>

#include "plugins/ipmisel/log.h"
#include "plugins/ipmisel/pass/discovery.h"
#include "plugins/ipmisel/pass/driver_notice.h"
#include "plugins/ipmisel/pass/sections.h"
#include "plugins/ipmisel/pass/state.h"
#include "tqr/log.h"

using NQORTQR20::fdriIOHandle;
using NQORTQR20::SPLibrary;
using NQORTQR20::TCPluginCallbacks;

namespace ipmisel {
namespace {

void SettleMachineType(TCPluginCallbacks* context) {
    if (Module().fMTonce) return;
    if (getMachineType(context, &Module().fMachineType).code != NQORTQR20::kStatusOk) {
        WriteLog(kWarning, "Could not obtain Machine Type via SMBIOS.");
        Module().fMachineType = "No machine type found.";
    }
    WriteLog(kInfo, "Machine Type is:");
    WriteLog(kInfo, Module().fMachineType);
}

/// Looks for a BMC until one is found, then never again.
void SettleBmc(TCPluginCallbacks* context) {
    if (Module().gPass != 0) return;
    WriteLog(kInfo, "Preparing to find type 38 for BMC.");
    if (!ReachedOverLan() && DiscoverBMC(context) != kOk) return;
    ++Module().gPass;
    WriteLog(kInfo, "Successfully found type 38 for BMC. or support ipmi lan");
    if (SPLibrary::GetSplibraryInstance(0) == nullptr) {
        WriteLog(kWarning, "Could not load SPLibrary.");
    }
    Module().nodeNum = SPLibrary::GetNumberBMCNode();
    WriteLog(kInfo, "IPMISel:Discover BMC nodes number: " + std::to_string(Module().nodeNum));
    if (!SPLibrary::IsIPMIDriversPresent()) ShowDriverNotice(context, Module().fMachineType);
}

void NoteHardware() {
    if (DiscoverCPLD()) WriteLog(kInfo, "This machine has CPLD.");
    WriteLog(kInfo, DiscoverFPGA() ? "This machine has FPGA." : "This machine doesn't have FPGA.");
    const SPLibrary* const library = SPLibrary::GetSplibraryInstance(0);
    if (library != nullptr && library->IsiBMCMachine()) {
        WriteLog(kInfo, "This machine has AMI backplane.");
    }
}

std::span<const VpdDevice> FindVpdDevices() {
    int index = 0;
    const MachineFamily* const family = FindMachineFamily(Module().fMachineType, &index);
    std::span<const VpdDevice> devices;
    if (family != nullptr) {
        WriteLog(kInfo, "Found matching BMC machine type");
        WriteLog(kTrace, "BMC machine type index=" + std::to_string(index));
        devices = family->vpdDevices;
    }
    if (devices.empty()) {
        WriteLog(kInfo,
                 std::string(family == nullptr ? kNoVpdDeviceList : family->noVpdDeviceList));
    }
    if (LogEnabled(kTrace)) {
        std::string names;
        for (const VpdDevice& device : devices) {
            if (!names.empty()) names += ", ";
            names += device.name;
        }
        WriteLog(kTrace, "Dev_Types Iter=" + names);
    }
    return devices;
}

/// The collector of FRU instances of one pass.
class FruCollector {
public:
    FruCollector() {
        try {
            Module().fIpmiVpdentryFru = std::make_unique<IPMIVPDEntry>();
        } catch (const std::bad_alloc&) {
            WriteLog(kError, "Could not allocate memory for fIpmiVpdentryFru.");
            throw SectionFailure{NQORTQR20::kStatusFailed};
        }
    }
    ~FruCollector() { Module().fIpmiVpdentryFru.reset(); }
    FruCollector(const FruCollector&) = delete;
    FruCollector& operator=(const FruCollector&) = delete;

    /// The instances as they are kept, also in a pass that collected none anew.
    void Write(fdriIOHandle* output) const {
        IPMIVPDEntry& collector = *Module().fIpmiVpdentryFru;
        std::vector<PropertyMap> instances;
        for (const auto& ofNode : Module().fIpmiFruVector) {
            instances.insert(instances.end(), ofNode.begin(), ofNode.end());
        }
        collector.SetFruInstances(std::move(instances));
        collector.GenerateCIMInstance(output, kFruClass);
    }
};

/// Creates one object of a node; `name` is how the log calls it.
template <typename Pointer, typename... Arguments>
void Create(Pointer* object, const char* name, Arguments... arguments) {
    try {
        *object = std::make_unique<typename Pointer::element_type>(arguments...);
    } catch (const std::bad_alloc&) {
        WriteLog(kError, std::string("Could not allocate memory for ") + name + ".");
        throw SectionFailure{NQORTQR20::kStatusNoMemory};
    }
}

void CreateObjects(Node* node) {
    NodeObjects& objects = node->objects;
    Create(&objects.sdr, "ipmi_sdrp", node->library);
    // Compatibility: the log calls both requests by one name
    // (Pass.ObjectThatCannotBeCreatedEndsThePass).
    Create(&objects.sel, "ipmi_sdrp", node->library);
    Create(&objects.vpd, "ipmi_vpdp", node->library);
    Create(&objects.auxLog, "ipmi_auxlogp", node->library);
    Create(&objects.sdrHead, "ipmi_sdr_headp");
    Create(&objects.mapping, "ipmi_mappingp");
    Create(&objects.selEntry, "ipmi_selentryp");
    Create(&objects.vpdEntry, "ipmi_vpdentryp");
    Create(&objects.sdrCache, "sdr_listp", node->context);
}

bool Wants(std::span<const char* const> classNames, std::string_view className) {
    return std::any_of(classNames.begin(), classNames.end(), [&](const char* wanted) {
        return wanted != nullptr && wanted == className;
    });
}

void CollectNode(Node* node, std::span<const char* const> classNames) {
    CreateObjects(node);
    for (const char* const wanted : classNames) {
        for (const Section& section : kSections) {
            if (wanted != nullptr && wanted == section.className) section.collect(*node);
        }
    }
}

}  // namespace

bool ReachedOverLan() {
    const NQORTQR20::IIPMILan* const lan = NQORTQR20::TRootObject::GetipmiLanIns();
    return lan != nullptr && lan->getipmiLanStatus();
}

void Collect(TCPluginCallbacks* context, fdriIOHandle* output,
             std::span<const char* const> classNames) {
    WriteLog(kInfo, "Getting IPMI SEL data.");
    SettleMachineType(context);
    SettleBmc(context);
    if (Module().gPass == 0) return;
    NoteHardware();
    const std::span<const VpdDevice> vpdDevices = FindVpdDevices();

    const FruCollector fruCollector;
    for (int number = 0; number < Module().nodeNum; ++number) {
        Node node{.context = context,
                  .output = output,
                  .vpdDevices = vpdDevices,
                  .number = number,
                  .count = Module().nodeNum,
                  .library = SPLibrary::GetSplibraryInstance(number),
                  .objects = {}};
        CollectNode(&node, classNames);
    }
    if (Wants(classNames, kFruClass)) fruCollector.Write(output);
    WriteLog(kInfo, "Finished getting IPMI SEL data.");
}

}  // namespace ipmisel
