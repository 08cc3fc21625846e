#pragma once

#include <cstdint>
#include <vector>

#include "plugins/ipmisel/records/fru_locator.h"
#include "plugins/ipmisel/requests/ipmi_message.h"
#include "tqr/plugin.h"
#include "tqr/splibrary.h"

/// Walks the Sensor Data Repository of one BMC node for FRU device locators (IPMI 2.0, 33.11, 33.12
/// and table 43-7) and reads the first 256 bytes of a device's inventory (34.2). All operations
/// return 0, or 1 on failure.
class IPMIRequestFRULocator : public IPMIMessage {
public:
    /// IPMIGetSDRHeader's result for a record that is no FRU device locator.
    static constexpr unsigned kOtherRecord = 4;

    explicit IPMIRequestFRULocator(NQORTQR20::SPLibrary* transport);

    unsigned IPMIReserveSDR(NQORTQR20::TCPluginCallbacks* context);
    /// Fills the locator from the current record; kOtherRecord when that is none.
    unsigned IPMIGetSDRHeader(NQORTQR20::TCPluginCallbacks* context, IPMIFRULocator* locator);
    unsigned IPMIGetSDRString(NQORTQR20::TCPluginCallbacks* context, IPMIFRULocator* locator);
    /// The whole walk; locators found before a failure stay in the vector. A second walk on the
    /// same object finds nothing.
    unsigned IPMIGetSDREntry(NQORTQR20::TCPluginCallbacks* context,
                             std::vector<IPMIFRULocator>* locators);
    /// Reads the inventory of the located device, or of device 0, into the locator. What was read
    /// before a failure stays there.
    unsigned IPMIGetFRUData(NQORTQR20::TCPluginCallbacks* context, IPMIFRULocator* locator,
                            bool deviceZero);
    /// Logs the located devices.
    unsigned printFRUVector(NQORTQR20::TCPluginCallbacks* context,
                            std::vector<IPMIFRULocator>* locators);

private:
    /// Get SDR of `count` bytes of the current record.
    unsigned ReadRecord(const ipmisel::IPMICommand& command, std::uint8_t offset,
                        std::uint8_t count);
    void LogResponse() const;

    ipmisel::IPMIRecordID reservationId_;
    ipmisel::IPMIRecordID recordId_;      ///< of the record to read next; 0x0000 is the first
    ipmisel::IPMIRecordID nextRecordId_;  ///< as the last record header told it
};
