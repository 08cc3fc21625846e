#pragma once

#include <deque>
#include <memory>
#include <utility>

#include "host/spdriver/pipeline.h"

namespace tqrhost {

/// A pipeline over a way that takes one request at a time.
class SerialPipeline : public RequestPipeline {
public:
    explicit SerialPipeline(std::unique_ptr<Transport> transport)
        : transport_(std::move(transport)) {}
    void Submit(ipmi::Command command, Handler handler) override {
        queue_.emplace_back(std::move(command), std::move(handler));
    }
    std::size_t Pending() const override { return queue_.size(); }
    std::size_t Room() const override { return queue_.empty() ? 1 : 0; }
    int Descriptor() const override { return -1; }
    Clock::time_point NextTimer() const override {
        return queue_.empty() ? Clock::time_point::max() : Clock::time_point::min();
    }
    void Advance(Clock::time_point) override {
        if (queue_.empty()) return;
        const auto [command, handler] = std::move(queue_.front());
        queue_.pop_front();
        handler(transport_->Exchange(RequestFrame(command)));
    }

private:
    std::unique_ptr<Transport> transport_;
    std::deque<std::pair<ipmi::Command, Handler>> queue_;
};

}  // namespace tqrhost
