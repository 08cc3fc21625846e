#pragma once

#include <cstdint>
#include <span>
#include <vector>

#include "plugins/ipmisel/records/rows.h"
#include "plugins/ipmisel/requests/debug_file.h"
#include "plugins/ipmisel/requests/ipmi_message.h"
#include "tqr/plugin.h"
#include "tqr/splibrary.h"

/// Walks the Sensor Data Repository of one BMC node (IPMI 2.0, 33.9, 33.11, 33.12) for full and
/// compact sensor records. All operations return 0, or 1 on failure.
class IPMIRequestSDR : public IPMIMessage {
public:
    explicit IPMIRequestSDR(NQORTQR20::SPLibrary* transport);

    /// Writes infoText[0..kSdrInfoTextLength), without a NUL when the text fills it.
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

private:
    /// Get SDR of `count` bytes of the current record.
    unsigned ReadRecord(const ipmisel::IPMICommand& command, std::uint8_t offset,
                        std::uint8_t count);
    /// Writes the reply as "%02X " groups: cut at the field, and without a NUL when it fills it.
    void StoreText(std::span<char> field) const;
    bool IsSensorRecord() const;

    std::uint8_t recordType_ = 0;  ///< of the last record header
    ipmisel::IPMIRecordID reservationId_;
    ipmisel::IPMIRecordID recordId_;      ///< of the record to read next; 0x0000 is the first
    ipmisel::IPMIRecordID nextRecordId_;  ///< as the last record header told it
    ipmisel::DebugFile debugFile_;
};
