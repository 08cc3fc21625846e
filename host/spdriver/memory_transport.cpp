#include "host/spdriver/memory_transport.h"

#include <algorithm>
#include <chrono>
#include <cstddef>
#include <utility>

#include "base/text.h"
#include "host/spdriver/stop.h"
#include "tqr/log.h"

namespace tqrhost {
namespace {

/// A reading older than this is asked for again.
constexpr auto kMaxAge = std::chrono::seconds(5);

/// Predictions that nobody has asked for; those beyond are forgotten.
constexpr std::size_t kMaxAhead = 256;

/// A read of a part of a sensor record under a reservation.
bool ReadsPartUnder(const std::optional<Response>& reservation, const ipmi::Command& command) {
    if (command.code() != ipmi::kGetSdr) return false;
    const auto read = ipmi::RecordRead::Parse(command.data);
    return read && read->offset != 0 && ReservationIn(reservation) == read->reservation;
}

void LogNoResponse(const ipmi::Command& command) {
    using NQORTQR20::ILogger;
    if (!NQORTQR20::fdrLogEnabled(ILogger::kNotice) || Stopped() != StopReason::kNone) return;
    NQORTQR20::fdrWriteLog(
        ILogger::kNotice,
        ipmisel::Format("No response to NetFn 0x%02x command 0x%02x: the BMC does not answer.",
                        command.netFn, command.command)
            .c_str());
}

}  // namespace

MemoryTransport::MemoryTransport(std::unique_ptr<RequestPipeline> pipeline, ControllerMemory memory)
    : pipeline_(std::move(pipeline)), memory_(std::move(memory)) {
    predictor_.SetSensors(memory_.sensors.get());
}

std::optional<Response> MemoryTransport::Exchange(const RequestFrame& request) {
    const ipmi::Command command = request.ToCommand();
    if (auto remembered = memory_.Answer(command)) return remembered;
    auto response = ExchangeLive(command);
    if (response && response->front() == ipmi::kReservationCanceled &&
        ReadsPartUnder(memory_.reservation, command)) {
        response = ReadUnderNewReservation(command);
    }
    return response;
}

std::vector<ipmi::Command> MemoryTransport::EndPass() {
    std::vector<ipmi::Command> commands;
    if (memory_.laterLogInfo) {
        memory_.logInfo = *std::exchange(memory_.laterLogInfo, std::nullopt);
        commands.push_back(ipmi::GetSelInfo());
    }
    if (memory_.laterSensorInfo) {
        memory_.sensorInfo = std::exchange(memory_.laterSensorInfo, std::nullopt);
        commands.push_back(ipmi::GetSdrRepositoryInfo());
    }
    return commands;
}

std::optional<Response> MemoryTransport::ExchangeLive(const ipmi::Command& command) {
    if (Stopped() != StopReason::kNone) return std::nullopt;
    predictor_.Requested(command);
    std::erase(announced_, command);
    std::optional<Response> response = TakeAhead(command);
    if (!response) {
        const auto answer = std::make_shared<Ahead>();
        pipeline_->Submit(command, [answer](std::optional<Response> got) {
            answer->came = true;
            answer->response = std::move(got);
        });
        RequestAhead();
        RequestPipeline* const pipelines[] = {pipeline_.get()};
        RunPipelines(pipelines, [&answer] { return answer->came; });
        response = std::move(answer->response);
        if (response && response->empty()) response.reset();
    } else {
        RequestAhead();
    }
    if (response) {
        predictor_.Answered(command, *response);
    } else {
        LogNoResponse(command);
    }
    return response;
}

std::optional<Response> MemoryTransport::TakeAhead(const ipmi::Command& command) {
    const auto found = ahead_.find(command);
    if (found == ahead_.end()) return std::nullopt;
    const std::shared_ptr<Ahead> ahead = std::move(found->second);
    ahead_.erase(found);
    RequestPipeline* const pipelines[] = {pipeline_.get()};
    RunPipelines(pipelines, [&ahead] { return ahead->came; });
    const bool good = ahead->response && !ahead->response->empty() &&
                      (ahead->announced || ahead->response->front() == ipmi::kCompleted) &&
                      Clock::now() - ahead->at <= kMaxAge;
    return good ? std::move(ahead->response) : std::nullopt;
}

void MemoryTransport::RequestAhead() {
    if (ahead_.size() > kMaxAhead) {
        std::erase_if(ahead_, [](const auto& one) { return one.second->came; });
    }
    while (!announced_.empty() && pipeline_->Room() > 0) {
        RequestAhead(std::move(announced_.front()), true);
        announced_.pop_front();
    }
    const auto isRequested = [this](const ipmi::Command& command) {
        return ahead_.contains(command);
    };
    for (ipmi::Command& command : predictor_.Next(pipeline_->Room(), isRequested)) {
        RequestAhead(std::move(command), false);
    }
}

void MemoryTransport::RequestAhead(ipmi::Command command, bool announced) {
    const auto ahead = std::make_shared<Ahead>();
    ahead->announced = announced;
    ahead_.emplace(command, ahead);
    pipeline_->Submit(command, [this, ahead, command](std::optional<Response> response) {
        if (response) predictor_.Answered(command, *response);
        ahead->came = true;
        ahead->at = Clock::now();
        ahead->response = std::move(response);
    });
}

void MemoryTransport::Announce(ipmi::Command command) {
    const bool known = ahead_.contains(command) || memory_.Answer(command) ||
                       std::ranges::find(announced_, command) != announced_.end();
    if (known || announced_.size() >= kMaxAhead) return;
    predictor_.Announced(command);
    announced_.push_back(std::move(command));
}

std::optional<Response> MemoryTransport::ReadUnderNewReservation(const ipmi::Command& command) {
    const auto reservation = ReservationIn(ExchangeOver(*pipeline_, ipmi::ReserveSdrRepository()));
    const auto read = ipmi::RecordRead::Parse(command.data);
    if (!reservation || !read) return Response{ipmi::kReservationCanceled};
    ipmi::Command again = ipmi::GetSdr(read->recordId, read->offset, read->count, *reservation);
    again.lun = command.lun;
    return ExchangeOver(*pipeline_, std::move(again));
}

}  // namespace tqrhost
