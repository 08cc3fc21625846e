#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "program/reports/json_text.h"
#include "program/reports/report.h"
#include "program/reports/view.h"

namespace ipmisel {

/// The systems of a report, one per node: their names from the start, the rest from the controllers
/// that come by.
class Systems {
public:
    explicit Systems(const ReportHead& head);
    void Add(const Controller& controller);
    /// By node, from 1. A system of no known node has no name.
    const SystemInfo& Of(Integer node) const;
    const std::vector<SystemInfo>& All() const { return systems_; }
    /// What tells a node from the others: its name, "node 2" where another has the same name; empty
    /// when there is only one.
    std::string LabelOf(Integer node) const;
    /// The name, with the node's number behind it where another has the same.
    std::string UniqueNameOf(Integer node) const;
    /// `systems` of a report.
    Json AsJson() const;

private:
    std::vector<SystemInfo> systems_;  ///< at least one
    std::size_t known_;
};

}  // namespace ipmisel
