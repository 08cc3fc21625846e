#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "ipmi/guid.h"
#include "ipmi/pef.h"
#include "ipmi/sdr_record.h"
#include "ipmi/sel_record.h"
#include "ipmi/sensor_reading.h"

// What was read of one node, as plain values: the reader fills them, the classes are derived from
// them.

namespace standard {

/// A sensor of the repository and what its controller answered for it.
struct SensorFacts {
    ipmi::Sensor sensor;
    std::optional<ipmi::SensorReading> reading;
    std::optional<ipmi::SensorThresholds> thresholds;
};

/// The controller's clock against the collector's, in seconds.
struct ClockFacts {
    double offset =
        0;  ///< the controller's time, less its UTC offset where known, less the collector's
    double uncertainty = 0;  ///< half the round trip and what a clock of whole seconds hides
};

struct NodeFacts {
    unsigned number = 1;  ///< from 1
    std::string systemName;
    std::string serialNumber;        ///< of the system; empty when unknown
    std::optional<ipmi::Guid> guid;  ///< as on the wire
    std::optional<int> utcOffsetMinutes;
    std::optional<ClockFacts> clock;
    std::vector<ipmi::SelRecord> log;  ///< in log order
    std::vector<SensorFacts> sensors;  ///< in repository order; shared records one by one
    std::vector<ipmi::EventFilter> filters;

    /// The sensor of an owner, LUN and number; null when the repository has none.
    const SensorFacts* FindSensor(const ipmi::SensorKey& key) const;
};

}  // namespace standard
