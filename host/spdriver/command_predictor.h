#pragma once

#include <cstddef>
#include <cstdint>
#include <map>
#include <optional>
#include <utility>
#include <vector>

#include "host/spdriver/record_store.h"
#include "host/spdriver/transport.h"
#include "ipmi/command.h"

namespace tqrhost {

/// Says what a reader of a controller will probably ask next, from what it has asked: the further
/// chunks of a FRU device, and of the sensors that follow in the repository what it asked of the
/// last ones. Only commands that change nothing are ever predicted.
class CommandPredictor {
public:
    /// The repository whose order sensors are expected in; null for none. Borrowed.
    void SetSensors(const RecordStore* records) { records_ = records; }
    /// The reader asks this now.
    void Asked(const ipmi::Command& command);
    /// The answer to it, or to a prediction.
    void Answered(const ipmi::Command& command, const Response& response);
    /// At most `count` requests that are expected after the last one that was asked, in their
    /// order.
    std::vector<ipmi::Command> Next(std::size_t count) const;

private:
    struct Sensor {
        std::uint8_t lun = 0;
        std::uint8_t number = 0;
        bool hasThresholds = false;
    };

    void FindSensors();
    void AskedOfSensor(const ipmi::Command& command);
    void AppendFruChunks(std::size_t count, std::vector<ipmi::Command>* commands) const;
    void AppendSensors(std::size_t count, std::vector<ipmi::Command>* commands) const;

    const RecordStore* records_ = nullptr;
    bool foundSensors_ = false;
    std::vector<Sensor> sensors_;  ///< of the controller itself, in repository order
    std::map<std::pair<std::uint8_t, std::uint8_t>, std::size_t> positions_;  ///< by LUN and number
    std::optional<ipmi::Command> now_;
    std::map<std::uint8_t, std::size_t> fruSizes_;  ///< by device
    std::optional<std::size_t> sensor_;             ///< position of the one asked of last
    std::vector<ipmi::CommandCode> ofThisSensor_;
    std::vector<ipmi::CommandCode> ofLastSensor_;
    unsigned jumps_ = 0;  ///< times that another sensor than the next one was asked of
    bool inOrder_ = false;
};

}  // namespace tqrhost
