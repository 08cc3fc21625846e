#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "plugins/standard/event.h"
#include "plugins/standard/events.h"
#include "plugins/standard/facts.h"

namespace standard {

/// One thing that is wrong now, or a momentary fault of late. Events are named by their place in
/// the log.
struct Finding {
    ipmi::Severity severity = ipmi::Severity::kWarning;
    bool isOpen = true;  ///< else momentary
    std::string title;
    PartEvidence part;
    std::vector<std::size_t> events;  ///< in log order; none where only the sensor tells
    std::optional<std::size_t> firstCause;
    std::vector<std::string> evidence;
    std::optional<bool> stillPresent;
};

/// The findings of a node, worst first; those of one severity with the open ones first, then in the
/// order of the log. `events` are the node's, with their states.
std::vector<Finding> DeriveFindings(const NodeFacts& node, const Events& events,
                                    const DerivationTools& tools);

/// The burst that each record of the log belongs to, numbered from 0: records of a burst are within
/// 300 s of the one before; a set clock or a cleared log begins another. A record without a time
/// belongs to the burst of the record before.
std::vector<std::size_t> BurstsOf(std::span<const LoggedEvent> events);

}  // namespace standard
