#include "program/fleet/worker_pool.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <csignal>
#include <cstring>
#include <filesystem>
#include <optional>
#include <system_error>
#include <utility>

#include "program/commands/failure.h"

namespace ipmisel {
namespace {

constexpr std::size_t kMaxLogLine = 4096;
/// A controller could make its worker say as much as it likes.
constexpr std::size_t kMaxLogLines = 1000;

[[noreturn]] void Fail(const char* what, int error) {
    throw Failure(kExitUsage, std::string("cannot ") + what + ": " + std::strerror(error) +
                                  "; collect from fewer at a time with --jobs");
}

struct Pipe {
    Pipe() {
        int ends[2];
        if (pipe2(ends, O_CLOEXEC) != 0) Fail("make a pipe to a worker", errno);
        out = FileDescriptor(ends[0]);
        in = FileDescriptor(ends[1]);
    }
    FileDescriptor out, in;
};

/// For what a worker writes to standard output.
FileDescriptor NamelessFile() {
    std::error_code error;
    const auto folder = std::filesystem::temp_directory_path(error);
    std::string name = (folder / "ipmisel-XXXXXX").string();
    FileDescriptor file(error ? -1 : mkostemp(name.data(), O_CLOEXEC));
    if (!file.IsOpen()) Fail("make a temporary file", error ? error.value() : errno);
    unlink(name.c_str());
    return file;
}

/// Reads what there is; false at the end.
bool ReadSome(const FileDescriptor& file, std::string* text) {
    std::array<char, 1 << 12> part;
    const ssize_t count = read(file.get(), part.data(), part.size());
    if (count < 0) return errno == EAGAIN || errno == EINTR;
    text->append(part.data(), static_cast<std::size_t>(count));
    return count > 0;
}

/// Three descriptors a worker, and some of our own.
void RaiseFileLimit() {
    rlimit limit{};
    if (getrlimit(RLIMIT_NOFILE, &limit) != 0) return;
    limit.rlim_cur = limit.rlim_max;
    setrlimit(RLIMIT_NOFILE, &limit);
}

}  // namespace

struct WorkerPool::Worker {
    std::size_t id = 0;
    pid_t process = -1;
    Clock::time_point limit{};
    bool killed = false;
    FileDescriptor result, log, report;
    std::string message, line;
    std::size_t lines = 0;

    ~Worker() {
        if (process <= 0) return;
        kill(process, SIGKILL);
        waitpid(process, nullptr, 0);
    }
    /// False when there is no more of it.
    bool TakeLog(const std::function<void(std::string_view)>& take) {
        const bool more = ReadSome(log, &line);
        for (auto end = line.find('\n'); end != std::string::npos; end = line.find('\n')) {
            TakeLine(std::string_view(line).substr(0, end), take);
            line.erase(0, end + 1);
        }
        if (line.size() > kMaxLogLine || (!more && !line.empty())) {
            TakeLine(line, take);
            line.clear();
        }
        return more;
    }
    void TakeLine(std::string_view text, const std::function<void(std::string_view)>& take) {
        if (lines++ < kMaxLogLines) take(text);
    }
};

WorkerPool::WorkerPool(ForkServer& server, std::size_t jobs,
                       std::function<void(std::string_view line)> log)
    : server_(server), jobs_(jobs), log_(std::move(log)) {
    RaiseFileLimit();
}

WorkerPool::~WorkerPool() {
    try {
        TakeStarted(0);
    } catch (const Failure&) {
        // There is none to kill.
    }
}

void WorkerPool::Start(std::size_t id, const std::string& name, const std::string& request,
                       Clock::time_point limit) {
    Pipe requests, logs, results;
    auto worker = std::make_unique<Worker>();
    worker->id = id;
    worker->limit = limit;
    worker->report = NamelessFile();
    static_assert(kWorkerResult == 3);
    TakeStarted(ForkServer::kMaxRequested - 1);
    server_.RequestWorker(
        name, {requests.out.get(), worker->report.get(), logs.in.get(), results.in.get()});
    worker->result = std::move(results.out);
    worker->log = std::move(logs.out);
    for (const FileDescriptor* file : {&worker->result, &worker->log}) {
        fcntl(file->get(), F_SETFL, O_NONBLOCK);
    }
    workers_.push_back(std::move(worker));
    ++starting_;
    requests.out.Close();
    // Shorter than what a pipe holds; one that ended already shows as such.
    if (write(requests.in.get(), request.data(), request.size()) < 0 && errno != EPIPE) {
        Fail("hand a worker its request", errno);
    }
}

void WorkerPool::TakeStarted(std::size_t most) {
    while (starting_ > most) {
        const auto first = workers_.end() - static_cast<std::ptrdiff_t>(starting_--);
        try {
            (*first)->process = server_.AwaitWorker();
        } catch (const Failure&) {
            workers_.erase(first);
            throw;
        }
    }
}

std::vector<WorkerEnd> WorkerPool::Wait(Clock::time_point until) {
    TakeStarted(0);
    std::vector<pollfd> waits;
    waits.reserve(2 * workers_.size());
    for (const auto& worker : workers_) {
        waits.push_back({worker->result.get(), POLLIN, 0});
        waits.push_back({worker->log.get(), POLLIN, 0});  // none (-1) is passed over
        if (!worker->killed) until = std::min(until, worker->limit);
    }
    const auto rest = std::max(until - Clock::now(), Clock::duration::zero());
    const auto seconds = std::chrono::duration_cast<std::chrono::seconds>(rest);
    const timespec wait{static_cast<time_t>(seconds.count()),
                        static_cast<long>(std::chrono::nanoseconds(rest - seconds).count())};
    sigset_t none;
    sigemptyset(&none);
    const bool any = ppoll(waits.data(), waits.size(), &wait, &none) > 0;
    const auto now = Clock::now();
    std::vector<WorkerEnd> ended;
    for (std::size_t i = 0; i < workers_.size(); ++i) {
        Worker& worker = *workers_[i];
        if (now >= worker.limit && !std::exchange(worker.killed, true)) {
            kill(worker.process, SIGKILL);
        }
        if (!any) continue;
        if (waits[2 * i + 1].revents != 0 && !worker.TakeLog(log_)) worker.log.Close();
        if (waits[2 * i].revents == 0) continue;
        const bool more = ReadSome(worker.result, &worker.message);
        if (more && worker.message.size() <= kMaxWorkerMessage) continue;
        if (more) kill(worker.process, SIGKILL);
        ended.push_back(End(worker));
    }
    std::erase_if(workers_, [](const auto& worker) { return worker->process < 0; });
    return ended;
}

WorkerEnd WorkerPool::End(Worker& worker) {
    while (worker.log.IsOpen() && worker.TakeLog(log_)) {
        pollfd rest{worker.log.get(), POLLIN, 0};
        if (poll(&rest, 1, 0) <= 0) break;
    }
    int status = 0;
    waitpid(std::exchange(worker.process, -1), &status, 0);
    WorkerEnd end{worker.id, {}, std::move(worker.report)};
    const auto result = ParseWorkerResult(worker.message);
    if (result && WIFEXITED(status)) {
        end.result = *result;
        return end;
    }
    end.lost = true;
    if (worker.killed) {
        end.result.outcome = {kExitPart, "did not end at its deadline and was killed",
                              "read this controller alone to see where it hangs"};
    } else if (WIFEXITED(status) && WEXITSTATUS(status) == kExitNoSource) {
        end.result.outcome = OutOfMemoryOfAWorker();  // so that it could not even say so
    } else {
        const std::string how = WIFSIGNALED(status)
                                    ? std::string("was ended by ") + strsignal(WTERMSIG(status))
                                    : "ended without a result";
        end.result.outcome = {kExitPassFailed, "its worker " + how,
                              "read this controller alone to see where it fails"};
    }
    return end;
}

void WorkerPool::Stop() {
    TakeStarted(0);
    for (const auto& worker : workers_) kill(worker->process, SIGTERM);
}

}  // namespace ipmisel
