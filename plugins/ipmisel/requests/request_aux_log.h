#pragma once

#include "plugins/ipmisel/records/rows.h"
#include "plugins/ipmisel/requests/ipmi_message.h"
#include "tqr/splibrary.h"

/// Asks one BMC node for its auxiliary log (an OEM command of the Storage function).
class IPMIRequestAuxLog : public IPMIMessage {
public:
    explicit IPMIRequestAuxLog(NQORTQR20::SPLibrary* transport);
    /// The number of entries, 0 after any failure; 1 on failure.
    unsigned IPMIGetAuxLogStatus(unsigned int* entryCount);
    /// Leaves the records as they are; always 0.
    unsigned IPMIReadExtendedData(s_AuxLog_entry* entries, unsigned int count);
};
