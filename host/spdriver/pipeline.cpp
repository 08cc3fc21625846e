#include "host/spdriver/pipeline.h"

#include <poll.h>

#include <algorithm>
#include <chrono>
#include <ctime>
#include <vector>

#include "host/spdriver/stop.h"

namespace NQORTQR20 {
namespace {

using Clock = RequestPipeline::Clock;

/// A signal may come between the look at the clock and the wait: none is longer than this.
constexpr auto kMaxWait = std::chrono::milliseconds(100);

/// Waits until one of the pipelines has input or a timer.
void Wait(std::span<RequestPipeline* const> pipelines) {
    const auto now = Clock::now();
    auto until = std::min(now + kMaxWait, StopTime());
    std::vector<pollfd> waits;
    waits.reserve(pipelines.size());
    for (const RequestPipeline* pipeline : pipelines) {
        if (pipeline->Pending() == 0) continue;
        if (pipeline->Descriptor() < 0) return;
        waits.push_back({pipeline->Descriptor(), POLLIN, 0});
        until = std::min(until, pipeline->NextTimer());
    }
    // What is due since the beginning of time is too far away to be subtracted.
    const auto rest = std::max(until, now) - now;
    // Counted in the types of timespec, which are narrower than those of the clock on 32 bits.
    using Seconds = std::chrono::duration<std::time_t>;
    using Nanoseconds = std::chrono::duration<long, std::nano>;
    const auto seconds = std::chrono::duration_cast<Seconds>(rest);
    const auto nanoseconds = std::chrono::duration_cast<Nanoseconds>(rest - seconds);
    const timespec time{seconds.count(), nanoseconds.count()};
    ppoll(waits.data(), waits.size(), &time, nullptr);
}

}  // namespace

RunResult RunPipelines(std::span<RequestPipeline* const> pipelines,
                       const std::function<bool()>& done) {
    for (;;) {
        for (RequestPipeline* pipeline : pipelines) {
            if (Stopped() != StopReason::kNone) return RunResult::kStopped;
            if (pipeline->Pending() != 0) pipeline->Advance(Clock::now());
        }
        if (done()) return RunResult::kDone;
        if (Stopped() != StopReason::kNone) return RunResult::kStopped;
        const bool idle = std::all_of(pipelines.begin(), pipelines.end(), [](const auto* pipeline) {
            return pipeline->Pending() == 0;
        });
        if (idle) return RunResult::kIdle;
        Wait(pipelines);
    }
}

std::optional<Response> ExchangeOver(RequestPipeline& pipeline, ipmi::Command command) {
    struct Answer {
        bool came = false;
        std::optional<Response> response;
    };
    // Shared: a stop leaves the request behind in the pipeline, whose handler may still be called.
    const auto answer = std::make_shared<Answer>();
    pipeline.Submit(std::move(command), [answer](std::optional<Response> response) {
        answer->came = true;
        answer->response = std::move(response);
    });
    RequestPipeline* const pipelines[] = {&pipeline};
    RunPipelines(pipelines, [&answer] { return answer->came; });
    return std::move(answer->response);
}

}  // namespace NQORTQR20
