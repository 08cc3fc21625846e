#pragma once

#include <optional>
#include <string>
#include <vector>

#include "host/core/internal.h"

namespace NQORTQR20 {

/// One read that brought nothing, or too little.
struct ReadFault {
    std::string what;  ///< the command, as the IPMI standard calls it
    /// Record ID, FRU device ID or a sensor's LUN and number: four hexadecimal digits; empty
    /// without one.
    std::string record;
    std::string problem;  ///< "no response", "completion code cb", "short answer", ...
    /// Something of event log or sensor repository is missing; else of what is read beside them.
    bool ofLogOrSensors;
    bool operator==(const ReadFault&) const = default;
};
/// What a node announced of a source, and what was read of it.
struct SourceAccount {
    std::optional<unsigned> announced;  ///< empty when it was not asked, or did not say
    unsigned read = 0;
    bool asked = true;  ///< whether a record of it was
    /// Instances made of them; empty when no class with one for each record was asked for.
    std::optional<unsigned> exported = {};
    /// Records that were announced and, though the source was read, did not come.
    unsigned Missing() const {
        return asked && announced && *announced > read ? *announced - read : 0;
    }
    /// Records that came and did not get into the report.
    unsigned NotExported() const { return exported && *exported < read ? read - *exported : 0; }
};
/// How whole the reading of a node is, as the host saw it go by.
struct NodeCompleteness {
    std::string source;  ///< as the user wrote it
    SourceAccount log;
    SourceAccount sensors;
    std::vector<ReadFault> faults;
    // What else was asked for, of which the controller did not say that it does not have it; a
    // fault of these is no fault of log or sensors.
    SourceAccount controller = {};  ///< facts: identity, clock, chassis, event filters
    SourceAccount readings = {};    ///< sensors that were read
    SourceAccount inventory = {};   ///< FRU devices, read to their ends
    /// Event log and sensor repository were read as far as they were announced, without a fault,
    /// and exported as far as they were read.
    bool Whole() const;
};
class SPLibrary;
/// Of what went through a library object.
NodeCompleteness CompletenessOf(const SPLibrary& library);
/// One for each node of the open machine.
std::vector<NodeCompleteness> GetCompleteness();

}  // namespace NQORTQR20
