#include <cmath>
#include <iterator>
#include <string>

#include "base/text.h"
#include "ipmi/timestamp.h"
#include "plugins/standard/classes.h"

namespace standard {
namespace {

using enum NQORTQR20::fdrPropertyType;

constexpr const char* kName = "IPMI_EventLog";

constexpr NQORTQR20::fdrPropertyInfo kProperties[] = {
    {"Node", kInteger, "number of the node, from 1"},
    {"Version", kText, "of the event log"},
    {"Records", kInteger, "how many records the controller announces"},
    {"FreeBytes", kInteger, "free space; 65535 is that many or more"},
    {"UsedPercent", kReal, "fill level, where free space is known"},
    {"LastAddition", kTime, "when a record was last added"},
    {"LastErase", kTime, "when the log was last cleared or a record deleted"},
    {"Overflow", kBoolean, "whether events were dropped for lack of space"},
    {"Allocation", kText, "unit size, units, free units and largest free block"},
};

/// A time stamp of the log in UTC; empty when it tells no time of day.
std::optional<std::int64_t> TimeOf(std::uint32_t stamp, const Clock& clock) {
    if (ipmi::KindOfTime(stamp) != ipmi::TimeKind::kClock) return std::nullopt;
    return std::int64_t{stamp} - std::int64_t{60} * clock.utcOffsetMinutes.value_or(0);
}

std::optional<double> UsedPercent(const ipmi::SelInfo& info) {
    if (info.freeBytes == ipmi::kMaxFreeBytes) return std::nullopt;
    const double used = static_cast<double>(info.records) * ipmi::kSelRecordSize;
    if (used + info.freeBytes == 0) return std::nullopt;
    return std::round(used / (used + info.freeBytes) * 1000) / 10;
}

std::string AllocationText(const ipmi::SelAllocation& allocation) {
    std::string text;
    if (allocation.unitSize != 0)
        text += ipmisel::Format("unit size %u bytes; ", allocation.unitSize);
    if (allocation.units != 0) text += ipmisel::Format("units %u; ", allocation.units);
    return text + ipmisel::Format("free units %u; largest free block %u units",
                                  allocation.freeUnits, allocation.largestFreeBlock);
}

/// Nothing is written when the controller tells nothing of its log.
void Write(NodePass& pass, Output& output) {
    Node& node = pass.node();
    const auto& info = node.LogInfo();
    if (!info) return;
    if (!output.Begin(kName)) return;
    output.Integer("Node", node.number());
    output.Text("Version", ipmisel::Format("%d.%d", info->version & 0x0F, info->version >> 4));
    output.Integer("Records", info->records);
    output.Integer("FreeBytes", info->freeBytes);
    output.Real("UsedPercent", UsedPercent(*info));
    output.Time("LastAddition", TimeOf(info->lastAddition, node.GetClock()));
    output.Time("LastErase", TimeOf(info->lastErase, node.GetClock()));
    output.Boolean("Overflow", info->overflow);
    if (const auto& allocation = node.LogAllocation()) {
        output.Text("Allocation", AllocationText(*allocation));
    }
    output.End();
}

}  // namespace

const ClassEntry kEventLogClass{
    {kName, "the event log as a whole: records, free space, overflow", NQORTQR20::kByDefault,
     "Node", nullptr, kProperties, std::size(kProperties)},
    Write};

}  // namespace standard
