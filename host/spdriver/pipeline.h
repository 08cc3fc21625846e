#pragma once

#include <chrono>
#include <cstddef>
#include <functional>
#include <memory>
#include <optional>
#include <span>
#include <utility>

#include "host/spdriver/transport.h"
#include "ipmi/command.h"

namespace NQORTQR20 {

/// Requests to one BMC, several of them outstanding at a time.
///
/// Nothing happens between calls: answers are taken in, retries sent and handlers called in Advance
/// alone, on the caller's thread. A handler may submit further requests. An object that goes away
/// drops its outstanding requests without calling their handlers.
class RequestPipeline {
public:
    using Clock = std::chrono::steady_clock;
    /// Takes the answer; empty when none came within the time that one request has in all.
    using Handler = std::function<void(std::optional<Response>)>;

    virtual ~RequestPipeline() = default;

    /// Sends the request as soon as the window has room, in the order of the calls. The handler is
    /// called once, in whatever order answers come; never from within Submit.
    virtual void Submit(ipmi::Command command, Handler handler) = 0;
    /// Requests that were submitted and whose handler has not been called.
    virtual std::size_t Pending() const = 0;
    /// How many more requests would go out at once if they were submitted now. Who reads ahead
    /// submits no more than that, so that a guess never stands before a request that somebody waits
    /// for.
    virtual std::size_t Room() const = 0;
    /// Answers that somebody waited for and that were dropped since their session sequence numbers
    /// had come before; none where the transport has no such numbers.
    virtual unsigned WronglyNumbered() const { return 0; }

    /// What to wait on with poll(2) for input; -1 when Advance is to be called without waiting.
    virtual int Descriptor() const = 0;
    /// When Advance has to be called without any input; Clock::time_point::max() for never.
    virtual Clock::time_point NextTimer() const = 0;
    /// Takes in what has come and sends what is due. Waits for nothing, and returns after a bounded
    /// amount of work even when input comes without end.
    virtual void Advance(Clock::time_point now) = 0;
};

enum class RunResult { kDone, kIdle, kStopped };

/// Advances several pipelines together until `done` says so (kDone), nothing is pending in any of
/// them (kIdle), or the collection is to stop by deadline or interruption (kStopped; see stop.h).
/// The wait ends within a tenth of a second of an interruption.
RunResult RunPipelines(std::span<RequestPipeline* const> pipelines,
                       const std::function<bool()>& done);

/// Submits a request and runs the pipeline until its answer is there; empty when none came, and
/// when the collection is to stop.
std::optional<Response> ExchangeOver(RequestPipeline& pipeline, ipmi::Command command);

}  // namespace NQORTQR20
