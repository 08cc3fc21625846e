#pragma once

#include <span>

#include "plugins/standard/event.h"
#include "plugins/standard/facts.h"
#include "plugins/standard/severity_rules.h"

namespace standard {

/// Sets the severity of an event and where it comes from: the user's rules, else the first of the
/// controller's own event filters that matches, else the table of severities.
void SetSeverity(std::span<const ipmi::EventFilter> filters, const SeverityRules& rules,
                 LoggedEvent* event);

}  // namespace standard
