#pragma once

#include <string>

#include "plugins/standard/node_pass.h"
#include "plugins/standard/output.h"
#include "tqr/classes.h"

namespace standard {

/// A class: how it is declared, and what writes its instances of one node.
struct ClassEntry {
    NQORTQR20::fdrClassInfo info;
    void (*write)(NodePass& pass, Output& output);
    /// Says what of it will be asked, before the first class is written; null for nothing.
    void (*announce)(NodePass& pass) = nullptr;
};

/// Null for a class that the plug-in does not have.
const ClassEntry* FindClass(std::string_view name);

/// Writes Part, PartNumber, SerialNumber and PartCertain, or PartCandidates.
void WritePart(const PartEvidence& evidence, Output& output);

// Each stands with the code that writes it.
extern const ClassEntry kControllerClass;
extern const ClassEntry kEventLogClass;
extern const ClassEntry kSensorClass;
extern const ClassEntry kEventClass;
extern const ClassEntry kFindingClass;
extern const ClassEntry kFruClass;

}  // namespace standard
