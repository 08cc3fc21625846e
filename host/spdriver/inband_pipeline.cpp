#include "host/spdriver/inband_pipeline.h"

#include <algorithm>
#include <cstring>
#include <string>

#include "tqr/log.h"

namespace tqrhost {
namespace {

/// So many at a time, that a device which never runs dry does not hold up the clock.
constexpr int kMaxMessages = 64;

void LogFailure(const char* what, int error) {
    const std::string line =
        std::string("The IPMI driver ") + what + ": " + std::strerror(error) + ".";
    NQORTQR20::fdrWriteLog(NQORTQR20::ILogger::kNotice, line.c_str());
}

}  // namespace

void InbandPipeline::Submit(ipmi::Command command, Handler handler) {
    queue_.emplace_back(std::move(command), std::move(handler));
    if (!dead_) SendQueued(Clock::now());
}

std::size_t InbandPipeline::Room() const {
    return dead_ || Pending() >= kWindow ? 0 : kWindow - Pending();
}

RequestPipeline::Clock::time_point InbandPipeline::NextTimer() const {
    if (dead_ || !queue_.empty()) return Clock::time_point::min();
    return sent_.empty() ? Clock::time_point::max() : sent_.begin()->second.deadline;
}

void InbandPipeline::SendQueued(Clock::time_point now) {
    while (sent_.size() < kWindow && !queue_.empty()) {
        const long id = ++lastId_;
        if (const int error = device_->Send(id, queue_.front().first); error != 0) {
            // With others on their way it may be short of room only: tried again when one has come.
            if (!sent_.empty()) return;
            LogFailure("takes no message", error);
            dead_ = true;
            return;
        }
        if (sent_.empty()) lastHeard_ = now;
        sent_.emplace(id, Sent{std::move(queue_.front().second), now + timeout_});
        queue_.pop_front();
    }
}

void InbandPipeline::Advance(Clock::time_point now) {
    int error = 0;
    for (int i = 0; i < kMaxMessages && !dead_; ++i) {
        auto message = device_->Receive(&error);
        if (!message) break;
        lastHeard_ = now;
        const auto sent = sent_.find(message->id);
        if (sent == sent_.end()) continue;  // too late
        const Handler handler = std::move(sent->second.handler);
        sent_.erase(sent);
        std::optional<Response> response;
        if (!message->response.empty()) response = std::move(message->response);
        handler(std::move(response));
    }
    if (error != 0) {
        LogFailure("gives no message", error);
        dead_ = true;
    }
    while (!dead_ && !sent_.empty() && sent_.begin()->second.deadline <= now) {
        dead_ = now - lastHeard_ >= timeout_;
        const Handler handler = std::move(sent_.begin()->second.handler);
        sent_.erase(sent_.begin());
        handler(std::nullopt);
    }
    if (!dead_) SendQueued(now);
    if (dead_) Die();
}

void InbandPipeline::Die() {
    std::deque<Handler> handlers;
    for (auto& [id, sent] : sent_) handlers.push_back(std::move(sent.handler));
    for (auto& [command, handler] : queue_) handlers.push_back(std::move(handler));
    sent_.clear();
    queue_.clear();
    for (const Handler& handler : handlers) handler(std::nullopt);
}

}  // namespace tqrhost
