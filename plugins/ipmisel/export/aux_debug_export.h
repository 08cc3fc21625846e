#pragma once

#include "plugins/ipmisel/records/rows.h"
#include "plugins/ipmisel/records/sel_entry.h"
#include "plugins/ipmisel/texts/ipmi_mapping.h"
#include "tqr/plugin.h"
#include "tqr/splibrary.h"

/// Writes one QORSG_ZMCAuxDebugRecord instance a debug-code entry of the auxiliary log whose SEL
/// record is among `selEntries`. `node` is accepted and not written. 0 when all entries were
/// processed, whatever befell single ones; 1 when no value array or no time stamp could be had.
unsigned ExportAuxDebugLog(int node, NQORTQR20::TCPluginCallbacks* context,
                           NQORTQR20::fdriIOHandle* output, s_AuxLog_entry* entries,
                           unsigned int count, IPMISELEntry* selEntries, unsigned int selCount,
                           IPMIMapping* mapping, NQORTQR20::SPLibrary* library);
