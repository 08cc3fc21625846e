#pragma once

#include <deque>
#include <map>
#include <memory>
#include <optional>
#include <vector>

#include "host/spdriver/command_predictor.h"
#include "host/spdriver/controller_memory.h"
#include "host/spdriver/pipeline.h"
#include "host/spdriver/transport.h"

namespace tqrhost {

/// Answers from what was read of a controller before; what is not in there goes to the controller,
/// with what is announced, then what will probably be asked next behind it. A prediction's answer
/// counts only when it is a good one, so that the reader sees what it would have seen without.
class MemoryTransport : public Transport {
public:
    MemoryTransport(std::unique_ptr<RequestPipeline> pipeline, ControllerMemory memory);
    std::optional<Response> Exchange(const RequestFrame& request) override;
    /// A request that will come: it goes out with the next one that does not wait for its answer.
    void Announce(ipmi::Command command);
    /// The pass is over. Get SEL Info and Get SDR Repository Info, where log or repository are
    /// known to have changed since they were read: from now on they are answered with the later
    /// state.
    std::vector<ipmi::Command> EndPass();

private:
    using Clock = RequestPipeline::Clock;
    struct Ahead {
        bool announced = false;  ///< no guess: whatever comes is the answer
        bool came = false;
        Clock::time_point at;  ///< when it came
        std::optional<Response> response;
    };

    std::optional<Response> ExchangeLive(const ipmi::Command& command);
    /// A prediction's answer, waited for if it is on its way; empty when there is none, or no good
    /// one.
    std::optional<Response> TakeAhead(const ipmi::Command& command);
    void RequestAhead();
    void RequestAhead(ipmi::Command command, bool announced);
    /// A part of a record is refused because the controller holds the reservation from the reading
    /// no longer: the reader could not know, so a new one is taken for it.
    std::optional<Response> ReadUnderNewReservation(const ipmi::Command& command);

    std::unique_ptr<RequestPipeline> pipeline_;
    ControllerMemory memory_;
    CommandPredictor predictor_;
    std::map<ipmi::Command, std::shared_ptr<Ahead>> ahead_;
    std::deque<ipmi::Command> announced_;  ///< and not asked yet
};

}  // namespace tqrhost
