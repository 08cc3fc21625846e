#include "program/reports/report_sink.h"

#include <algorithm>
#include <chrono>
#include <cstdint>
#include <limits>

#include "host/spdriver/stop.h"
#include "tqr/classes.h"

namespace ipmisel {

ReportSink::ReportSink(ReportWriter& report, const NQORTQR20::PluginSet& plugins,
                       const std::vector<std::string>& wanted, std::size_t nodes)
    : report_(report), nodes_(nodes) {
    for (const std::string& name : wanted) {
        const NQORTQR20::ClassInfo* const info = plugins.FindClass(name);
        if (info == nullptr || !info->Is(NQORTQR20::kPerLogRecord)) continue;
        Counted& counted = counted_[name];
        counted.nodeProperty = info->nodeProperty;
        counted.byNode.resize(nodes);
        ++counted.times;
    }
}

std::vector<unsigned> ReportSink::Exported() const {
    if (counted_.empty()) return {};
    std::vector<unsigned> fewest(nodes_, std::numeric_limits<unsigned>::max());
    for (const auto& [name, counted] : counted_) {
        for (std::size_t node = 0; node < nodes_; ++node) {
            fewest[node] = std::min(fewest[node], counted.byNode[node] / counted.times);
        }
    }
    return fewest;
}

void ReportSink::Check() const {
    if (failure_) throw Failure(*failure_);
}

bool OutputIsOver() {
    constexpr auto kTimeToExport = std::chrono::milliseconds(500);
    return NQORTQR20::StoppedFor(kTimeToExport);
}

bool ReportSink::OpenInstance(std::string_view className) {
    return !IsOver() && InstanceSink::OpenInstance(className);
}

bool ReportSink::Take(const NQORTQR20::Instance& instance) {
    if (IsOver()) return false;
    try {
        report_.Add(instance);
    } catch (const Failure& failure) {
        failure_ = failure;
        return false;
    }
    if (const auto counted = counted_.find(instance.className); counted != counted_.end()) {
        const auto node = NodeOf(instance, counted->second.nodeProperty);
        const auto index = static_cast<std::size_t>(node.value_or(0) - 1);
        if (index < nodes_) ++counted->second.byNode[index];
    }
    return true;
}

}  // namespace ipmisel
