#include "program/fleet/worker.h"

#include <poll.h>
#include <sys/prctl.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <csignal>
#include <new>
#include <utility>

#include "host/spdriver/source.h"
#include "program/commands/failure.h"
#include "program/commands/out_of_memory.h"
#include "program/commands/plugins.h"
#include "program/reports/json_text.h"
#include "program/reports/terminal_text.h"
#include "program/store/database.h"

namespace ipmisel {
namespace {

constexpr const char* kNoRequest = "a worker got no request; collect again";

/// A member that may be left out, under its key.
template <typename Member>
void Put(Json& json, const char* key, const std::optional<Member>& member) {
    if (member) json[key] = *member;
}
template <typename Member>
void Get(const Json& json, const char* key, std::optional<Member>* member) {
    if (json.contains(key)) *member = json.at(key).get<Member>();
}

std::string Message(const Json& json) {
    std::string message;
    Json::to_cbor(json, message);
    return message;
}

CollectOptions ParseRequest(const std::string& message) {
    CollectOptions options;
    options.progress = options.alone = false;
    try {
        const Json json = Json::from_cbor(message);
        options.access.sources = {json.at("source").get<std::string>()};
        Get(json, "user", &options.access.source.user);
        Get(json, "password", &options.access.password);
        Get(json, "kg", &options.access.kg);
        Get(json, "cipher_suite", &options.access.source.cipherSuite);
        options.access.source.privilege = json.at("privilege");
        options.access.source.workarounds = json.at("workarounds").get<std::vector<std::string>>();
        Get(json, "window", &options.access.source.window);
        options.access.source.timeoutSeconds = json.at("timeout");
        Get(json, "deadline", &options.deadlineSeconds);
        options.names = {json.at("name").get<std::string>()};
        Get(json, "severities", &options.severities);
        Get(json, "store", &options.store);
        options.onlyNew = json.at("new");
        options.plugins = json.at("plugins").get<std::vector<std::string>>();
        options.report.classes = json.at("classes").get<std::vector<std::string>>();
        options.report.format = json.at("format");
        options.log.level = json.at("log_level");
    } catch (const nlohmann::json::exception&) {
        throw Failure(kExitUsage, kNoRequest);
    }
    return options;
}

std::string ReadRequest() {
    std::string message;
    std::array<char, 1 << 12> part;
    for (;;) {
        const ssize_t count = read(STDIN_FILENO, part.data(), part.size());
        if (count < 0 && errno == EINTR) continue;
        if (count <= 0) return message;
        message.append(part.data(), static_cast<std::size_t>(count));
        if (message.size() > kMaxWorkerMessage) throw Failure(kExitUsage, kNoRequest);
    }
}

WorkerResult CollectAsAsked(const CollectOptions& options) {
    try {
        return {CollectOutcome(options), true};
    } catch (const Failure& failure) {
        return {{failure.exitStatus, failure.what(), ""}};
    } catch (const std::bad_alloc&) {
        return {OutOfMemoryOfAWorker()};
    } catch (const std::exception& error) {
        return {
            {kExitPassFailed, std::string("ended by an error of its own: ") + error.what(), ""}};
    }
}

}  // namespace

std::string WriteWorkerRequest(const CollectOptions& options) {
    const NQORTQR20::SourceOptions& access = options.access.source;
    Json json = {{"source", options.access.sources.front()},
                 {"name", options.names.front()},
                 {"privilege", access.privilege},
                 {"workarounds", access.workarounds},
                 {"timeout", access.timeoutSeconds},
                 {"plugins", options.plugins},
                 {"classes", options.report.classes},
                 {"format", options.report.format},
                 {"log_level", options.log.level},
                 {"new", options.onlyNew}};
    Put(json, "user", access.user);
    Put(json, "password", options.access.password);
    Put(json, "kg", options.access.kg);
    Put(json, "cipher_suite", access.cipherSuite);
    Put(json, "window", access.window);
    Put(json, "deadline", options.deadlineSeconds);
    Put(json, "severities", options.severities);
    Put(json, "store", options.store);
    return Message(json);
}

std::string WriteWorkerResult(const WorkerResult& result) {
    const Outcome& outcome = result.outcome;
    return Message({{"status", outcome.exitStatus},
                    {"problem", outcome.problem.substr(0, kMaxWorkerMessage / 2)},
                    {"advice", outcome.advice},
                    {"reported", result.reported}});
}

std::optional<WorkerResult> ParseWorkerResult(const std::string& message) {
    try {
        const Json json = Json::from_cbor(message);
        return WorkerResult{{json.at("status"), json.at("problem"), json.at("advice")},
                            json.at("reported")};
    } catch (const nlohmann::json::exception&) {
        return std::nullopt;
    }
}

Outcome OutOfMemoryOfAWorker() {
    return {kExitPassFailed, kOutOfMemory, "collect from fewer at a time with --jobs"};
}

int RunWorker(const std::string& name) {
    SayFor(name);
    LeaveOutOfMemoryToTheParent();
    // Whoever wrote it is the parent by then, which may be killed at any time; nobody would take
    // the report then.
    const CollectOptions options = ParseRequest(ReadRequest());
    prctl(PR_SET_PDEATHSIG, SIGTERM);
    pollfd reader{kWorkerResult, 0, 0};
    if (poll(&reader, 1, 0) != 0) return kExitUsage;  // it is gone already
    const WorkerResult result = CollectAsAsked(options);
    const std::string message = WriteWorkerResult(result);
    if (write(kWorkerResult, message.data(), message.size()) < 0) return kExitUsage;
    return result.outcome.exitStatus;
}

void PrepareWorkers(const CollectOptions& options) {
    NQORTQR20::PrepareSources();
    try {
        KeepPluginsLoaded(options.plugins);
        if (options.store) LoadDatabaseLibrary(*options.store);
    } catch (const Failure&) {
        // The first worker has the same to tell.
    }
}

}  // namespace ipmisel
