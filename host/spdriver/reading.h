#pragma once

#include <cstddef>
#include <functional>

#include "host/spdriver/controller_reader.h"
#include "host/spdriver/source.h"

namespace tqrhost {

/// Called with the number of records that have come from all nodes, at every change.
using ReadingProgress = std::function<void(std::size_t records)>;

/// Reads the live nodes of a source, all at the same time, as far as is needed, before the
/// plug-ins' pass, which is answered from there. The other nodes answer each request by themselves.
/// Ends early when the collection is to stop; what has come is kept.
void ReadLiveNodes(Source& source, ReadingNeeds needs, const ReadingProgress& progress = {});

}  // namespace tqrhost
