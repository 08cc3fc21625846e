#include "plugins/standard/classes.h"

#include <algorithm>
#include <array>

namespace standard {

namespace {

// In the order in which they are collected.
const std::array kClasses{&kControllerClass, &kEventLogClass, &kSensorClass,
                          &kFruClass,        &kEventClass,    &kFindingClass};

const auto kInfos = [] {
    std::array<NQORTQR20::fdrClassInfo, kClasses.size()> infos{};
    std::ranges::transform(kClasses, infos.begin(),
                           [](const ClassEntry* entry) { return entry->info; });
    return infos;
}();

}  // namespace

const ClassEntry* FindClass(std::string_view name) {
    const auto* const found = std::ranges::find_if(
        kClasses, [&](const ClassEntry* entry) { return entry->info.name == name; });
    return found == kClasses.end() ? nullptr : *found;
}

}  // namespace standard

const NQORTQR20::fdrClassTable fdrPluginClasses{
    .size = sizeof(NQORTQR20::fdrClassTable),
    .classInfoSize = sizeof(NQORTQR20::fdrClassInfo),
    .classes = standard::kInfos.data(),
    .classCount = standard::kInfos.size(),
    .neededFiles = nullptr,
    .neededFileCount = 0,
};
