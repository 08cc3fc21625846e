#pragma once

#include <chrono>
#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <span>
#include <stdexcept>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "host/core/host.h"
#include "host/spdriver/access.h"
#include "host/spdriver/completeness.h"
#include "host/spdriver/pipeline.h"
#include "host/spdriver/transport.h"
#include "ipmi/command.h"

// Where a machine is reached: what the user says of it, and what comes of it.

namespace NQORTQR20 {

/// One BMC node of a source: either of the two ways is set; ReadLiveNodes (reading.h) makes a
/// transport of a pipeline, which OpenMachine wants.
struct SourceNode {
    std::string name;                           ///< the source as the user wrote it
    std::unique_ptr<Transport> transport;       ///< each request is answered by itself
    std::unique_ptr<RequestPipeline> pipeline;  ///< a live BMC, which is read ahead
    /// A request that a plug-in will send soon. Null where it makes no difference.
    std::function<void(ipmi::Command)> announce = {};
    /// The pass is over; what is to be asked a last time, since log or sensor repository are known
    /// to have changed after they were read: Get SEL Info, Get SDR Repository Info. Null for never.
    std::function<std::vector<ipmi::Command>()> endPass = {};
    /// What else is known to be missing when the pass is over. Null for nothing.
    std::function<std::vector<ReadFault>()> missing = {};
};

/// A node that could not be opened.
struct UnreachableNode {
    std::string name;    ///< the source as the user wrote it
    std::string reason;  ///< one line for the user
};

/// A place where a machine is reached: its facts and its BMC nodes.
struct Source {
    MachineFacts facts;
    std::vector<SourceNode> nodes;
    std::vector<UnreachableNode> unreachable;
    std::vector<std::string> classes;  ///< what a capture was made of; empty when that is not known
};

/// Opens "inband", "lan:HOST", "sim:FILE", "replay:FILE". Several sources must all be of a kind
/// that can be joined (lan:); their nodes follow each other, and those of them that cannot be
/// opened stand in `unreachable`. Throws SourceError when there is no node at all, also for a kind
/// that is not built in.
Source OpenSources(const std::vector<std::string>& sources, const SourceOptions& options);

/// Loads what any session over the network needs, for processes that are copied from this one.
void PrepareSources();

/// Makes the nodes and facts of a source the machine that SPLibrary and the core speak of; until
/// the next call, or CloseMachine.
void OpenMachine(Source source);
/// The nodes of the open machine's sources that could not be opened.
const std::vector<UnreachableNode>& GetUnreachable();
/// The pass over the open machine is over: what is still to be seen of its nodes is asked for.
void EndPass();
void CloseMachine();

/// The number, from 1, of the last command of a plug-in if that was an optional one which the BMC
/// says it does not know; else 0. What the plug-in logs of it is no warning to whoever reads along.
unsigned RefusedOptionalCommand();

}  // namespace NQORTQR20
