#pragma once

#include <span>

#include "plugins/standard/event.h"
#include "plugins/standard/facts.h"

namespace standard {

/// Sets the times of a node's events, in log order. A record's time is less the controller's UTC
/// offset where that is known. Where the clock was set is seen by the pair of records around it or
/// by a time before the record before; the corrected time, less what the controller's clock is off
/// now, stands for the records after the last such place, when it is off by more than is uncertain.
void SetTimes(const NodeFacts& node, std::span<LoggedEvent> events);

}  // namespace standard
