#include <string>

#include "program/commands/failure.h"
#include "program/store/database.h"

// docs/store.md has the tables in words.

namespace ipmisel {
namespace {

/// One number, one change of the tables, never altered once it has been in a release. ID_COLUMN
/// stands for the dialect's.
struct Migration {
    std::int64_t number;
    std::vector<const char*> statements;
};

const std::vector<Migration>& Migrations() {
    static const std::vector<Migration> kMigrations{
        {1,
         {R"(CREATE TABLE systems (
              id ID_COLUMN,
              name TEXT NOT NULL,
              identity TEXT NOT NULL,
              guid TEXT NOT NULL,
              manufacturer TEXT NOT NULL,
              product TEXT NOT NULL,
              serial TEXT NOT NULL,
              source TEXT NOT NULL,
              first_seen BIGINT NOT NULL,
              last_seen BIGINT NOT NULL,
              log_read BIGINT,
              gone BIGINT,
              revision BIGINT NOT NULL,
              UNIQUE (name, identity)))",
          "CREATE INDEX systems_guid ON systems (guid)",
          R"(CREATE TABLE visits (
              id ID_COLUMN,
              system BIGINT NOT NULL REFERENCES systems (id),
              kind TEXT NOT NULL,
              started BIGINT NOT NULL,
              finished BIGINT NOT NULL,
              times BIGINT NOT NULL,
              complete BIGINT NOT NULL,
              problem TEXT NOT NULL,
              events BIGINT NOT NULL,
              new_events BIGINT NOT NULL,
              gone_events BIGINT NOT NULL,
              log_change TEXT NOT NULL,
              completeness TEXT NOT NULL))",
          "CREATE INDEX visits_system ON visits (system, id)",
          R"(CREATE TABLE events (
              system BIGINT NOT NULL REFERENCES systems (id),
              key TEXT NOT NULL,
              record_id BIGINT NOT NULL,
              time BIGINT,
              severity TEXT,
              state TEXT,
              sensor TEXT NOT NULL,
              part TEXT NOT NULL,
              sentence TEXT NOT NULL,
              raw TEXT NOT NULL,
              properties TEXT NOT NULL,
              digest TEXT NOT NULL,
              position BIGINT NOT NULL,
              first_visit BIGINT NOT NULL REFERENCES visits (id),
              first_seen BIGINT NOT NULL,
              left_after BIGINT,
              gone BIGINT,
              gone_visit BIGINT,
              PRIMARY KEY (system, key)))",
          "CREATE INDEX events_position ON events (system, position)",
          "CREATE INDEX events_first_seen ON events (first_seen)",
          R"(CREATE INDEX events_faults ON events (part, system)
              WHERE part <> '' AND severity IN ('warning', 'critical', 'fatal'))",
          R"(CREATE TABLE parts (
              id ID_COLUMN,
              system BIGINT NOT NULL REFERENCES systems (id),
              kind TEXT NOT NULL,
              slot TEXT NOT NULL,
              manufacturer TEXT NOT NULL,
              product TEXT NOT NULL,
              part_number TEXT NOT NULL,
              serial TEXT NOT NULL,
              version TEXT NOT NULL,
              properties TEXT NOT NULL,
              first_visit BIGINT NOT NULL REFERENCES visits (id),
              first_seen BIGINT NOT NULL,
              gone BIGINT,
              gone_visit BIGINT))",
          "CREATE INDEX parts_system ON parts (system, slot)",
          "CREATE INDEX parts_serial ON parts (serial)",
          R"(CREATE TABLE findings (
              id ID_COLUMN,
              system BIGINT NOT NULL REFERENCES systems (id),
              key TEXT NOT NULL,
              severity TEXT NOT NULL,
              state TEXT NOT NULL,
              title TEXT NOT NULL,
              part TEXT NOT NULL,
              part_number TEXT NOT NULL,
              serial TEXT NOT NULL,
              first_time BIGINT,
              last_time BIGINT,
              count BIGINT NOT NULL,
              first_event TEXT NOT NULL,
              last_event TEXT NOT NULL,
              place BIGINT NOT NULL,
              properties TEXT NOT NULL,
              first_visit BIGINT NOT NULL REFERENCES visits (id),
              first_seen BIGINT NOT NULL,
              gone BIGINT,
              gone_visit BIGINT,
              acknowledged BIGINT))",
          "CREATE INDEX findings_system ON findings (system, gone)",
          "CREATE INDEX findings_key ON findings (key)",
          R"(CREATE TABLE acknowledgements (
              id ID_COLUMN,
              finding BIGINT NOT NULL REFERENCES findings (id),
              given BIGINT NOT NULL,
              ended BIGINT,
              who TEXT NOT NULL,
              note TEXT NOT NULL))",
          R"(CREATE TABLE log_states (
              system BIGINT PRIMARY KEY REFERENCES systems (id),
              guid TEXT NOT NULL,
              log_info TEXT NOT NULL,
              records BIGINT NOT NULL,
              sensor_info TEXT NOT NULL,
              sensor_records TEXT NOT NULL))",
          R"(CREATE VIEW seen_events AS
              SELECT s.name, s.guid, e.*,
                     COALESCE(e.left_after, s.log_read, e.first_seen) AS last_seen
              FROM events e JOIN systems s ON s.id = e.system)"}}};
    return kMigrations;
}

std::int64_t VersionOf(Database& database) {
    if (database.Query(database.dialect().hasSchema).empty()) return 0;
    const auto rows = database.Query("SELECT MAX(number) FROM schema_versions");
    return rows.empty() ? 0 : IntegerOf(rows[0].at(0));
}

std::string InDialect(std::string sql, const Dialect& dialect) {
    constexpr std::string_view kPlace = "ID_COLUMN";
    const auto at = sql.find(kPlace);
    if (at != std::string::npos) sql.replace(at, kPlace.size(), dialect.idColumn);
    return sql;
}

}  // namespace

void UpdateSchema(Database& database) {
    const std::int64_t newest = Migrations().back().number;
    if (VersionOf(database) == newest) return;
    const Dialect& dialect = database.dialect();
    Transaction transaction(database);
    if (!dialect.lockForSchema.empty()) database.Query(dialect.lockForSchema);
    // Another process may have been quicker.
    const std::int64_t version = VersionOf(database);
    if (version > newest) {
        throw Failure(kExitUsage, "the store has tables of version " + std::to_string(version) +
                                      ", this program knows up to " + std::to_string(newest) +
                                      "; use the program that wrote it, or a newer one");
    }
    if (version == 0) {
        if (!database.Query(dialect.hasForeignTables).empty()) {
            throw Failure(kExitUsage,
                          "the database of --store holds something else; name one "
                          "that is empty or that ipmisel has made");
        }
        database.Query("CREATE TABLE schema_versions (number BIGINT PRIMARY KEY)");
    }
    for (const Migration& migration : Migrations()) {
        if (migration.number <= version) continue;
        for (const char* const statement : migration.statements) {
            database.Query(InDialect(statement, dialect));
        }
        database.Query("INSERT INTO schema_versions (number) VALUES ($1)", migration.number);
    }
    transaction.Commit();
}

}  // namespace ipmisel
