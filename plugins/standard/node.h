#pragma once

#include <array>
#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <vector>

#include "ipmi/chassis_status.h"
#include "ipmi/device_id.h"
#include "ipmi/guid.h"
#include "ipmi/pef.h"
#include "ipmi/sdr_record.h"
#include "ipmi/sel_info.h"
#include "ipmi/sel_record.h"
#include "ipmi/sensor_reading.h"
#include "plugins/standard/controller.h"

namespace standard {

/// The controller's clock against the collector's.
struct Clock {
    std::optional<std::int64_t> time;  ///< the controller's, seconds since 1970-01-01 UTC
    std::optional<int> utcOffsetMinutes;
    std::optional<double> offsetSeconds;  ///< the controller's time less the collector's
    std::optional<double> uncertaintySeconds;
};

/// What a sensor said, as values.
struct SensorState {
    /// The controller answered with a completion code, or that the reading is unavailable.
    bool unavailable = false;
    std::optional<ipmi::SensorReading> reading;  ///< where it means something
    std::optional<double> value;
    ipmi::SensorThresholds thresholds;  ///< those that could be had
    std::array<std::optional<double>, ipmi::kThresholdCount> limits{};
};

/// One controller in a pass. Each fact is asked for when it is first wanted, and once, so that the
/// classes that were asked for decide what is read; a record is never read a second time. What
/// could not be had is empty: what is missing, and why, is in the host's account of completeness.
class Node {
public:
    /// `number` counts from 1.
    Node(unsigned number, NQORTQR20::SPLibrary& library) : number_(number), controller_(library) {}

    unsigned number() const { return number_; }
    Controller& controller() { return controller_; }

    const std::optional<ipmi::DeviceId>& DeviceId();
    /// The system's, else the controller's own.
    const std::optional<ipmi::Guid>& Guid();
    const std::optional<std::string>& SelfTest();
    const std::optional<ipmi::ChassisStatus>& Chassis();
    const Clock& GetClock();

    const std::optional<ipmi::SelInfo>& LogInfo();
    const std::optional<ipmi::SelAllocation>& LogAllocation();
    /// The event log in its order, up to the first record that could not be read. It is long: the
    /// caller keeps it, and reads it once.
    std::vector<ipmi::SelRecord> ReadLog();
    /// The controller's event filters, in the order in which it tries them.
    const std::vector<ipmi::EventFilter>& Filters();

    /// The sensor repository in its order, as far as it could be read.
    const std::vector<ipmi::SdrRecord>& Repository();
    /// Its sensors; shared records stand for each of theirs.
    const std::vector<ipmi::Sensor>& Sensors();
    /// Null for a sensor that the repository does not have. Of several with one key the first.
    const ipmi::Sensor* FindSensor(const ipmi::SensorKey& key);
    /// Whether the controller itself owns the sensor and can be asked for it.
    static bool IsReadable(const ipmi::Sensor& sensor);
    /// What a sensor of Sensors() says now, and its limits; nothing for one that is not readable.
    const SensorState& StateOf(const ipmi::Sensor& sensor);
    /// StateOf will be wanted.
    void AnnounceState(const ipmi::Sensor& sensor);
    /// A raw reading or threshold of a sensor in its unit; factors are asked for where they vary.
    std::optional<double> ValueOf(const ipmi::Sensor& sensor, std::uint8_t raw);

private:
    Clock ReadClock();
    std::vector<ipmi::EventFilter> ReadFilters();
    std::vector<ipmi::SdrRecord> ReadRepository();
    SensorState ReadState(const ipmi::Sensor& sensor);
    const std::optional<Answer>& ReadingOf(const ipmi::SensorKey& key);
    const std::optional<ipmi::SensorThresholds>& ThresholdsOf(const ipmi::SensorKey& key);

    unsigned number_;
    Controller controller_;
    // Empty until asked for.
    std::optional<std::optional<ipmi::DeviceId>> deviceId_;
    std::optional<std::optional<ipmi::Guid>> guid_;
    std::optional<std::optional<std::string>> selfTest_;
    std::optional<std::optional<ipmi::ChassisStatus>> chassis_;
    std::optional<Clock> clock_;
    std::optional<std::optional<ipmi::SelInfo>> logInfo_;
    std::optional<std::optional<ipmi::SelAllocation>> allocation_;
    std::optional<std::vector<ipmi::EventFilter>> filters_;
    std::optional<std::vector<ipmi::SdrRecord>> repository_;
    std::optional<std::vector<ipmi::Sensor>> sensors_;
    // What the controller answered for a sensor, whichever of its records it was asked by.
    std::map<ipmi::SensorKey, std::optional<Answer>> readings_;
    std::map<ipmi::SensorKey, std::optional<ipmi::SensorThresholds>> thresholds_;
    std::map<std::pair<ipmi::SensorKey, std::uint8_t>, std::optional<ipmi::SensorReadingFactors>>
        factors_;
    std::map<std::pair<std::uint16_t, ipmi::SensorKey>, SensorState> states_;  // of each record
};

}  // namespace standard
