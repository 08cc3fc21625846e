#pragma once

#include <cstddef>
#include <cstdint>
#include <map>
#include <span>
#include <string>
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
/// What an event can be told from its record alone, words and part among it, is made anew each
/// time it is looked at: the longest log would take many times its size otherwise. `node` and what
/// `tools` refer to are borrowed for the life of the object.
class Events {
public:
    /// The sensors' present readings are not looked at: SetPresentStates does that.
    Events(const NodeFacts& node, DerivationTools tools);

    std::size_t size() const { return logged_.size(); }
    std::span<LoggedEvent> Logged() { return logged_; }
    std::span<const LoggedEvent> Logged() const { return logged_; }

    Event operator[](std::size_t place) const;
    // Of the same event, one thing alone.
    std::string KeyOf(std::size_t place) const;
    std::string TextOf(std::size_t place) const;
    PartEvidence PartOf(std::size_t place) const;

private:
    Event WithData(const LoggedEvent& logged) const;
    Event WithText(std::size_t place) const;
    PartEvidence PartOf(const Event& event) const;

    DerivationTools tools_;
    std::map<ipmi::SensorKey, const SensorFacts*> sensors_;
    std::vector<std::uint8_t> identity_;
    std::vector<LoggedEvent> logged_;
    std::map<std::size_t, std::string> panicTexts_;
};

}  // namespace standard
