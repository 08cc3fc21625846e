#pragma once

#include "plugins/ipmisel/exported.h"
#include "tqr/plugin.h"

// The event log as a CIM message log, for a host that wants it in addition to the records. No pass
// of a collection calls these; the results of the host are not examined. Always 0.

/// One QORSG_IPMIMessageLog instance: the log itself.
IPMISEL_EXPORTED int ExportMessageLog(NQORTQR20::TCPluginCallbacks* context,
                                      NQORTQR20::fdriIOHandle* output);
/// Two QORSG_IPMIRecordInLog instances, which tie the records with the IDs 1 and 2 to the log.
IPMISEL_EXPORTED int ExportReferences(NQORTQR20::TCPluginCallbacks* context,
                                      NQORTQR20::fdriIOHandle* output);
