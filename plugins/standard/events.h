#pragma once

#include <vector>

#include "plugins/standard/event.h"
#include "plugins/standard/event_text.h"
#include "plugins/standard/facts.h"
#include "plugins/standard/severity_rules.h"

namespace standard {

/// What events are derived with beside the facts of their node.
struct DerivationTools {
    const SeverityRules& rules;
    const PartLookup& parts;
    Converter convert = ConvertByRecord;
};

/// The events of a node, one per record in log order, with all that the node's facts tell of them.
/// They point into `node`, which outlives them. The sensors' present readings are not looked at:
/// SetPresentStates does that.
std::vector<Event> DeriveEvents(const NodeFacts& node, const DerivationTools& tools);

}  // namespace standard
