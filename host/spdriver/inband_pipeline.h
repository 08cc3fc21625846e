#pragma once

#include <chrono>
#include <cstddef>
#include <deque>
#include <map>
#include <memory>
#include <string>
#include <utility>

#include "host/spdriver/kernel_device.h"
#include "host/spdriver/pipeline.h"

namespace tqrhost {

/// This machine's BMC through the kernel's IPMI driver. The driver hands the controller one message
/// after the other; a few stand ready there so that it never waits for this process.
class InbandPipeline : public RequestPipeline {
public:
    InbandPipeline(std::unique_ptr<IpmiDevice> device, std::chrono::milliseconds timeout)
        : device_(std::move(device)), timeout_(timeout) {}
    void Submit(ipmi::Command command, Handler handler) override;
    std::size_t Pending() const override { return queue_.size() + sent_.size(); }
    std::size_t Room() const override;
    /// The BMC has fallen silent: it answered nothing at all for as long as one request may go
    /// unanswered, and could not be reached anew within that time. What is pending and what is
    /// submitted from then on is answered with nothing at once.
    bool Dead() const { return dead_; }
    int Descriptor() const override { return device_->Descriptor(); }
    Clock::time_point NextTimer() const override;
    void Advance(Clock::time_point now) override;

private:
    static constexpr std::size_t kWindow = 4;

    struct Sent {
        Handler handler;
        Clock::time_point deadline;
    };

    void SendQueued(Clock::time_point now);
    /// The device is of no use any more, or the controller silent: nobody gets an answer.
    void Die();

    std::unique_ptr<IpmiDevice> device_;
    std::chrono::milliseconds timeout_;
    std::deque<std::pair<ipmi::Command, Handler>> queue_;
    std::map<long, Sent> sent_;  ///< by message ID, which counts up: the oldest first
    long lastId_ = 0;
    Clock::time_point lastHeard_{};
    bool dead_ = false;
};

}  // namespace tqrhost
