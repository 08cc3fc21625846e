#pragma once

#include <cstdint>
#include <memory>
#include <span>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

namespace ipmisel {

/// NULL, an integer or a text.
using SqlValue = std::variant<std::monostate, std::int64_t, std::string>;
using SqlRow = std::vector<SqlValue>;

/// The integer or text of a column; 0 or an empty text for NULL.
std::int64_t IntegerOf(const SqlValue& value);
const std::string& TextOf(const SqlValue& value);

/// What differs between the databases; every other statement is one text for both.
struct Dialect {
    std::string_view idColumn;          ///< a key that the database counts up
    std::string_view begin;             ///< a transaction that will write
    std::string_view lockForSchema;     ///< nobody else changes the tables until its end; or empty
    std::string_view hasSchema;         ///< gives a row when `schema_versions` is there
    std::string_view hasForeignTables;  ///< gives a row when a table is there that is not ours
};

/// A connection to a database. Statements have their values as parameters, $1 and so on, and never
/// in their text. Every operation throws Failure, with what to do.
class Database {
public:
    virtual ~Database() = default;
    virtual const Dialect& dialect() const = 0;
    virtual std::vector<SqlRow> Run(std::string_view sql, std::span<const SqlValue> values) = 0;

    template <typename... Values>
    std::vector<SqlRow> Query(std::string_view sql, const Values&... values) {
        const std::vector<SqlValue> list{SqlValue(values)...};
        return Run(sql, list);
    }
};

/// What is done where `sqlite:FILE` names a file that is not there.
enum class IfMissing { kMake, kRefuse };

/// Opens `sqlite:FILE`, which is made with mode 0600, or `postgresql://...`. Throws Failure.
std::unique_ptr<Database> OpenDatabase(const std::string& uri,
                                       IfMissing ifMissing = IfMissing::kMake);

/// Loads the library that a store of this URI needs, for processes that are copied from this one.
/// Throws Failure.
void LoadDatabaseLibrary(const std::string& uri);

/// The one and the other; `uri` is for messages.
std::unique_ptr<Database> OpenSqlite(const std::string& file, const std::string& uri,
                                     IfMissing ifMissing);
std::unique_ptr<Database> OpenPostgresql(const std::string& uri);
void LoadSqlite();
void LoadPostgresql();

/// Undone when it goes out of scope without Commit.
class Transaction {
public:
    explicit Transaction(Database& database);
    ~Transaction();
    Transaction(const Transaction&) = delete;
    Transaction& operator=(const Transaction&) = delete;
    void Commit();

private:
    Database& database_;
    bool open_ = true;
};

/// Brings the tables to the version that this program works with. Throws Failure when they are of
/// a later one, or when the database holds something else.
void UpdateSchema(Database& database);

/// A text as every database takes it: UTF-8 without NUL; other bytes become U+FFFD.
std::string SqlText(std::string_view text);

}  // namespace ipmisel
