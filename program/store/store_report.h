#pragma once

#include <cstdint>
#include <functional>
#include <string>
#include <vector>

#include "program/reports/report.h"
#include "program/store/database.h"

namespace ipmisel {

/// What a store holds of some systems as a report: their parts and what is wrong with them as of
/// their last visits, and every event that was ever in a log. A node is a system. Operations throw
/// Failure.
class StoreReport {
public:
    /// `names` are the systems that are meant, all when there are none; `past` are meant too those
    /// in whose place another controller answers now.
    StoreReport(Database& database, const std::vector<std::string>& names, bool past);

    const ReportHead& Head() const { return head_; }
    const ReportEnd& End() const { return end_; }
    /// System by system, as their names and visits follow each other.
    void ForEach(const std::function<void(const NQORTQR20::Instance&)>& take) const;

private:
    void Add(const SqlRow& row);

    Database& database_;
    ReportHead head_;
    ReportEnd end_;
    std::vector<std::int64_t> systems_;  ///< by node
    std::size_t notWhole_ = 0;
};

}  // namespace ipmisel
