#include "program/store/store.h"

#include <algorithm>
#include <iterator>
#include <map>
#include <span>
#include <utility>

#include "base/hex.h"
#include "base/text.h"
#include "ipmi/sel_info.h"
#include "program/reports/saved_report.h"
#include "program/reports/severity.h"
#include "program/reports/view.h"

namespace ipmisel {
namespace {

using NQORTQR20::KnownController;

SqlValue OrNull(const std::optional<std::int64_t>& number) {
    return number ? SqlValue(*number) : SqlValue();
}
SqlValue OrNull(const std::string& text) {
    return text.empty() ? SqlValue() : SqlValue(SqlText(text));
}
std::optional<std::int64_t> MaybeInteger(const SqlValue& value) {
    const auto* const number = std::get_if<std::int64_t>(&value);
    return number == nullptr ? std::nullopt : std::optional(*number);
}

std::string TimeOr(const std::optional<std::int64_t>& seconds, const std::string& otherwise) {
    return seconds ? NQORTQR20::TimeText({*seconds}) : otherwise;
}

std::string Counted(std::size_t count, const std::string& noun) {
    return std::to_string(count) + " " + noun + (count == 1 ? "" : "s");
}

std::string RecordsText(const std::vector<std::vector<std::uint8_t>>& records) {
    std::string text;
    for (const auto& record : records) text += (text.empty() ? "" : " ") + HexText(record);
    return text;
}

/// What a text of RecordsText was made of; empty when it is none.
std::optional<std::vector<std::vector<std::uint8_t>>> ParseRecords(std::string_view text) {
    std::vector<std::vector<std::uint8_t>> records;
    while (!text.empty()) {
        const std::size_t end = std::min(text.find(' '), text.size());
        auto record = ParseHex(text.substr(0, end));
        if (!record) return std::nullopt;
        records.push_back(*std::move(record));
        text.remove_prefix(std::min(end + 1, text.size()));
    }
    return records;
}

std::optional<ipmi::SelInfo> LogInfoOf(const std::optional<KnownController>& known) {
    if (!known || known->logInfo.empty()) return std::nullopt;
    return ipmi::ParseSelInfo(std::span(known->logInfo).subspan(1));
}

// --- One visit --------------------------------------------------------------------------------

/// What is written of a visit, within one transaction.
class VisitWriter {
public:
    VisitWriter(Database& database, const Visit& visit, const std::optional<StoredSystem>& before)
        : db_(database), visit_(visit), before_(before) {}

    /// The lines to tell.
    std::vector<std::string> Write() {
        if (!HasIdentity()) {
            Tell("it did not say who it is this time; nothing is stored of this visit");
            return std::move(lines_);
        }
        WriteSystem();
        ReadStoredEvents();
        PlanEvents();
        WriteVisit();
        WriteEvents();
        if (!stale_) {
            WriteFindings();
            WriteParts();
        }
        WriteLogState();
        RetireOthers();
        TellOfGuid();
        return std::move(lines_);
    }

private:
    struct Stored {
        std::int64_t position;
        bool gone;
        std::string digest;
        std::int64_t recordId;
    };
    struct Planned {
        const VisitEvent* event;
        const Stored* stored;  ///< null for a new one
        std::int64_t position;
    };

    void Tell(const std::string& text) { lines_.push_back(text); }

    /// Without its GUID a controller would be taken for another one, and its events for others.
    bool HasIdentity() const {
        if (!visit_.guid.empty()) return true;
        if (!visit_.identityRead) return false;
        const bool serialKnown = before_ && before_->guid.empty() && !before_->serial.empty();
        return !visit_.serial.empty() || visit_.partsRead || !serialKnown;
    }

    void WriteSystem() {
        // It could not be visited until now, and says now who it is.
        db_.Query(
            "UPDATE systems SET identity = $2, guid = $3 WHERE name = $1 AND identity = ''"
            " AND revision = 0 AND NOT EXISTS"
            " (SELECT 1 FROM systems o WHERE o.name = $1 AND o.identity = $2)",
            SqlText(visit_.name), SqlText(visit_.Identity()), SqlText(visit_.guid));
        const auto rows = db_.Query(
            "INSERT INTO systems (name, identity, guid, manufacturer, product, serial, source,"
            " first_seen, last_seen, revision) VALUES ($1, $2, $3, $4, $5, $6, $7, $8, $8, 0)"
            " ON CONFLICT (name, identity) DO UPDATE SET source = excluded.source,"
            " last_seen = CASE WHEN excluded.last_seen > systems.last_seen"
            "  THEN excluded.last_seen ELSE systems.last_seen END,"
            " manufacturer = CASE WHEN excluded.manufacturer = ''"
            "  THEN systems.manufacturer ELSE excluded.manufacturer END,"
            " product = CASE WHEN excluded.product = '' THEN systems.product"
            "  ELSE excluded.product END,"
            " serial = CASE WHEN excluded.serial = '' THEN systems.serial ELSE excluded.serial END"
            " RETURNING id, revision, log_read, gone",
            SqlText(visit_.name), SqlText(visit_.Identity()), SqlText(visit_.guid),
            SqlText(visit_.manufacturer), SqlText(visit_.product), SqlText(visit_.serial),
            SqlText(visit_.source), visit_.finished);
        system_ = IntegerOf(rows.at(0).at(0));
        const std::int64_t revision = IntegerOf(rows[0].at(1));
        logRead_ = MaybeInteger(rows[0].at(2));
        isNewHere_ = revision == 0 || MaybeInteger(rows[0].at(3));
        // Somebody else has stored a visit since this one began: which of them saw the later log
        // is not known. What this one saw is added, and nothing of the other's is taken back.
        if (before_ && before_->id == system_) {
            stale_ = before_->revision != revision;
        } else {
            stale_ = before_ ? logRead_.value_or(0) > visit_.started : revision != 0;
        }
    }

    void ReadStoredEvents() {
        for (const SqlRow& row : db_.Query("SELECT key, position, gone, digest, record_id"
                                           " FROM events WHERE system = $1 ORDER BY position",
                                           system_)) {
            const bool gone = MaybeInteger(row.at(2)).has_value();
            const std::string& key = TextOf(row.at(0));
            stored_[key] = {IntegerOf(row.at(1)), gone, TextOf(row.at(3)), IntegerOf(row.at(4))};
            if (!gone) present_.push_back(key);
            lastPosition_ = std::max(lastPosition_, IntegerOf(row.at(1)));
        }
    }

    void PlanEvents() {
        std::set<std::string_view> seen;
        std::int64_t before = 0;  // positions rise in the order of the log
        for (const VisitEvent& event : visit_.events) {
            if (!seen.insert(event.key).second) continue;
            const auto found = stored_.find(event.key);
            const Stored* const stored = found == stored_.end() ? nullptr : &found->second;
            std::int64_t position = stored == nullptr ? 0 : stored->position;
            if (stored == nullptr || stored->gone || position <= before) {
                position = ++lastPosition_;
            }
            before = position;
            if (stored == nullptr) ++new_;
            if (stored != nullptr && stored->gone) ++back_;
            planned_.push_back({&event, stored, position});
        }
        if (!visit_.complete || stale_) return;
        for (const std::string& key : present_) {
            if (!seen.contains(key)) gone_.push_back(key);
        }
    }

    /// What became of the log since the last whole visit, in words for the store and in lines.
    std::string LogChange() {
        std::vector<std::string> words;
        if (!logRead_) {
            words.emplace_back("first");
        } else if (new_ > 0) {
            words.emplace_back("grown");
        }
        const std::string since = " since " + TimeOr(logRead_, "the last visit");
        if (!gone_.empty()) {
            const auto before = LogInfoOf(before_ ? before_->known : std::nullopt);
            const auto now = LogInfoOf(visit_.known);
            const bool erased = before && now && before->lastErase != now->lastErase;
            const bool oldest = std::equal(gone_.begin(), gone_.end(), present_.begin());
            const std::string count = Counted(gone_.size(), "record");
            const std::string kept =
                gone_.size() == 1 ? "; the store keeps it" : "; the store keeps them";
            if (gone_.size() == present_.size() && (erased || planned_.empty())) {
                words.emplace_back("cleared");
                Tell("the event log was cleared" + since + "; of its records the store keeps " +
                     std::to_string(gone_.size()));
            } else if (oldest && !erased) {
                words.emplace_back("wrapped");
                Tell("the event log has wrapped" + since + ": " + count +
                     " overwritten by newer ones" + kept);
            } else {
                words.emplace_back("erased");
                Tell("the event log was erased in part" + since + ": " + count + " taken out" +
                     kept);
            }
        }
        if (back_ > 0) {
            words.emplace_back("back");
            Tell(Counted(back_, "record") + " that had left the event log stand" +
                 (back_ == 1 ? "s" : "") + " in it again");
        }
        if (const std::size_t reused = ReusedIds(); reused > 0) {
            words.emplace_back("IDs used again");
            Tell(Counted(reused, "record ID") + (reused == 1 ? " has" : " have") +
                 " been used again for other events");
        }
        if (const VisitEvent* const event = FirstAfterClockSetBack()) {
            words.emplace_back("clock set back");
            Tell("the controller's clock was set back: record " +
                 Format("%04x", static_cast<unsigned>(event->recordId)) + " of " +
                 TimeOr(event->time, "") + " follows a later one");
        }
        std::string text;
        for (const std::string& word : words) text += (text.empty() ? "" : ", ") + word;
        return text;
    }

    std::size_t ReusedIds() const {
        std::set<std::int64_t> ids;
        for (const auto& [key, stored] : stored_) ids.insert(stored.recordId);
        return static_cast<std::size_t>(
            std::count_if(planned_.begin(), planned_.end(), [&](const Planned& each) {
                return each.stored == nullptr && ids.contains(each.event->recordId);
            }));
    }

    /// Of the new ones; events of one minute may come in any order.
    const VisitEvent* FirstAfterClockSetBack() const {
        constexpr std::int64_t kJitter = 60;
        std::optional<std::int64_t> latest;
        for (const Planned& each : planned_) {
            const auto& time = each.event->time;
            if (!time) continue;
            if (each.stored == nullptr && latest && *time + kJitter < *latest) return each.event;
            latest = time;
        }
        return nullptr;
    }

    void WriteVisit() {
        const std::string kind = visit_.complete ? "whole" : "part";
        const auto rows = db_.Query(
            "INSERT INTO visits (system, kind, started, finished, times, complete, problem, events,"
            " new_events, gone_events, log_change, completeness)"
            " VALUES ($1, $2, $3, $4, 1, $5, $6, $7, $8, $9, $10, $11) RETURNING id",
            system_, kind, visit_.started, visit_.finished, std::int64_t{visit_.complete ? 1 : 0},
            SqlText(visit_.problem), static_cast<std::int64_t>(planned_.size()),
            static_cast<std::int64_t>(new_), static_cast<std::int64_t>(gone_.size()), LogChange(),
            SqlText(visit_.completeness));
        visitId_ = IntegerOf(rows.at(0).at(0));
    }

    void WriteEvents() {
        for (const auto& [event, stored, position] : planned_) {
            if (stored == nullptr) {
                db_.Query(
                    "INSERT INTO events (system, key, record_id, time, severity, state, sensor,"
                    " part, sentence, raw, properties, digest, position, first_visit, first_seen)"
                    " VALUES ($1, $2, $3, $4, $5, $6, $7, $8, $9, $10, $11, $12, $13, $14, $15)",
                    system_, SqlText(event->key), event->recordId, OrNull(event->time),
                    OrNull(event->severity), OrNull(event->state), SqlText(event->sensor),
                    SqlText(event->part), SqlText(event->sentence), SqlText(event->raw),
                    SqlText(event->properties), event->digest, position, visitId_, visit_.finished);
                continue;
            }
            const bool same = stored->digest == event->digest && stored->position == position;
            if (stale_ || (same && !stored->gone)) continue;
            db_.Query(
                "UPDATE events SET time = $3, severity = $4, state = $5, sensor = $6, part = $7,"
                " sentence = $8, properties = $9, digest = $10, position = $11,"
                " left_after = NULL, gone = NULL, gone_visit = NULL"
                " WHERE system = $1 AND key = $2",
                system_, SqlText(event->key), OrNull(event->time), OrNull(event->severity),
                OrNull(event->state), SqlText(event->sensor), SqlText(event->part),
                SqlText(event->sentence), SqlText(event->properties), event->digest, position);
        }
        for (const std::string& key : gone_) {
            db_.Query(
                "UPDATE events SET left_after = $3, gone = $4, gone_visit = $5"
                " WHERE system = $1 AND key = $2",
                system_, key, OrNull(logRead_), visit_.finished, visitId_);
        }
    }

    void WriteFindings() {
        struct Open {
            std::int64_t id;
            std::string key, severity, firstEvent, lastEvent;
            bool acknowledged, matched;
        };
        std::vector<Open> open;
        for (const SqlRow& row :
             db_.Query("SELECT id, key, severity, first_event, last_event, acknowledged"
                       " FROM findings WHERE system = $1 AND gone IS NULL ORDER BY id",
                       system_)) {
            open.push_back({IntegerOf(row.at(0)), TextOf(row.at(1)), TextOf(row.at(2)),
                            TextOf(row.at(3)), TextOf(row.at(4)),
                            MaybeInteger(row.at(5)).has_value(), false});
        }
        std::int64_t place = 0;
        for (const VisitFinding& finding : visit_.findings) {
            const auto has = [&](const std::string& event) {
                return std::find(finding.events.begin(), finding.events.end(), event) !=
                       finding.events.end();
            };
            const auto found = std::find_if(open.begin(), open.end(), [&](const Open& each) {
                if (each.matched) return false;
                if (finding.events.empty()) return each.key == finding.key;
                return has(each.firstEvent) || has(each.lastEvent);
            });
            ++place;
            const std::string first = finding.events.empty() ? "" : finding.events.front();
            const std::string last = finding.events.empty() ? "" : finding.events.back();
            if (found == open.end()) {
                db_.Query(
                    "INSERT INTO findings (system, key, severity, state, title, part, part_number,"
                    " serial, first_time, last_time, count, first_event, last_event, place,"
                    " properties, first_visit, first_seen) VALUES ($1, $2, $3, $4, $5, $6, $7, $8,"
                    " $9, $10, $11, $12, $13, $14, $15, $16, $17)",
                    system_, SqlText(finding.key), SqlText(finding.severity),
                    SqlText(finding.state), SqlText(finding.title), SqlText(finding.part),
                    SqlText(finding.partNumber), SqlText(finding.serial), OrNull(finding.firstTime),
                    OrNull(finding.lastTime), finding.count, SqlText(first), SqlText(last), place,
                    SqlText(finding.properties), visitId_, visit_.finished);
                continue;
            }
            found->matched = true;
            // Of a log that was read in part the last event known here need not be the last.
            const bool anew =
                last != found->lastEvent && (visit_.complete || has(found->lastEvent));
            const auto now = ParseSeverity(finding.severity);
            const auto before = ParseSeverity(found->severity);
            const bool worse = now && (!before || *now > *before);
            if (found->acknowledged && (anew || worse)) {
                db_.Query("UPDATE findings SET acknowledged = NULL WHERE id = $1", found->id);
                db_.Query(
                    "UPDATE acknowledgements SET ended = $2"
                    " WHERE finding = $1 AND ended IS NULL",
                    found->id, visit_.finished);
            }
            db_.Query(
                "UPDATE findings SET severity = $2, state = $3, title = $4, part = $5,"
                " part_number = $6, serial = $7, first_time = $8, last_time = $9, count = $10,"
                " first_event = $11, last_event = $12, place = $13, properties = $14"
                " WHERE id = $1 AND (properties <> $14 OR place <> $13)",
                found->id, SqlText(finding.severity), SqlText(finding.state),
                SqlText(finding.title), SqlText(finding.part), SqlText(finding.partNumber),
                SqlText(finding.serial), OrNull(finding.firstTime), OrNull(finding.lastTime),
                finding.count, SqlText(first), SqlText(last), place, SqlText(finding.properties));
        }
        if (!visit_.complete) return;
        for (const Open& each : open) {
            if (each.matched) continue;
            db_.Query("UPDATE findings SET gone = $2, gone_visit = $3 WHERE id = $1", each.id,
                      visit_.finished, visitId_);
        }
    }

    void WriteParts() {
        using Said = std::vector<std::string>;  // kind, slot, and what stands there
        std::multimap<Said, std::int64_t> stored;
        for (const SqlRow& row :
             db_.Query("SELECT kind, slot, manufacturer, product, part_number, serial, version, id"
                       " FROM parts WHERE system = $1 AND gone IS NULL",
                       system_)) {
            Said said;
            std::transform(row.begin(), row.begin() + 7, std::back_inserter(said), TextOf);
            stored.emplace(std::move(said), IntegerOf(row.at(7)));
        }
        std::set<std::pair<std::string, std::string>> filled;
        std::vector<const VisitPart*> added;
        for (const VisitPart& part : visit_.parts) {
            Said said;
            for (const std::string* text :
                 {&part.kind, &part.slot, &part.manufacturer, &part.product, &part.partNumber,
                  &part.serial, &part.version}) {
                said.push_back(SqlText(*text));
            }
            filled.emplace(said[0], said[1]);
            if (const auto known = stored.find(said); known != stored.end()) {
                stored.erase(known);
            } else {
                added.push_back(&part);
            }
        }
        // What could not be read need not be gone.
        for (const auto& [said, id] : stored) {
            if (!(visit_.complete && visit_.partsRead) && !filled.contains({said[0], said[1]})) {
                continue;
            }
            db_.Query("UPDATE parts SET gone = $2, gone_visit = $3 WHERE id = $1", id,
                      visit_.finished, visitId_);
        }
        for (const VisitPart* const part : added) {
            db_.Query(
                "INSERT INTO parts (system, kind, slot, manufacturer, product, part_number,"
                " serial, version, properties, first_visit, first_seen)"
                " VALUES ($1, $2, $3, $4, $5, $6, $7, $8, $9, $10, $11)",
                system_, part->kind, SqlText(part->slot), SqlText(part->manufacturer),
                SqlText(part->product), SqlText(part->partNumber), SqlText(part->serial),
                SqlText(part->version), SqlText(part->properties), visitId_, visit_.finished);
        }
    }

    void WriteLogState() {
        const auto& known = visit_.known;
        // A log with equal records is one event short of them.
        const bool usable =
            visit_.complete && !stale_ && known && known->log.size() == planned_.size();
        db_.Query(
            "UPDATE systems SET revision = revision + 1, gone = NULL,"
            " log_read = CASE WHEN $2 = 1 THEN $3 ELSE log_read END WHERE id = $1",
            system_, std::int64_t{visit_.complete && !stale_ ? 1 : 0}, visit_.finished);
        // No row is ever taken out of the store: a collector need not have the right to.
        constexpr std::int64_t kUnusable = -1;
        if (!usable) {
            db_.Query("UPDATE log_states SET records = $2 WHERE system = $1", system_, kUnusable);
            return;
        }
        db_.Query(
            "INSERT INTO log_states (system, guid, log_info, records, sensor_info,"
            " sensor_records) VALUES ($1, $2, $3, $4, $5, $6)"
            " ON CONFLICT (system) DO UPDATE SET guid = excluded.guid,"
            " log_info = excluded.log_info, records = excluded.records,"
            " sensor_info = excluded.sensor_info, sensor_records = excluded.sensor_records",
            system_, HexText(known->guid), HexText(known->logInfo),
            static_cast<std::int64_t>(known->log.size()), HexText(known->sensorInfo),
            RecordsText(known->sensorRecords));
    }

    /// Another controller has stood under the name: what was wrong with it is no longer to be
    /// looked at here.
    void RetireOthers() {
        for (const SqlRow& row :
             db_.Query("UPDATE systems SET gone = $3 WHERE name = $1 AND id <> $2 AND gone IS NULL"
                       " RETURNING id, identity",
                       SqlText(visit_.name), system_, visit_.finished)) {
            const std::string& identity = TextOf(row.at(1));
            Tell("another controller answers under this name: " +
                 (visit_.Identity().empty() ? "one without GUID and serial number"
                                            : visit_.Identity()) +
                 ", before " + (identity.empty() ? "one without" : identity) +
                 "; the events of both are kept apart");
            for (const char* const sql : {"UPDATE findings SET gone = $2, gone_visit = $3"
                                          " WHERE system = $1 AND gone IS NULL",
                                          "UPDATE parts SET gone = $2, gone_visit = $3"
                                          " WHERE system = $1 AND gone IS NULL"}) {
                db_.Query(sql, IntegerOf(row.at(0)), visit_.finished, visitId_);
            }
        }
    }

    /// Once: some manufacturers give the same one to all.
    void TellOfGuid() {
        if (visit_.guid.empty() || !isNewHere_) return;
        const auto rows = db_.Query(
            "SELECT COUNT(*), MIN(name) FROM systems WHERE guid = $1 AND name <> $2"
            " AND gone IS NULL",
            SqlText(visit_.guid), SqlText(visit_.name));
        const auto others = static_cast<std::size_t>(IntegerOf(rows.at(0).at(0)));
        if (others == 0) return;
        Tell("its GUID " + visit_.guid + " is claimed by " + TextOf(rows[0].at(1)) +
             (others == 1 ? "" : " and " + Counted(others - 1, "other")) +
             " too; they are kept apart by their names");
    }

    Database& db_;
    const Visit& visit_;
    const std::optional<StoredSystem>& before_;
    std::vector<std::string> lines_;
    std::int64_t system_ = 0;
    std::int64_t visitId_ = 0;
    std::optional<std::int64_t> logRead_;
    bool isNewHere_ = false;  ///< under this name, or back
    bool stale_ = false;
    std::map<std::string, Stored, std::less<>> stored_;
    std::vector<std::string> present_;  ///< keys in the log's order
    std::int64_t lastPosition_ = 0;
    std::vector<Planned> planned_;
    std::vector<std::string> gone_;
    std::size_t new_ = 0;
    std::size_t back_ = 0;
};

/// A visit without anything new: one row for as long as the last visit was of its kind too.
void CountVisit(Database& db, std::int64_t system, const std::string& kind, std::int64_t started,
                std::int64_t finished, const std::string& problem) {
    const auto last = db.Query(
        "SELECT id, kind, problem FROM visits WHERE system = $1"
        " ORDER BY id DESC LIMIT 1",
        system);
    if (!last.empty() && TextOf(last[0].at(1)) == kind && TextOf(last[0].at(2)) == problem) {
        db.Query("UPDATE visits SET finished = $2, times = times + 1 WHERE id = $1",
                 IntegerOf(last[0].at(0)), finished);
        return;
    }
    db.Query(
        "INSERT INTO visits (system, kind, started, finished, times, complete, problem,"
        " events, new_events, gone_events, log_change, completeness)"
        " VALUES ($1, $2, $3, $4, 1, $5, $6, 0, 0, 0, '', '')",
        system, kind, started, finished, std::int64_t{kind == "failed" ? 0 : 1}, problem);
}

/// Rows of all systems, or of those that are named, which is asked for one by one.
std::vector<SqlRow> ForNames(Database& db, const std::string& select, const std::string& order,
                             const std::vector<std::string>& names) {
    if (names.empty()) return db.Query(select + order);
    std::vector<SqlRow> all;
    const std::string ofOne = select + " AND s.name = $1" + order;
    for (const std::string& name : names) {
        auto rows = db.Query(ofOne, SqlText(name));
        std::move(rows.begin(), rows.end(), std::back_inserter(all));
    }
    return all;
}

}  // namespace

Store::Store(const std::string& uri, IfMissing ifMissing)
    : database_(OpenDatabase(uri, ifMissing)) {
    UpdateSchema(*database_);
}

std::optional<StoredSystem> Store::Find(const std::string& name) {
    const auto rows = database_->Query(
        "SELECT id, revision, guid, manufacturer, product, serial, log_read FROM systems"
        " WHERE name = $1 AND gone IS NULL ORDER BY last_seen DESC, id DESC LIMIT 1",
        SqlText(name));
    if (rows.empty()) return std::nullopt;
    const SqlRow& row = rows.front();
    StoredSystem system{IntegerOf(row.at(0)),    IntegerOf(row.at(1)), TextOf(row.at(2)),
                        TextOf(row.at(3)),       TextOf(row.at(4)),    TextOf(row.at(5)),
                        MaybeInteger(row.at(6)), std::nullopt};
    const auto states = database_->Query(
        "SELECT guid, log_info, records, sensor_info, sensor_records FROM log_states"
        " WHERE system = $1",
        system.id);
    if (states.empty()) return system;
    const SqlRow& state = states.front();
    const auto guid = ParseHex(TextOf(state.at(0)));
    const auto logInfo = ParseHex(TextOf(state.at(1)));
    const auto sensorInfo = ParseHex(TextOf(state.at(3)));
    auto sensors = ParseRecords(TextOf(state.at(4)));
    if (!guid || !logInfo || !sensorInfo || !sensors) return system;
    KnownController known{*guid, *logInfo, {}, *sensorInfo, *std::move(sensors)};
    for (const SqlRow& event : database_->Query("SELECT raw FROM events WHERE system = $1"
                                                " AND gone IS NULL ORDER BY position",
                                                system.id)) {
        const auto raw = ParseHex(TextOf(event.at(0)));
        if (!raw || raw->size() != ipmi::kSelRecordSize) return system;
        std::copy(raw->begin(), raw->end(), known.log.emplace_back().begin());
    }
    // Another visit may have added events since.
    const std::int64_t records = IntegerOf(state.at(2));
    if (records >= 0 && known.log.size() == static_cast<std::size_t>(records)) {
        system.known = std::move(known);
    }
    return system;
}

std::set<std::string> Store::KeysOf(const std::string& name) {
    std::set<std::string> keys;
    for (SqlRow& row : database_->Query("SELECT e.key FROM events e JOIN systems s"
                                        " ON s.id = e.system WHERE s.name = $1",
                                        SqlText(name))) {
        keys.insert(TextOf(row.at(0)));
    }
    return keys;
}

std::vector<std::string> Store::Add(const Visit& visit, const std::optional<StoredSystem>& before) {
    Transaction transaction(*database_);
    std::vector<std::string> lines = VisitWriter(*database_, visit, before).Write();
    transaction.Commit();
    return lines;
}

void Store::AddUnchanged(const StoredSystem& system, std::int64_t started, std::int64_t finished) {
    Transaction transaction(*database_);
    // Whoever has stored a visit meanwhile knows better what stands in the log.
    database_->Query(
        "UPDATE systems SET last_seen = $2,"
        " log_read = CASE WHEN revision = $3 THEN $2 ELSE log_read END"
        " WHERE id = $1",
        system.id, finished, system.revision);
    CountVisit(*database_, system.id, "unchanged", started, finished, "");
    transaction.Commit();
}

void Store::AddFailed(const std::string& name, std::int64_t started, std::int64_t finished,
                      const std::string& problem) {
    Transaction transaction(*database_);
    auto rows = database_->Query(
        "UPDATE systems SET revision = revision"
        " WHERE name = $1 AND gone IS NULL RETURNING id",
        SqlText(name));
    if (rows.empty()) {
        rows = database_->Query(
            "INSERT INTO systems (name, identity, guid, manufacturer, product, serial, source,"
            " first_seen, last_seen, revision) VALUES ($1, '', '', '', '', '', '', $2, $2, 0)"
            " ON CONFLICT (name, identity) DO UPDATE SET gone = NULL RETURNING id",
            SqlText(name), finished);
    }
    for (const SqlRow& row : rows) {
        CountVisit(*database_, IntegerOf(row.at(0)), "failed", started, finished, SqlText(problem));
    }
    transaction.Commit();
}

std::vector<StoredFinding> Store::OpenFindings(const std::vector<std::string>& names) {
    std::vector<StoredFinding> findings;
    for (const SqlRow& row :
         ForNames(*database_,
                  "SELECT s.name, f.key, f.severity, f.state, f.title, f.part, f.part_number,"
                  " f.serial, f.first_time, f.last_time, f.count, f.first_seen, f.acknowledged,"
                  " f.properties, a.note FROM findings f JOIN systems s ON s.id = f.system"
                  " LEFT JOIN acknowledgements a ON a.finding = f.id AND a.ended IS NULL"
                  " WHERE f.gone IS NULL",
                  " ORDER BY s.name, s.id, f.place, f.id", names)) {
        findings.push_back({TextOf(row.at(0)), TextOf(row.at(1)), TextOf(row.at(2)),
                            TextOf(row.at(3)), TextOf(row.at(4)), TextOf(row.at(5)),
                            TextOf(row.at(6)), TextOf(row.at(7)), MaybeInteger(row.at(8)),
                            MaybeInteger(row.at(9)), IntegerOf(row.at(10)), IntegerOf(row.at(11)),
                            MaybeInteger(row.at(12)).has_value(), TextOf(row.at(14)),
                            TextOf(row.at(13))});
    }
    return findings;
}

std::vector<StoredVisit> Store::LastVisits(const std::vector<std::string>& names) {
    std::vector<StoredVisit> visits;
    for (const SqlRow& row :
         ForNames(*database_,
                  "SELECT v.id, s.name, v.kind, v.started, v.finished, v.complete, v.problem"
                  " FROM systems s JOIN visits v ON v.id ="
                  " (SELECT MAX(l.id) FROM visits l WHERE l.system = s.id)"
                  " WHERE s.gone IS NULL",
                  " ORDER BY s.name, s.id", names)) {
        visits.push_back({IntegerOf(row.at(0)), TextOf(row.at(1)), TextOf(row.at(2)),
                          IntegerOf(row.at(3)), IntegerOf(row.at(4)), IntegerOf(row.at(5)) != 0,
                          TextOf(row.at(6))});
    }
    return visits;
}

std::size_t Store::Acknowledge(const std::string& key, const std::vector<std::string>& names,
                               const std::string& who, const std::string& note, std::int64_t now) {
    Transaction transaction(*database_);
    // The list of a finding's events stands in its properties, where other keys stand too.
    std::size_t count = 0;
    for (const SqlRow& row :
         database_->Query("SELECT f.id, f.key, f.properties, s.name FROM findings f"
                          " JOIN systems s ON s.id = f.system"
                          " WHERE f.gone IS NULL AND (f.key = $1 OR f.properties LIKE $2)",
                          SqlText(key), "%\"" + SqlText(key) + "\"%")) {
        const auto has = [](const std::vector<std::string>& list, const std::string& text) {
            return std::find(list.begin(), list.end(), text) != list.end();
        };
        const auto finding = ParseInstance(std::string(kFindingClass), TextOf(row.at(2)));
        const bool isMeant = TextOf(row.at(1)) == key || has(FindingOf(finding).events, key);
        if (!isMeant || !(names.empty() || has(names, TextOf(row.at(3))))) continue;
        const std::int64_t id = IntegerOf(row.at(0));
        database_->Query("UPDATE findings SET acknowledged = $2 WHERE id = $1", id, now);
        database_->Query(
            "UPDATE acknowledgements SET ended = $2"
            " WHERE finding = $1 AND ended IS NULL",
            id, now);
        database_->Query(
            "INSERT INTO acknowledgements (finding, given, who, note)"
            " VALUES ($1, $2, $3, $4)",
            id, now, SqlText(who), SqlText(note));
        ++count;
    }
    transaction.Commit();
    return count;
}

std::optional<std::int64_t> Store::VisitAt(const std::string& name, std::int64_t time) {
    const auto rows = database_->Query(
        "SELECT MAX(v.id) FROM visits v JOIN systems s ON s.id = v.system"
        " WHERE s.name = $1 AND v.started <= $2",
        SqlText(name), time);
    return rows.empty() ? std::nullopt : MaybeInteger(rows[0].at(0));
}

std::optional<StoredState> Store::StateAt(std::int64_t visit) {
    const auto systems = database_->Query("SELECT system FROM visits WHERE id = $1", visit);
    if (systems.empty()) return std::nullopt;
    const std::int64_t system = IntegerOf(systems[0].at(0));
    StoredState state;
    for (const SqlRow& row : database_->Query(
             "SELECT kind, slot, manufacturer, product, part_number, serial, version FROM parts"
             " WHERE system = $1 AND first_visit <= $2"
             " AND (gone_visit IS NULL OR gone_visit > $2) ORDER BY id",
             system, visit)) {
        state.parts.push_back({TextOf(row.at(0)), TextOf(row.at(1)), TextOf(row.at(2)),
                               TextOf(row.at(3)), TextOf(row.at(4)), TextOf(row.at(5)),
                               TextOf(row.at(6)), ""});
    }
    for (const SqlRow& row :
         database_->Query("SELECT title, part, severity FROM findings"
                          " WHERE system = $1 AND first_visit <= $2"
                          " AND (gone_visit IS NULL OR gone_visit > $2) ORDER BY id",
                          system, visit)) {
        StoredFinding& finding = state.findings.emplace_back();
        finding.title = TextOf(row.at(0));
        finding.part = TextOf(row.at(1));
        finding.severity = TextOf(row.at(2));
    }
    return state;
}

}  // namespace ipmisel
