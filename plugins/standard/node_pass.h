#pragma once

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "plugins/standard/events.h"
#include "plugins/standard/facts.h"
#include "plugins/standard/finding.h"
#include "plugins/standard/node.h"

namespace standard {

/// A node in one pass: what is read of it, and what is derived from that, each made when a class
/// first wants it.
class NodePass {
public:
    NodePass(unsigned number, std::string systemName, NQORTQR20::SPLibrary& library,
             const SeverityRules& rules);
    NodePass(const NodePass&) = delete;
    NodePass& operator=(const NodePass&) = delete;

    Node& node() { return node_; }
    /// The events, with the present readings of the sensors that have open ones.
    const std::vector<Event>& Events();
    /// From the events and the present readings of all sensors.
    const std::vector<Finding>& Findings();

private:
    DerivationTools Tools();
    void ReadSensorOf(SensorFacts* facts);

    Node node_;
    std::string systemName_;
    const SeverityRules& rules_;
    std::unique_ptr<PartLookup> parts_;
    NodeFacts facts_;
    std::optional<std::vector<Event>> events_;  // point into facts_
    std::optional<std::vector<Finding>> findings_;
};

}  // namespace standard
