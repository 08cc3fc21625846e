#include "plugins/ipmisel/export/event_message.h"

#include <string_view>

namespace ipmisel {
namespace {

bool Contains(std::string_view text, std::string_view part) {
    return text.find(part) != std::string_view::npos;
}

}  // namespace

std::string Compose(EventMessage parts) {
    constexpr std::string_view kUnknown = "Unknown";
    // A memory event names its module in the event text; the instance is that of the whole memory.
    if (Contains(parts.sensorType, "Memory")) parts.entityInstance.clear();
    if (Contains(parts.sensorType, "Power Supply") && Contains(parts.sensorInformation, "VRM")) {
        parts.sensorType = "Voltage Regulator Module";
    }
    if (Contains(parts.sensorInformation, "HSDC")) {
        parts.entity = "HS IO Expansion";
    } else if (Contains(parts.entity, kUnknown) || Contains(parts.entity, "Cannot")) {
        parts.entity = parts.sensorInformation;
    }
    // Compatibility: only the word goes, the blank beside it stays
    // (EventMessage.RewritesSomeNames).
    if (const auto at = parts.sensorType.find(kUnknown); at != std::string::npos) {
        parts.sensorType.erase(at, kUnknown.size());
    }
    return parts.entity + " " + parts.entityInstance + " (" + parts.sensorType + " - " +
           parts.sensorInformation + "): " + (parts.deassertion ? "Deassertion: " : "Assertion: ") +
           parts.event;
}

}  // namespace ipmisel
