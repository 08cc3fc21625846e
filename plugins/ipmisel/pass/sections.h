#pragma once

#include <cstdint>
#include <memory>
#include <span>
#include <string_view>
#include <vector>

#include "plugins/ipmisel/class_names.h"
#include "plugins/ipmisel/inventory/vpd_entry.h"
#include "plugins/ipmisel/records/sdr_entry.h"
#include "plugins/ipmisel/records/sel_entry.h"
#include "plugins/ipmisel/requests/request_aux_log.h"
#include "plugins/ipmisel/requests/request_sdr.h"
#include "plugins/ipmisel/requests/request_sel.h"
#include "plugins/ipmisel/requests/request_vpd.h"
#include "plugins/ipmisel/texts/ipmi_mapping.h"
#include "plugins/ipmisel/texts/machine_families.h"
#include "tqr/plugin.h"
#include "tqr/splibrary.h"

namespace ipmisel {

/// What ends a section, and the pass with it. Why has been logged.
struct SectionFailure {
    std::int32_t status;
};

/// The sensor cache of one node and the entries in it.
class OwnedSDRCache {
public:
    explicit OwnedSDRCache(NQORTQR20::TCPluginCallbacks* context) : context_(context) {}
    ~OwnedSDRCache() { DeleteSDRCache(context_, &list_); }
    OwnedSDRCache(const OwnedSDRCache&) = delete;
    OwnedSDRCache& operator=(const OwnedSDRCache&) = delete;

    SDRCache* get() { return &list_; }

private:
    NQORTQR20::TCPluginCallbacks* context_;
    SDRCache list_;
};

/// The objects of one node: created one by one in the order in which the pass tells of them,
/// released from the last member up.
struct NodeObjects {
    std::shared_ptr<IPMIRequestAuxLog> auxLog;
    std::unique_ptr<IPMIRequestVPD> vpd;
    std::unique_ptr<IPMIRequestSEL> sel;
    std::unique_ptr<IPMIRequestSDR> sdr;
    std::unique_ptr<OwnedSDRCache> sdrCache;
    std::unique_ptr<IPMISDREntry> sdrHead;  ///< null once the cache has taken it
    std::unique_ptr<IPMIVPDEntry> vpdEntry;
    std::unique_ptr<IPMISELEntry> selEntry;
    std::unique_ptr<IPMIMapping> mapping;
    std::vector<IPMISELEntry> selEntries;  ///< of the last log section
};

/// What every section of a pass is given.
struct Node {
    NQORTQR20::TCPluginCallbacks* context;
    NQORTQR20::fdriIOHandle* output;
    std::span<const VpdDevice> vpdDevices;  ///< of the machine's family
    int number;                             ///< from 0
    int count;                              ///< of all nodes
    NQORTQR20::SPLibrary* library;
    NodeObjects objects;
};

/// Whether the host reaches the BMC over the network.
bool ReachedOverLan();

// The sections. Each collects, decodes and exports one class of one node.

void CollectLogRecords(Node& node);
void CollectAuxDebugRecords(Node& node);
void CollectFru(Node& node);
void CollectBmcFirmware(Node& node);
void CollectCpldFirmware(Node& node);
void CollectFpgaFirmware(Node& node);
void CollectBackplaneFirmware(Node& node);

struct Section {
    std::string_view className;
    void (*collect)(Node& node);
};
inline constexpr Section kSections[] = {
    {kLogRecordClass, CollectLogRecords},
    {kAuxDebugClass, CollectAuxDebugRecords},
    {kFruClass, CollectFru},
    {kBmcFirmwareClass, CollectBmcFirmware},
    {kCpldFirmwareClass, CollectCpldFirmware},
    {kFpgaFirmwareClass, CollectFpgaFirmware},
    {kBackplaneFirmwareClass, CollectBackplaneFirmware},
};

}  // namespace ipmisel
