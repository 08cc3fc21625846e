#pragma once

#include <sys/types.h>

#include <chrono>
#include <cstddef>
#include <functional>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "program/fleet/file_descriptor.h"
#include "program/fleet/fork_server.h"
#include "program/fleet/worker.h"

namespace ipmisel {

/// What a worker left behind.
struct WorkerEnd {
    std::size_t id;  ///< as it was started
    WorkerResult result;
    FileDescriptor report;  ///< what it wrote to standard output, a file without a name
    bool lost = false;      ///< it has not said how it went
};

/// Workers that run at the same time, each a process in a process group of its own: a terminal's
/// Ctrl-C reaches this process alone. To be used with the stop signals held, which Wait lets in.
/// Operations throw Failure when the system has no process or file left.
class WorkerPool {
public:
    using Clock = std::chrono::steady_clock;

    /// `log` gets what the workers write to standard error, in whole lines without the line feed.
    /// The server outlives the object.
    WorkerPool(ForkServer& server, std::size_t jobs,
               std::function<void(std::string_view line)> log);
    /// Kills those that still run.
    ~WorkerPool();
    WorkerPool(const WorkerPool&) = delete;
    WorkerPool& operator=(const WorkerPool&) = delete;

    bool HasRoom() const { return workers_.size() < jobs_; }
    std::size_t Running() const { return workers_.size(); }
    /// Starts one, and kills it when it still runs at `limit`. That it could not be started may
    /// show in the next operation.
    void Start(std::size_t id, const std::string& name, const std::string& request,
               Clock::time_point limit);
    /// Those that have ended; waits for one until then, or until a signal comes.
    std::vector<WorkerEnd> Wait(Clock::time_point until);
    /// Asks all of them to end in good order.
    void Stop();

private:
    struct Worker;

    WorkerEnd End(Worker& worker);
    /// Learns the processes of workers that were asked for, until as many are left to learn.
    void TakeStarted(std::size_t most);

    ForkServer& server_;
    std::size_t jobs_;
    std::function<void(std::string_view)> log_;
    std::vector<std::unique_ptr<Worker>> workers_;
    std::size_t starting_ = 0;  ///< the last so many of them have no process yet
};

}  // namespace ipmisel
