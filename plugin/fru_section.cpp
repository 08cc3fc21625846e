#include <cstdint>

#include "base/log.h"
#include "plugin/sections.h"
#include "plugin/state.h"

namespace ipmisel {
namespace {

constexpr std::int64_t kKeptSeconds = 600;

/// Whether this node's inventory is to be collected now. It is kept for a while, because reading it
/// is slow and it seldom changes.
bool IsDue(const Node& node) {
    const auto now = static_cast<std::uint32_t>(Module().clock(nullptr));
    if (std::int64_t{now} - Module().fCurrentTime > kKeptSeconds) {
        Module().fCurrentTime = now;
        Module().ipmifruonce = false;
        WriteLog(kInfo, "Resetting ipmifruonce.");
    }
    if (Module().ipmifruonce) return false;
    if (node.number == node.count - 1) {
        Module().ipmifruonce = true;
        WriteLog(kInfo, "Setting ipmifruonce.");
    }
    return true;
}

}  // namespace

void CollectFru(Node& node) {
    if (ReachedOverLan() || !IsDue(node)) return;
    WriteLog(kInfo, "Getting VPD records.");
}

}  // namespace ipmisel
