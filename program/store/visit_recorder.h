#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "host/spdriver/known_controller.h"
#include "program/reports/report.h"
#include "program/store/store.h"

namespace ipmisel {

/// The classes that a store is fed from; they are collected for it whatever else is wanted.
std::vector<std::string> StoredClasses();

/// Gathers what a store keeps of the instances of a collection on their way to a report, which gets
/// those of its own classes.
class VisitRecorder : public ReportWriter {
public:
    /// `reported` are the report's classes; of the events it gets those whose key is not in
    /// `withheld`. `report` outlives the object.
    VisitRecorder(ReportWriter& report, std::size_t nodes, std::vector<std::string> reported,
                  std::set<std::string> withheld);
    void Add(const NQORTQR20::Instance& instance) override;
    void Finish(const ReportEnd& end) override { report_.Finish(end); }
    /// By node; what the instances told of it.
    std::vector<Visit>& Visits() { return visits_; }

private:
    void Record(const NQORTQR20::Instance& instance, Visit* visit);

    ReportWriter& report_;
    std::vector<std::string> reported_;
    std::set<std::string> withheld_;
    std::vector<Visit> visits_;
};

/// A collection whose systems are visited for a store: what is known of them before, what is
/// stored of them after. Nothing is held open between the two.
class StoredCollection {
public:
    /// Opens the store for a moment, so that one that cannot be used is told at once. `onlyNew`:
    /// what is known need not be read again, and is not reported again.
    StoredCollection(std::string uri, bool onlyNew);

    /// Looks up the systems, one per node.
    void Begin(const std::vector<SystemInfo>& systems);
    /// By node, for the reading; empty when all is to be read.
    std::vector<std::optional<NQORTQR20::KnownController>> Known() const;
    /// Every controller was found as it was: there is nothing to collect.
    static bool Unchanged(const std::vector<NQORTQR20::NodeReading>& readings);
    /// Notices of what was found unchanged, and when it had been read.
    std::vector<std::string> NoticesOfUnchanged() const;
    /// The report with the recorder before it.
    ReportWriter& Record(ReportWriter& report, std::vector<std::string> reported);

    /// Stores what was recorded, a transaction per system, and says what there is to tell.
    void Finish(const ReportEnd& end, std::vector<NQORTQR20::NodeReading> readings);
    /// Stores that the systems of these names could not be visited, and why.
    void Fail(const std::vector<std::string>& names, const std::string& problem);

private:
    std::string uri_;
    bool onlyNew_;
    std::int64_t started_;
    std::vector<std::string> names_;  ///< by node, each once
    std::vector<std::string> sources_;
    std::vector<std::optional<StoredSystem>> before_;
    std::unique_ptr<VisitRecorder> recorder_;
};

}  // namespace ipmisel
