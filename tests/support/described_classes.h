#pragma once

#include <span>
#include <vector>

#include "tqr/classes.h"

namespace ipmiseltest {

/// The classes that the plug-in which is linked in collects by default.
inline std::vector<const char*> DefaultClasses() {
    std::vector<const char*> names;
    for (const auto& info : std::span(fdrPluginClasses.classes, fdrPluginClasses.classCount)) {
        if ((info.marks & NQORTQR20::kByDefault) != 0) names.push_back(info.name);
    }
    return names;
}

}  // namespace ipmiseltest
