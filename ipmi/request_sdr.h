#pragma once

#include <cstdio>
#include <vector>

#include "ipmi/ipmi_message.h"
#include "records/rows.h"
#include "tqr/plugin.h"
#include "tqr/splibrary.h"

/// Walks the Sensor Data Repository of one BMC node (IPMI 2.0, 33.9, 33.11, 33.12) for full and
/// compact sensor records. All operations return 0, or 1 on failure.
class IPMIRequestSDR : public IPMIMessage {
public:
    explicit IPMIRequestSDR(NQORTQR20::SPLibrary* transport);

    /// `infoText` holds kSdrInfoTextLength characters.
    unsigned IPMIGetSDRInfo(NQORTQR20::TCPluginCallbacks* context, unsigned char* infoText);
    unsigned IPMIReserveSDR(NQORTQR20::TCPluginCallbacks* context);
    unsigned IPMIGetSDRHeader(NQORTQR20::TCPluginCallbacks* context, s_SDR_entry* entry);
    unsigned IPMIGetSDRUnits(NQORTQR20::TCPluginCallbacks* context, s_SDR_entry* entry);
    unsigned IPMIGetSDRString(NQORTQR20::TCPluginCallbacks* context, s_SDR_entry* entry);
    /// The whole walk; entries gathered before a failure stay in the vector. A second walk on the
    /// same object finds nothing.
    unsigned IPMIGetSDREntry(NQORTQR20::TCPluginCallbacks* context,
                             std::vector<s_SDR_entry>* entries, unsigned char* infoText);

    // Debugging aids: "./sdr.out". No step of the collection calls them.
    unsigned IPMIOpenFile(NQORTQR20::TCPluginCallbacks* context);
    unsigned IPMICloseFile(NQORTQR20::TCPluginCallbacks* context);
};
