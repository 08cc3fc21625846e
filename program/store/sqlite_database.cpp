#include <fcntl.h>
#include <sqlite3.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <cstring>
#include <map>
#include <new>
#include <thread>

#include "base/shared_library.h"
#include "program/commands/failure.h"
#include "program/store/database.h"

// SQLite, loaded on use: a collection without a store does not need it.

namespace ipmisel {
namespace {

// The functions that are used, each by its own name and type.
#define IPMISEL_SQLITE_FUNCTIONS(use)  \
    use(sqlite3_open_v2);              \
    use(sqlite3_close);                \
    use(sqlite3_errcode);              \
    use(sqlite3_errmsg);               \
    use(sqlite3_busy_timeout);         \
    use(sqlite3_prepare_v2);           \
    use(sqlite3_bind_parameter_index); \
    use(sqlite3_bind_int64);           \
    use(sqlite3_bind_text);            \
    use(sqlite3_bind_null);            \
    use(sqlite3_step);                 \
    use(sqlite3_reset);                \
    use(sqlite3_clear_bindings);       \
    use(sqlite3_finalize);             \
    use(sqlite3_column_count);         \
    use(sqlite3_column_type);          \
    use(sqlite3_column_int64);         \
    use(sqlite3_column_text);          \
    use(sqlite3_column_bytes)

struct Library {
    static const Library& Get() {
        static const Library library;
        return library;
    }
#define IPMISEL_DECLARE(name) decltype(&::name) name
    IPMISEL_SQLITE_FUNCTIONS(IPMISEL_DECLARE);
#undef IPMISEL_DECLARE

private:
    Library() try {
        const SharedLibrary library("libsqlite3.so.0", "SQLite 3 (package libsqlite3-0)");
#define IPMISEL_FIND(name) library.Find(#name, &(name))
        IPMISEL_SQLITE_FUNCTIONS(IPMISEL_FIND);
#undef IPMISEL_FIND
    } catch (const SharedLibraryError& error) {
        throw Failure(kExitUsage, error.what());
    }
};

constexpr int kBusyMilliseconds = 60000;

constexpr Dialect kDialect{
    .idColumn = "INTEGER PRIMARY KEY",
    .begin = "BEGIN IMMEDIATE",
    .lockForSchema = "",
    .hasSchema = "SELECT 1 FROM sqlite_master WHERE name = 'schema_versions'",
    .hasForeignTables = "SELECT 1 FROM sqlite_master LIMIT 1"};

class SqliteDatabase : public Database {
public:
    // By way of the other constructor: what is open when this one throws is closed.
    SqliteDatabase(const std::string& file, std::string uri, IfMissing ifMissing)
        : SqliteDatabase(std::move(uri)) {
        CheckFile(file, ifMissing);
        if (sqlite_.sqlite3_open_v2(file.c_str(), &handle_, SQLITE_OPEN_READWRITE, nullptr) !=
            SQLITE_OK) {
            Fail();
        }
        sqlite_.sqlite3_busy_timeout(handle_, kBusyMilliseconds);
        UseWriteAheadLog();
        for (const char* setting : {"PRAGMA synchronous = FULL", "PRAGMA foreign_keys = ON",
                                    "PRAGMA trusted_schema = OFF"}) {
            Run(setting, {});
        }
    }
    ~SqliteDatabase() override {
        for (const auto& [sql, statement] : statements_) sqlite_.sqlite3_finalize(statement);
        sqlite_.sqlite3_close(handle_);
    }
    SqliteDatabase(const SqliteDatabase&) = delete;
    SqliteDatabase& operator=(const SqliteDatabase&) = delete;

    const Dialect& dialect() const override { return kDialect; }

    std::vector<SqlRow> Run(std::string_view sql, std::span<const SqlValue> values) override {
        sqlite3_stmt* const statement = Statement(sql);
        for (std::size_t i = 0; i < values.size(); ++i) Bind(statement, i, values[i]);
        std::vector<SqlRow> rows;
        int result = SQLITE_ROW;
        while ((result = sqlite_.sqlite3_step(statement)) == SQLITE_ROW) {
            SqlRow& row = rows.emplace_back();
            for (int i = 0; i < sqlite_.sqlite3_column_count(statement); ++i) {
                row.push_back(Column(statement, i));
            }
        }
        sqlite_.sqlite3_reset(statement);
        if (result != SQLITE_DONE) Fail();
        sqlite_.sqlite3_clear_bindings(statement);
        return rows;
    }

private:
    explicit SqliteDatabase(std::string uri) : uri_(std::move(uri)) {}

    [[noreturn]] void Fail(const std::string& problem) const {
        throw Failure(kExitUsage, "the store " + uri_ + " cannot be used: " + problem +
                                      "; correct that, or name another file with --store");
    }
    /// With what the last call found; to reset its statement leaves that as it is.
    [[noreturn]] void Fail() const {
        if (sqlite_.sqlite3_errcode(handle_) == SQLITE_NOMEM) throw std::bad_alloc();
        Fail(sqlite_.sqlite3_errmsg(handle_));
    }

    /// SQLite would make it with what the umask leaves, and for who only wants to read too.
    void CheckFile(const std::string& file, IfMissing ifMissing) const {
        const int make = ifMissing == IfMissing::kMake ? O_CREAT : 0;
        const int descriptor = open(file.c_str(), O_RDWR | make | O_CLOEXEC | O_NONBLOCK, 0600);
        if (descriptor < 0) Fail(std::strerror(errno));
        struct stat status {};
        const bool regular = fstat(descriptor, &status) == 0 && S_ISREG(status.st_mode);
        close(descriptor);
        if (!regular) Fail("it is no regular file");
    }

    /// Readers and the one writer do not wait for each other then. Who opens a new file at the
    /// same moment is told at once that it is busy, however long one would wait.
    void UseWriteAheadLog() {
        const auto until =
            std::chrono::steady_clock::now() + std::chrono::milliseconds(kBusyMilliseconds);
        for (;;) {
            sqlite3_stmt* const statement = Statement("PRAGMA journal_mode = WAL");
            const int result = sqlite_.sqlite3_step(statement);
            sqlite_.sqlite3_reset(statement);
            if (result == SQLITE_ROW) return;
            const bool busy = result == SQLITE_BUSY || result == SQLITE_LOCKED;
            if (!busy || std::chrono::steady_clock::now() > until) Fail();
            std::this_thread::sleep_for(std::chrono::milliseconds(10));
        }
    }

    sqlite3_stmt* Statement(std::string_view sql) {
        const auto known = statements_.find(sql);
        if (known != statements_.end()) return known->second;
        sqlite3_stmt* statement = nullptr;
        if (sqlite_.sqlite3_prepare_v2(handle_, sql.data(), static_cast<int>(sql.size()),
                                       &statement, nullptr) != SQLITE_OK) {
            Fail();
        }
        statements_.emplace(sql, statement);
        return statement;
    }

    void Bind(sqlite3_stmt* statement, std::size_t position, const SqlValue& value) const {
        const std::string name = "$" + std::to_string(position + 1);
        const int index = sqlite_.sqlite3_bind_parameter_index(statement, name.c_str());
        if (index == 0) return;
        int result = SQLITE_OK;
        if (const auto* const number = std::get_if<std::int64_t>(&value)) {
            result = sqlite_.sqlite3_bind_int64(statement, index, *number);
        } else if (const auto* const text = std::get_if<std::string>(&value)) {
            result = sqlite_.sqlite3_bind_text(statement, index, text->data(),
                                               static_cast<int>(text->size()), SQLITE_STATIC);
        } else {
            result = sqlite_.sqlite3_bind_null(statement, index);
        }
        if (result != SQLITE_OK) Fail();
    }

    SqlValue Column(sqlite3_stmt* statement, int index) const {
        switch (sqlite_.sqlite3_column_type(statement, index)) {
            case SQLITE_NULL:
                return {};
            case SQLITE_INTEGER:
                return std::int64_t{sqlite_.sqlite3_column_int64(statement, index)};
            default: {
                const auto* const text = sqlite_.sqlite3_column_text(statement, index);
                if (text == nullptr) throw std::bad_alloc();
                const int bytes = sqlite_.sqlite3_column_bytes(statement, index);
                return std::string(reinterpret_cast<const char*>(text),
                                   static_cast<std::size_t>(bytes));
            }
        }
    }

    const Library& sqlite_ = Library::Get();
    std::string uri_;
    sqlite3* handle_ = nullptr;
    std::map<std::string, sqlite3_stmt*, std::less<>> statements_;
};

}  // namespace

void LoadSqlite() { Library::Get(); }

std::unique_ptr<Database> OpenSqlite(const std::string& file, const std::string& uri,
                                     IfMissing ifMissing) {
    return std::make_unique<SqliteDatabase>(file, uri, ifMissing);
}

}  // namespace ipmisel
