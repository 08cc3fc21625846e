#pragma once

#include <cstddef>
#include <functional>
#include <optional>
#include <string_view>
#include <vector>

#include "host/spdriver/known_controller.h"
#include "host/spdriver/source.h"

namespace NQORTQR20 {

/// What of a controller is to be read.
struct ReadingNeeds {
    bool log = true;
    bool sensors = true;
    bool guid = false;
    bool every = false;  ///< also the nodes that answer each request by themselves
};

/// How far the reading is.
struct ReadingState {
    std::string_view what;  ///< "event log", "sensor repository", "sensor readings", "inventory"
    std::string_view unit;  ///< of the counts: "records", "sensors", "devices"
    std::size_t read = 0;
    std::optional<std::size_t> announced{};  ///< empty when that is not known
};
inline constexpr ReadingState kEventLogReading{"event log", "records"};
inline constexpr ReadingState kSensorReading{"sensor repository", "records"};
using ReadingProgress = std::function<void(const ReadingState& state)>;

/// Reads the live nodes of a source, all at the same time, as far as is needed, before the
/// plug-ins' pass, which is answered from there. The other nodes answer each request by themselves.
/// Ends early when the collection is to stop; what has come is kept. `progress` is called with the
/// counts of all nodes together whenever records have come. `known`, by node, is what need not be
/// read again; empty when nothing is known. How it went, by node.
std::vector<NodeReading> ReadLiveNodes(Source& source, ReadingNeeds needs,
                                       const ReadingProgress& progress = {},
                                       std::vector<std::optional<KnownController>> known = {});

/// Calls `progress` after each read of the pass over the open machine, with the counts of the node
/// that was read; until it is called with nothing.
void ObserveReading(ReadingProgress progress);

}  // namespace NQORTQR20
