#pragma once

#include <cstdio>
#include <vector>

#include "plugins/ipmisel/records/extended_log.h"
#include "plugins/ipmisel/records/sdr_entry.h"
#include "plugins/ipmisel/records/sel_entry.h"
#include "plugins/ipmisel/texts/ipmi_mapping.h"
#include "tqr/plugin.h"
#include "tqr/splibrary.h"

/// Writes one QORSG_IPMILogRecord instance a SEL record. `node` counts from 0; `decoder` and
/// `traceFile` are accepted and not used; `recordIdOffset` is added to every record's own ID.
/// 0 when all records were processed, whatever befell single ones; 1 when no value array could be
/// had.
unsigned ExportSEL(int node, NQORTQR20::TCPluginCallbacks* context, NQORTQR20::fdriIOHandle* output,
                   IPMISELEntry* decoder, IPMIMapping* mapping, std::FILE* traceFile,
                   SDRCache* cache, IPMISELEntry* entries, unsigned int count, int recordIdOffset,
                   std::vector<IPMIExtendedSELDataEntry> extendedEntries,
                   NQORTQR20::SPLibrary* library);
