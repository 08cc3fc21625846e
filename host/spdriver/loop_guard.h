#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <optional>
#include <vector>

#include "host/spdriver/transport.h"

namespace tqrhost {

/// Ends walks over the event log and the sensor repository that a BMC leads in a circle: a read of
/// a record that the same walk has already been given gets no answer. Everything else goes through
/// unchanged.
///
/// A walk begins with Get SEL Info (event log) or with Reserve SDR Repository or Get SDR Repository
/// Info (sensor repository), with the first read after a failed one, and, when an answer has named
/// no next record, with the next read of the first record.
class LoopGuard : public Transport {
public:
    explicit LoopGuard(std::unique_ptr<Transport> transport);
    std::optional<Response> Exchange(const RequestFrame& request) override;
    /// Whether the last read got no answer because it was one round too many.
    bool EndedCircle() const { return endedCircle_; }

private:
    /// What one walk has been given.
    class Walk {
    public:
        void Restart();
        bool WasGiven(std::uint16_t record, std::uint8_t offset) const;
        void Given(std::uint16_t record, std::uint8_t offset);
        bool ended = false;  ///< an answer has named no next record

    private:
        std::map<std::uint8_t, std::vector<bool>> given_;  ///< by offset, then by record ID
    };

    std::optional<Response> Read(Walk* walk, bool isEventLog, const RequestFrame& request);

    std::unique_ptr<Transport> transport_;
    Walk eventLog_;
    Walk sensorRepository_;
    bool endedCircle_ = false;
};

}  // namespace tqrhost
