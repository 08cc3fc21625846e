#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <vector>

#include "host/core/sink.h"
#include "host/spdriver/known_controller.h"
#include "program/store/database.h"

// What was collected, kept for ever: docs/store.md. Times are seconds since 1970-01-01 UTC by the
// collector's clock, unless they are an event's own.

namespace ipmisel {

/// An instance of IPMI_Event as the store keeps it.
struct VisitEvent {
    std::string key;
    std::int64_t recordId = 0;
    std::optional<std::int64_t> time;  ///< by the controller's clock
    std::string severity, state;       ///< empty: none
    std::string sensor, part, sentence;
    std::string raw;         ///< 32 hexadecimal digits
    std::string properties;  ///< all of them, a JSON object
    std::string digest;      ///< equal for properties that say the same
};

/// A part, or the firmware of the controller.
struct VisitPart {
    std::string kind;  ///< "part", "module" or "firmware"
    std::string slot;
    std::string manufacturer, product, partNumber, serial, version;
    std::string properties;
};

struct VisitFinding {
    std::string key;  ///< of its first event, else made of what it says
    std::string severity, state, title, part, partNumber, serial;
    std::optional<std::int64_t> firstTime, lastTime;
    std::int64_t count = 0;
    std::vector<std::string> events;  ///< keys
    std::string properties;
};

/// One controller, once.
struct Visit {
    std::string name, source;
    std::string guid, manufacturer, product, serial;
    std::int64_t started = 0, finished = 0;
    bool complete = false;
    /// FRU devices and the controller's own facts were read without a fault.
    bool identityRead = true, partsRead = true;
    std::string problem;       ///< what is missing, in one line
    std::string completeness;  ///< a JSON object
    std::vector<VisitEvent> events;
    std::vector<VisitPart> parts;
    std::vector<VisitFinding> findings;
    std::optional<NQORTQR20::KnownController> known;  ///< for the next visit

    /// What the keys of its events are made of.
    const std::string& Identity() const { return guid.empty() ? serial : guid; }
};

/// What the store has of the controller that stands under a name.
struct StoredSystem {
    std::int64_t id = 0;
    std::int64_t revision = 0;  ///< counts the visits that were stored
    std::string guid, manufacturer, product, serial;
    std::optional<std::int64_t> logRead;              ///< when its log was last read whole
    std::optional<NQORTQR20::KnownController> known;  ///< of that visit
};

/// A finding that is open, or a momentary one that is still shown.
struct StoredFinding {
    std::string system, key, severity, state, title, part, partNumber, serial;
    std::optional<std::int64_t> firstTime, lastTime;
    std::int64_t count = 0;
    std::int64_t firstSeen = 0;
    bool acknowledged = false;
    std::string note;        ///< of the acknowledgement
    std::string properties;  ///< of IPMI_Finding, a JSON object
};

/// When a system was last visited, and how that went.
struct StoredVisit {
    std::int64_t id = 0;
    std::string system, kind;  ///< "whole", "part", "unchanged" or "failed"
    std::int64_t started = 0, finished = 0;
    bool complete = false;
    std::string problem;
};

/// What stood in a system at a visit.
struct StoredState {
    std::vector<VisitPart> parts;
    std::vector<StoredFinding> findings;  ///< as they were last
};

/// Systems, parts, events, findings and visits in a database. Every operation throws Failure.
class Store {
public:
    /// `sqlite:FILE` or `postgresql://...`; the tables are made or brought up to date.
    explicit Store(const std::string& uri, IfMissing ifMissing = IfMissing::kMake);

    /// The controller that last answered under a name; empty when the name is new.
    std::optional<StoredSystem> Find(const std::string& name);
    /// The keys of all events that were ever stored under a name.
    std::set<std::string> KeysOf(const std::string& name);

    /// Stores a visit in one transaction. `before` is what Find gave when the visit began. What is
    /// to be told of it (log cleared, another controller, a GUID claimed twice) is returned, a line
    /// each without the name.
    std::vector<std::string> Add(const Visit& visit, const std::optional<StoredSystem>& before);
    /// Stores that a controller was found as it was.
    void AddUnchanged(const StoredSystem& system, std::int64_t started, std::int64_t finished);
    /// Stores that a controller could not be visited; one that never was is a system without an
    /// identity until it is.
    void AddFailed(const std::string& name, std::int64_t started, std::int64_t finished,
                   const std::string& problem);

    /// The open findings of these systems, of all when none is named, in the order of the reports:
    /// system by system, the worst first.
    std::vector<StoredFinding> OpenFindings(const std::vector<std::string>& names);
    /// The last visit of each of these systems, of all when none is named, by their names.
    std::vector<StoredVisit> LastVisits(const std::vector<std::string>& names);
    /// Takes the open findings of these systems, of all when none is named, that have this key, or
    /// an event of this key, out of what is still to be looked at, until they come anew: with a
    /// further event, or worse. The number of them.
    std::size_t Acknowledge(const std::string& key, const std::vector<std::string>& names,
                            const std::string& who, const std::string& note, std::int64_t now);

    /// The number of a system's last visit at a time or before it; empty when there is none.
    std::optional<std::int64_t> VisitAt(const std::string& name, std::int64_t time);
    /// What was known when a visit had been stored; empty when there is none of that number.
    std::optional<StoredState> StateAt(std::int64_t visit);

    Database& database() const { return *database_; }

private:
    std::unique_ptr<Database> database_;
};

}  // namespace ipmisel
