#include "program/store/store_report.h"

#include <algorithm>
#include <string_view>
#include <utility>

#include "program/commands/failure.h"
#include "program/reports/saved_report.h"
#include "program/reports/view.h"

namespace ipmisel {
namespace {

// The last visit says how it went; what was read says the last one that read.
constexpr std::string_view kSystems =
    "SELECT s.id, s.name, s.source, s.guid, s.manufacturer, s.product, s.serial, s.gone,"
    " v.kind, v.finished, v.problem, r.completeness FROM systems s"
    " JOIN visits v ON v.id = (SELECT MAX(l.id) FROM visits l WHERE l.system = s.id)"
    " LEFT JOIN visits r ON r.id ="
    " (SELECT MAX(l.id) FROM visits l WHERE l.system = s.id AND l.completeness <> '')";
constexpr std::string_view kOrder = " ORDER BY s.name, s.id";

/// Statements that give the properties of the instances of a class, of a system.
struct Source {
    std::string_view className, sql;
};
constexpr Source kSources[] = {
    {kControllerClass,
     "SELECT properties FROM parts WHERE system = $1 AND kind = 'firmware' AND gone IS NULL"
     " ORDER BY id"},
    {kFruClass,
     "SELECT properties FROM parts WHERE system = $1 AND kind = 'part' AND gone IS NULL"
     " ORDER BY id"},
    {kEventClass, "SELECT properties FROM events WHERE system = $1 ORDER BY position"},
    {kFindingClass,
     "SELECT properties FROM findings WHERE system = $1 AND gone IS NULL ORDER BY place, id"},
};

}  // namespace

StoreReport::StoreReport(Database& database, const std::vector<std::string>& names, bool past)
    : database_(database) {
    const std::string select =
        std::string(kSystems) + (past ? " WHERE 1 = 1" : " WHERE s.gone IS NULL");
    if (names.empty()) {
        for (const SqlRow& row : database.Query(select + std::string(kOrder))) Add(row);
        if (systems_.empty()) {
            throw Failure(kExitUsage, "the store has no system yet; collect with --store first");
        }
    }
    for (const std::string& name : names) {
        const auto rows =
            database.Query(select + " AND s.name = $1" + std::string(kOrder), SqlText(name));
        if (rows.empty()) {
            throw Failure(kExitUsage, "the store has no system " + name +
                                          "; name another with --system, or none for all");
        }
        for (const SqlRow& row : rows) Add(row);
    }
    head_.nodes = head_.systems.size();
    end_.systems = head_.systems;
    end_.recorded = Outcome{kExitCollected, "", ""};
    if (notWhole_ > 0) {
        end_.recorded = Outcome{kExitPart,
                                std::to_string(notWhole_) + " of " + std::to_string(head_.nodes) +
                                    " systems were not read whole at their last visit",
                                "collect from these again"};
    }
}

void StoreReport::Add(const SqlRow& row) {
    const std::string& name = TextOf(row.at(1));
    systems_.push_back(IntegerOf(row.at(0)));
    head_.systems.push_back({name, TextOf(row.at(2)), TextOf(row.at(3)), TextOf(row.at(4)),
                             TextOf(row.at(5)), TextOf(row.at(6))});
    const NQORTQR20::Time finished{IntegerOf(row.at(9))};
    const bool isGone = std::holds_alternative<std::int64_t>(row.at(7));
    // The whole is as old as what is oldest in it.
    if (!isGone && (head_.collected.seconds == 0 || finished.seconds < head_.collected.seconds)) {
        head_.collected = finished;
    }
    end_.completeness.push_back(ParseCompleteness(TextOf(row.at(11))));
    end_.completeness.back().source = TextOf(row.at(2));
    const std::string& kind = TextOf(row.at(8));
    const bool whole = kind == "whole" || kind == "unchanged";
    if (!whole && !isGone) ++notWhole_;
    std::string notice = name + ": as of " + NQORTQR20::TimeText(finished);
    if (isGone) {
        notice = name + ": until " + NQORTQR20::TimeText({IntegerOf(row.at(7))}) +
                 ", when another controller answered under this name";
    } else if (!whole) {
        notice += ", when it was " + std::string(kind == "part" ? "read in part" : "not read") +
                  ": " + TextOf(row.at(10));
    }
    end_.notices.push_back(std::move(notice));
}

void StoreReport::ForEach(const std::function<void(const NQORTQR20::Instance&)>& take) const {
    std::int64_t node = 0;
    for (const std::int64_t system : systems_) {
        ++node;
        for (const auto& [className, sql] : kSources) {
            for (const SqlRow& row : database_.Query(sql, system)) {
                auto instance = ParseInstance(std::string(className), TextOf(row.at(0)));
                if (instance.properties.empty()) continue;
                for (auto& [name, value] : instance.properties) {
                    if (name == "Node") value = node;  // of the visit's own report
                }
                take(instance);
            }
        }
    }
}

}  // namespace ipmisel
