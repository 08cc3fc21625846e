#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "plugins/standard/event.h"

namespace standard {

/// The user's own severities: docs/severity-rules.md has the format.
class SeverityRules {
public:
    struct Rule {
        std::optional<ipmi::Severity> severity;  ///< none: the event gets no severity
        // Every condition that is given must hold.
        bool deasserted = false;
        std::optional<std::uint8_t> owner, sensorNumber, sensorType, eventType, offset;
        std::optional<std::string> sensorName;
    };
    struct Problem {
        std::size_t line = 0;  ///< from 1
        std::string text;      ///< what is wrong with it, without a final full stop
        bool operator==(const Problem&) const = default;
    };

    /// From the text of a file; the first problem where there is one.
    static std::optional<Problem> Parse(std::string_view text, SeverityRules* rules);

    /// The first rule that matches a sensor event; null when none does.
    const Rule* Match(const LoggedEvent& event) const;
    bool empty() const { return rules_.empty(); }

private:
    std::vector<Rule> rules_;
};

}  // namespace standard
