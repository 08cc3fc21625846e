#pragma once

#include <span>
#include <string>
#include <string_view>
#include <vector>

namespace ipmisel {

struct ClassInfo {
    std::string_view name;
    std::string_view description;
    /// Function of the plug-in that writes the class; null for those that a pass collects.
    const char* exporter;
};

/// The output classes, in the order in which a collection without --class takes them. Those with
/// an exporter are outside that default set.
std::span<const ClassInfo> KnownClasses();
std::vector<std::string> DefaultClasses();

}  // namespace ipmisel
