#pragma once

#include <gmock/gmock.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <memory>
#include <nlohmann/json.hpp>
#include <optional>
#include <set>
#include <sstream>
#include <string>
#include <vector>

#include "base/hex.h"
#include "program/run_program.h"
#include "program/store/store.h"
#include "tests/support/run_program.h"
#include "tests/support/temporary_folder.h"

namespace ipmiseltest {

using Json = nlohmann::ordered_json;

/// A folder for a database, in memory where there is such a place: much is flushed, and the disk is
/// nothing to wait for here.
class DatabaseFolder {
public:
    std::string path() const { return folder_->path().string(); }
    DatabaseFolder() {
        const char* const before = std::getenv("TMPDIR");
        const std::string kept = before == nullptr ? "" : before;
        if (access("/dev/shm", W_OK) == 0) setenv("TMPDIR", "/dev/shm", 1);
        folder_.emplace();
        before == nullptr ? unsetenv("TMPDIR") : setenv("TMPDIR", kept.c_str(), 1);
    }

private:
    std::optional<TemporaryFolder> folder_;
};

/// A server of PostgreSQL of our own on a local socket, where its programs are installed.
class PostgresqlServer {
public:
    /// Null without one; then Missing() says why.
    static PostgresqlServer* Get() {
        static const std::unique_ptr<PostgresqlServer> server = Start();
        return server.get();
    }
    static const char* Missing() {
        return "no server of PostgreSQL can be started (package postgresql)";
    }
    ~PostgresqlServer() { Run("pg_ctl -D " + Data() + " -m immediate stop"); }

    /// The URI of a place with no tables yet.
    std::string FreshUri() {
        const std::string schema = "t" + std::to_string(++schemas_);
        const std::string host = folder_.path();
        Run("psql -q -h " + host + " -d postgres -c 'CREATE SCHEMA " + schema + "'");
        schema_ = schema;
        return UriOf(user_);
    }
    /// The URI of the last such place, for another user.
    std::string UriOf(const std::string& user) const {
        return "postgresql://" + user + "@/postgres?host=" + folder_.path() +
               "&options=-csearch_path%3D" + schema_;
    }
    /// Runs a file of SQL at the last such place, where every user may then look.
    bool RunFile(const std::string& file) const {
        return std::system(("psql -q -v ON_ERROR_STOP=1 -c 'GRANT USAGE ON SCHEMA " + schema_ +
                            " TO PUBLIC' -f '" + file + "' '" + UriOf(user_) + "'")
                               .c_str()) == 0;
    }

private:
    PostgresqlServer() : user_(geteuid() == 0 ? "postgres" : getlogin()) {
        std::filesystem::permissions(folder_.path(), std::filesystem::perms(0777));
    }
    static std::unique_ptr<PostgresqlServer> Start() {
        std::unique_ptr<PostgresqlServer> server(new PostgresqlServer);
        // Nothing of it is to outlive the test.
        const bool runs = server->Run("initdb -A trust -D " + server->Data()) &&
                          server->Run("pg_ctl -w -l " + server->Data() + "/log -o \"-F -k " +
                                      server->folder_.path() + " -c listen_addresses= \" -D " +
                                      server->Data() + " start");
        return runs ? std::move(server) : nullptr;
    }
    std::string Data() const { return folder_.path() + "/data"; }
    bool Run(const std::string& command) const {
        const std::string line =
            "cd /; PATH=$(ls -d /usr/lib/postgresql/*/bin 2>/dev/null | tail -n 1):$PATH; " +
            command;
        std::string shell = "exec >/dev/null 2>&1; ";
        shell += user_ == "postgres" && geteuid() == 0 ? "runuser -u postgres -- sh -c \"$LINE\""
                                                       : "sh -c \"$LINE\"";
        setenv("LINE", line.c_str(), 1);
        const int status = std::system(shell.c_str());
        unsetenv("LINE");
        return status == 0;
    }

    DatabaseFolder folder_;
    std::string user_;
    std::string schema_;
    int schemas_ = 0;
};

using RawRecord = std::array<std::uint8_t, 16>;

inline std::string Raw(const RawRecord& record) { return ipmisel::HexText(record); }

/// A controller whose log things happen to.
struct Controller {
    std::vector<RawRecord> log;
    std::uint32_t clock = 1767225600;
    std::optional<std::uint32_t> lastAddition, lastErase;
    std::uint16_t nextId = 1;
    std::string guid = "00112233445566778899aabbccddeeff";
    /// In which a power supply can have failed; else it is in order.
    std::uint8_t supply = 0x51;

    /// An event of the power supply, a failure or its end.
    void Grow(bool failure = true) {
        clock += 7;
        const std::uint32_t t = clock;
        log.push_back({static_cast<std::uint8_t>(nextId), static_cast<std::uint8_t>(nextId >> 8),
                       0x02, static_cast<std::uint8_t>(t), static_cast<std::uint8_t>(t >> 8),
                       static_cast<std::uint8_t>(t >> 16), static_cast<std::uint8_t>(t >> 24), 0x20,
                       0x00, 0x04, 0x08, supply, static_cast<std::uint8_t>(failure ? 0x6F : 0xEF),
                       0x01, 0xFF, 0xFF});
        ++nextId;
        lastAddition = clock;
    }
    void Clear() {
        clock += 3;
        log.clear();
        nextId = 1;
        lastErase = clock;
    }
    /// The oldest makes room, which no time stamp tells.
    void Wrap() {
        if (!log.empty()) log.erase(log.begin());
        Grow();
    }
    void Erase(std::size_t position) {
        if (position >= log.size()) return;
        clock += 3;
        log.erase(log.begin() + static_cast<std::ptrdiff_t>(position));
        lastErase = clock;
    }
    void Replace(unsigned number) {
        log.clear();
        nextId = 1;
        guid = ipmisel::HexText(std::array<std::uint8_t, 2>{static_cast<std::uint8_t>(number >> 8),
                                                            static_cast<std::uint8_t>(number)}) +
               "2233445566778899aabbccddee01";
        lastAddition.reset();
        lastErase.reset();
    }

    /// A simulated server with it.
    Json Server() const {
        Json entries = Json::array();
        for (const RawRecord& record : log) entries.push_back(Raw(record));
        Json sel = {{"entries", entries}, {"time", clock}};
        sel["last_addition"] = lastAddition.value_or(0xFFFFFFFF);
        sel["last_erase"] = lastErase.value_or(0xFFFFFFFF);
        // A compact record: power supply 1, "PSU1 Status"
        const Json records = {
            "0100 51 02 26 200051 0a01 0000 086f ffff ffff ffff c00000 0000 0000"
            " 000000 00 cb 5053553120537461747573"};
        return {{"machine_type", "SIM-T"},
                {"smbios", {"26123000012020ffa30c0000000000000105 0000"}},
                {"bmcs",
                 {{{"device_id", "20 01 02 15 02 bf 57 01 00 00 01 00 00 00 00"},
                   {"guid", guid},
                   {"sel", sel},
                   {"sdr", {{"records", records}}}}}}};
    }
};

/// A store of either kind, and the program run in this process.
class StoreTest : public ::testing::TestWithParam<bool> {
protected:
    void SetUp() override {
        uri = "sqlite:" + databases.path() + "/store.db";
        if (!GetParam()) return;
        if (PostgresqlServer::Get() == nullptr) GTEST_SKIP() << PostgresqlServer::Missing();
        uri = PostgresqlServer::Get()->FreshUri();
    }

    struct Result {
        int exitStatus = -1;
        std::string out, err;
        std::vector<Json> Events() const {
            std::vector<Json> events;
            std::istringstream in(out);
            for (std::string line; std::getline(in, line);) {
                Json json = Json::parse(line);
                if (!json.contains("summary")) events.push_back(std::move(json));
            }
            return events;
        }
        std::vector<std::string> Raws() const {
            std::vector<std::string> raws;
            for (const Json& event : Events()) raws.push_back(event["Raw"]);
            return raws;
        }
    };

    Result Run(std::vector<std::string> arguments) {
        arguments.insert(arguments.begin(), "ipmisel");
        std::vector<char*> argv;
        for (std::string& argument : arguments) argv.push_back(argument.data());
        argv.push_back(nullptr);
        ::testing::internal::CaptureStderr();
        Result result;
        result.exitStatus = ipmisel::RunProgram(static_cast<int>(arguments.size()), argv.data());
        result.err = ::testing::internal::GetCapturedStderr();
        return result;
    }
    /// A visit of a simulated server, with the events that it reported.
    Result Visit(const Json& server, std::vector<std::string> more = {"--new"}) {
        const std::string out = (folder.path() / "out").string();
        std::filesystem::remove(out);
        more.insert(more.begin(),
                    {"collect", "--from", "sim:" + folder.Write("bmc.json", server.dump()),
                     "--store", uri, "--output", out});
        if (std::find(more.begin(), more.end(), "--format") == more.end()) {
            more.insert(more.end(), {"--format", "events"});
        }
        Result result = Run(more);
        result.out = ReadText(out);
        return result;
    }
    std::vector<std::string> Column(const std::string& sql) {
        ipmisel::Store store(uri);
        std::vector<std::string> texts;
        for (const ipmisel::SqlRow& row : store.database().Query(sql)) {
            const auto* const number = std::get_if<std::int64_t>(&row.at(0));
            texts.push_back(number ? std::to_string(*number) : ipmisel::TextOf(row.at(0)));
        }
        return texts;
    }

    TemporaryFolder folder;
    DatabaseFolder databases;
    std::string uri;
};

inline std::string StoreName(const ::testing::TestParamInfo<bool>& info) {
    return info.param ? "Postgresql" : "Sqlite";
}

}  // namespace ipmiseltest
