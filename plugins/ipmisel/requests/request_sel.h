#pragma once

#include "plugins/ipmisel/records/rows.h"
#include "plugins/ipmisel/requests/debug_file.h"
#include "plugins/ipmisel/requests/ipmi_message.h"
#include "tqr/plugin.h"
#include "tqr/splibrary.h"

/// Reads the System Event Log of one BMC node (IPMI 2.0, 31.2 and 31.5).
class IPMIRequestSEL : public IPMIMessage {
public:
    explicit IPMIRequestSEL(NQORTQR20::SPLibrary* transport);

    /// Get SEL Info: the number of entries; 1 on failure or when the SEL version is not 0x51, with
    /// *entryCount untouched.
    unsigned IPMIGetSELInfo(NQORTQR20::TCPluginCallbacks* context, unsigned int* entryCount);
    /// Walks the whole log and stores its first rowCount entries; `rows` has room for one at least.
    /// 0 also when a later read got no answer; 1 when the first did not, or on a completion code.
    /// `rowsFilled` (may be null) gets the number of rows that were stored.
    unsigned IPMIGetSELEntry(NQORTQR20::TCPluginCallbacks* context, s_SEL_row* rows,
                             unsigned int rowCount, unsigned int* rowsFilled = nullptr);

    // Debugging aids: "./sel.out". No step of the collection calls them.
    unsigned IPMIOpenFile(NQORTQR20::TCPluginCallbacks* context);
    unsigned IPMICloseFile(NQORTQR20::TCPluginCallbacks* context);

private:
    /// The reply as text: "%02X " groups and a line feed, as far as 255 characters reach.
    std::string ResponseText() const;

    ipmisel::IPMIRecordID nextRecordId_;  ///< of the entry to read next
    ipmisel::DebugFile debugFile_;
};
