#pragma once

#include <span>

#include "plugins/standard/event.h"

namespace standard {

/// Sets which of a node's events, in log order and with their severities, are open, resolved and by
/// which event, or over by themselves. A fault is taken back by the opposite direction of its
/// offset, by a state of the same sensor that excludes it, by the part being replaced and by a
/// cleared log. Only what a sensor says of the same owner, LUN, number and types counts, and of the
/// same module or slot where the events name one.
void SetStates(std::span<LoggedEvent> events);

/// Takes the present readings into account of the sensors that have open events: whether what the
/// event told is still so. A state that is not is resolved, by no event; what was latched stays
/// open.
void SetPresentStates(std::span<LoggedEvent> events);

}  // namespace standard
