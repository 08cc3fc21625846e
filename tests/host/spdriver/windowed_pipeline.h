#pragma once

#include <algorithm>
#include <cstddef>
#include <deque>
#include <functional>
#include <memory>
#include <utility>
#include <vector>

#include "host/spdriver/pipeline.h"
#include "simulator/simulated_bmc.h"

namespace ipmiseltest {

/// A simulated BMC behind a pipeline of a fixed window, which answers the newest request first
/// where it is told to, and keeps what it was asked.
class WindowedPipeline : public NQORTQR20::RequestPipeline {
public:
    struct Conditions {
        std::size_t window = 1;
        bool newestFirst = false;
        /// Called before a request is executed, with the BMC that will; the number counts from 1.
        std::function<void(std::size_t number, const ipmi::Command&, ipmisim::SimulatedBmc*)>
            before = {};
    };

    WindowedPipeline(const ipmisim::BmcDescription& bmc, Conditions conditions,
                     std::vector<ipmi::Command>* asked)
        : bmc_(bmc), conditions_(std::move(conditions)), asked_(asked) {}

    void Submit(ipmi::Command command, Handler handler) override {
        queue_.emplace_back(std::move(command), std::move(handler));
    }
    std::size_t Pending() const override { return queue_.size(); }
    std::size_t Room() const override {
        return queue_.size() < conditions_.window ? conditions_.window - queue_.size() : 0;
    }
    int Descriptor() const override { return -1; }
    Clock::time_point NextTimer() const override { return Clock::time_point::min(); }
    void Advance(Clock::time_point) override {
        // Those that are outstanding at a time, one after the other.
        if (batch_ == 0) batch_ = std::min(conditions_.window, queue_.size());
        --batch_;
        const auto next =
            queue_.begin() + static_cast<std::ptrdiff_t>(conditions_.newestFirst ? batch_ : 0);
        const auto [command, handler] = std::move(*next);
        queue_.erase(next);
        asked_->push_back(command);
        if (conditions_.before) conditions_.before(asked_->size(), command, &bmc_);
        handler(bmc_.Execute(command.netFn, command.lun, command.command, command.data));
    }

private:
    ipmisim::SimulatedBmc bmc_;
    Conditions conditions_;
    std::vector<ipmi::Command>* asked_;
    std::deque<std::pair<ipmi::Command, Handler>> queue_;
    std::size_t batch_ = 0;
};

}  // namespace ipmiseltest
