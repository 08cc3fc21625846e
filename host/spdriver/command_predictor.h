#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <map>
#include <optional>
#include <utility>
#include <vector>

#include "host/spdriver/record_store.h"
#include "host/spdriver/transport.h"
#include "ipmi/command.h"
#include "ipmi/fru_device_reader.h"

namespace tqrhost {

/// Says what a reader of a controller will probably ask next, from what it has asked: the further
/// chunks of a FRU device, and of the sensors that follow in the repository what it asked of the
/// last ones; where it has announced that it will read further FRU devices, their chunks too. Only
/// commands that change nothing are ever predicted.
class CommandPredictor {
public:
    /// Whether a request is on its way, or its answer there.
    using IsRequested = std::function<bool(const ipmi::Command&)>;

    /// The repository whose order sensors are expected in; null for none. Borrowed.
    void SetSensors(const RecordStore* records) { records_ = records; }
    /// The reader will ask this.
    void Announced(const ipmi::Command& command);
    /// The reader asks this now.
    void Requested(const ipmi::Command& command);
    /// The answer to it, or to a prediction.
    void Answered(const ipmi::Command& command, const Response& response);
    /// At most `count` requests that are expected after the last one that was asked, in their
    /// order, and that are not asked already.
    std::vector<ipmi::Command> Next(std::size_t count, const IsRequested& isRequested) const;

private:
    struct Sensor {
        std::uint8_t lun = 0;
        std::uint8_t number = 0;
        bool hasThresholds = false;
    };

    void FindSensors();
    void RequestedOfSensor(const ipmi::Command& command);
    /// Takes a request; false when no further one is wanted.
    using Add = std::function<bool(ipmi::Command)>;
    struct FruPlace {
        std::uint8_t device = 0;
        std::uint8_t lun = 0;
        auto operator<=>(const FruPlace&) const = default;
    };

    void RequestedOfFru(const ipmi::Command& command);
    void AddFruChunks(const Add& add) const;
    void AddFruToCome(const Add& add) const;
    bool AddFruChunksFrom(std::size_t offset, std::uint8_t chunk, FruPlace place,
                          const Add& add) const;
    void AddSensors(const Add& add) const;

    const RecordStore* records_ = nullptr;
    bool foundSensors_ = false;
    std::vector<Sensor> sensors_;  ///< of the controller itself, in repository order
    std::map<std::pair<std::uint8_t, std::uint8_t>, std::size_t> positions_;  ///< by LUN and number
    std::optional<ipmi::Command> now_;
    std::map<FruPlace, ipmi::FruAreaInfo> fruAreas_;
    std::vector<FruPlace> fruToCome_;  ///< announced, and nothing of it read
    std::optional<FruPlace> fruBegun_;
    std::uint8_t fruChunk_ = 0;          ///< that a device is begun with; 0 when that is not known
    std::optional<std::size_t> sensor_;  ///< position of the one asked of last
    std::vector<ipmi::CommandCode> ofThisSensor_;
    std::vector<ipmi::CommandCode> ofLastSensor_;
    unsigned jumps_ = 0;  ///< times that another sensor than the next one was asked of
    bool inOrder_ = false;
};

}  // namespace tqrhost
