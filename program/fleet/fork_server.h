#pragma once

#include <sys/types.h>

#include <array>
#include <cstddef>
#include <functional>
#include <string>

#include "program/fleet/file_descriptor.h"

namespace ipmisel {

/// A process that starts workers by copying itself: what each of them needs is loaded once. It is
/// to be made before any password is known, so that a worker, whom a hostile controller may take
/// over, has in its memory the secrets of its own controller at most. Workers are children of the
/// process that made it. Operations throw Failure.
class ForkServer {
public:
    /// `prepare` is run in the server, `work` in each worker with its name; what it returns is the
    /// worker's exit status.
    ForkServer(const std::function<void()>& prepare,
               const std::function<int(const std::string& name)>& work);
    /// Workers that still run go on.
    ~ForkServer();
    ForkServer(const ForkServer&) = delete;
    ForkServer& operator=(const ForkServer&) = delete;

    /// Requests a worker in a process group of its own, with these as its descriptors 0 to 3, and
    /// does not wait for it: several are started as fast as the server can.
    void RequestWorker(const std::string& name, const std::array<int, 4>& descriptors);
    /// The process of the worker that was requested first of those not awaited yet.
    pid_t AwaitWorker();

    /// More are not to be requested before one is awaited: answers need room, too.
    static constexpr std::size_t kMaxRequested = 32;

private:
    FileDescriptor socket_;
    pid_t process_ = -1;
};

}  // namespace ipmisel
