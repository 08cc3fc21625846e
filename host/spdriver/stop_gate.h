#pragma once

#include <memory>
#include <optional>
#include <utility>

#include "host/spdriver/stop.h"
#include "host/spdriver/transport.h"

namespace tqrhost {

/// Lets nothing through once the collection is to stop, by a deadline or an interruption.
class StopGate : public Transport {
public:
    explicit StopGate(std::unique_ptr<Transport> transport) : transport_(std::move(transport)) {}
    std::optional<Response> Exchange(const RequestFrame& request) override {
        if (Stopped() != StopReason::kNone) return std::nullopt;
        return transport_->Exchange(request);
    }

private:
    std::unique_ptr<Transport> transport_;
};

}  // namespace tqrhost
