#include "program/store/database.h"

#include <exception>

#include "program/commands/failure.h"
#include "program/reports/terminal_text.h"

namespace ipmisel {

std::int64_t IntegerOf(const SqlValue& value) {
    const auto* const number = std::get_if<std::int64_t>(&value);
    return number == nullptr ? 0 : *number;
}

const std::string& TextOf(const SqlValue& value) {
    static const std::string kNone;
    const auto* const text = std::get_if<std::string>(&value);
    return text == nullptr ? kNone : *text;
}

namespace {

constexpr std::string_view kSqlite = "sqlite:";
constexpr std::string_view kPostgresql = "postgresql://";

}  // namespace

void LoadDatabaseLibrary(const std::string& uri) {
    if (uri.starts_with(kSqlite)) LoadSqlite();
    if (uri.starts_with(kPostgresql)) LoadPostgresql();
}

std::unique_ptr<Database> OpenDatabase(const std::string& uri, IfMissing ifMissing) {
    if (uri.starts_with(kSqlite) && uri.size() > kSqlite.size()) {
        return OpenSqlite(uri.substr(kSqlite.size()), uri, ifMissing);
    }
    if (uri.starts_with(kPostgresql)) return OpenPostgresql(uri);
    throw Failure(kExitUsage,
                  "there is no store of the kind that --store names; give sqlite:FILE "
                  "or postgresql://HOST/DATABASE");
}

Transaction::Transaction(Database& database) : database_(database) {
    database_.Query(database_.dialect().begin);
}

Transaction::~Transaction() {
    if (!open_) return;
    try {
        database_.Query("ROLLBACK");
    } catch (const std::exception&) {
        // What broke the connection has undone it; so does its end.
    }
}

void Transaction::Commit() {
    database_.Query("COMMIT");
    open_ = false;
}

std::string SqlText(std::string_view text) {
    constexpr std::string_view kReplacement = "\xEF\xBF\xBD";
    std::string clean;
    clean.reserve(text.size());
    while (!text.empty()) {
        const Character character = FirstCharacter(text);
        const bool fits = character.valid && character.value != 0;
        clean += fits ? text.substr(0, character.length) : kReplacement;
        text.remove_prefix(character.length);
    }
    return clean;
}

}  // namespace ipmisel
