#include "plugins/standard/node.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <cstddef>
#include <set>
#include <utility>

#include "ipmi/sdr_info.h"
#include "ipmi/self_test.h"
#include "ipmi/timestamp.h"
#include "plugins/standard/repository_reader.h"
#include "tqr/datetime.h"

namespace standard {
namespace {

/// The most records that the 16 bits of a record ID can tell apart, less first and last.
constexpr std::size_t kMaxRecords = 0xFFFF;

template <typename T, typename Read>
const T& Once(std::optional<T>* slot, Read read) {
    if (!*slot) *slot = read();
    return **slot;
}

/// The answer to a command, as a parse function of ipmi/ reads it.
template <typename Parse>
auto Query(Controller& controller, const ipmi::Command& command, Parse parse)
    -> decltype(parse(std::span<const std::uint8_t>())) {
    const auto data = controller.Completed(command);
    if (!data) return std::nullopt;
    return parse(*data);
}

bool HasThresholds(const ipmi::Sensor& sensor) { return sensor.IsThreshold() && sensor.IsAnalog(); }

bool HasReadableThresholds(const ipmi::Sensor& sensor) {
    return HasThresholds(sensor) && (sensor.thresholdAccess == ipmi::LimitAccess::kReadable ||
                                     sensor.thresholdAccess == ipmi::LimitAccess::kSettable);
}

/// A record's own ID, and that of the next one.
struct Link {
    std::uint16_t id;
    std::uint16_t next;
};

/// Walks a chain of records: `read` takes a record ID, and gives nothing to stop. A chain that
/// leads back ends where it does.
template <typename Read>
void Walk(Read read) {
    std::set<std::uint16_t> seen;
    std::uint16_t id = ipmi::kFirstRecordId;
    while (seen.size() < kMaxRecords && seen.insert(id).second) {
        const std::optional<Link> link = read(id);
        if (!link || link->next == ipmi::kLastRecordId) return;
        if (id == ipmi::kFirstRecordId) seen.insert(link->id);  // the first has a name of its own
        id = link->next;
    }
}

}  // namespace

const std::optional<ipmi::DeviceId>& Node::DeviceId() {
    return Once(&deviceId_,
                [&] { return Query(controller_, ipmi::GetDeviceId(), ipmi::ParseDeviceId); });
}

const std::optional<ipmi::Guid>& Node::Guid() {
    return Once(&guid_, [&] {
        auto guid = Query(controller_, ipmi::GetSystemGuid(), ipmi::ParseGuid);
        if (!guid) guid = Query(controller_, ipmi::GetDeviceGuid(), ipmi::ParseGuid);
        return guid;
    });
}

const std::optional<std::string>& Node::SelfTest() {
    return Once(&selfTest_,
                [&] { return Query(controller_, ipmi::GetSelfTestResults(), ipmi::SelfTestText); });
}

const std::optional<ipmi::ChassisStatus>& Node::Chassis() {
    return Once(&chassis_, [&] {
        return Query(controller_, ipmi::GetChassisStatus(), ipmi::ChassisStatus::Parse);
    });
}

const Clock& Node::GetClock() {
    return Once(&clock_, [&] { return ReadClock(); });
}

const std::optional<ipmi::SelInfo>& Node::LogInfo() {
    return Once(&logInfo_,
                [&] { return Query(controller_, ipmi::GetSelInfo(), ipmi::ParseSelInfo); });
}

const std::optional<ipmi::SelAllocation>& Node::LogAllocation() {
    return Once(&allocation_, [&]() -> std::optional<ipmi::SelAllocation> {
        if (!LogInfo() || !LogInfo()->allocationSupported) return std::nullopt;
        return Query(controller_, ipmi::GetSelAllocationInfo(), ipmi::ParseSelAllocation);
    });
}

const std::vector<ipmi::EventFilter>& Node::Filters() {
    return Once(&filters_, [&] { return ReadFilters(); });
}

const std::vector<ipmi::SdrRecord>& Node::Repository() {
    return Once(&repository_, [&] { return ReadRepository(); });
}

const std::vector<ipmi::Sensor>& Node::Sensors() {
    return Once(&sensors_, [&] {
        std::vector<ipmi::Sensor> all;
        for (const ipmi::SdrRecord& record : Repository()) {
            std::vector<ipmi::Sensor> some = record.Sensors();
            std::move(some.begin(), some.end(), std::back_inserter(all));
        }
        return all;
    });
}

const ipmi::Sensor* Node::FindSensor(const ipmi::SensorKey& key) {
    const auto& sensors = Sensors();
    const auto found = std::find_if(sensors.begin(), sensors.end(),
                                    [&](const ipmi::Sensor& sensor) { return sensor.key == key; });
    return found == sensors.end() ? nullptr : &*found;
}

bool Node::IsReadable(const ipmi::Sensor& sensor) {
    return sensor.type != ipmi::SdrType::kEventOnly && sensor.key.owner == ipmi::kBmcAddress &&
           sensor.channel == 0;
}

const SensorState& Node::StateOf(const ipmi::Sensor& sensor) {
    const std::pair which{sensor.recordId, sensor.key};
    const auto known = states_.find(which);
    if (known != states_.end()) return known->second;
    return states_.emplace(which, ReadState(sensor)).first->second;
}

void Node::AnnounceState(const ipmi::Sensor& sensor) {
    if (!IsReadable(sensor)) return;
    const ipmi::SensorKey& key = sensor.key;
    if (!readings_.contains(key)) {
        controller_.Announce(std::to_array({ipmi::GetSensorReading(key.number, key.lun)}));
    }
    if (HasReadableThresholds(sensor) && !thresholds_.contains(key)) {
        controller_.Announce(std::to_array({ipmi::GetSensorThresholds(key.number, key.lun)}));
    }
}

std::optional<double> Node::ValueOf(const ipmi::Sensor& sensor, std::uint8_t raw) {
    if (!sensor.IsAnalog()) return std::nullopt;
    const ipmi::Conversion& conversion = sensor.analog->conversion;
    if (!conversion.IsNonLinear()) return conversion.Value(raw);
    if (!IsReadable(sensor)) return std::nullopt;
    const auto [asked, isNew] = factors_.try_emplace({sensor.key, raw});
    if (isNew) {
        asked->second = Query(controller_,
                              ipmi::GetSensorReadingFactors(sensor.key.number, raw, sensor.key.lun),
                              ipmi::SensorReadingFactors::Parse);
    }
    if (!asked->second) return std::nullopt;
    return conversion.ValueByFactors(raw, asked->second->factors);
}

const std::optional<Answer>& Node::ReadingOf(const ipmi::SensorKey& key) {
    const auto [answer, isNew] = readings_.try_emplace(key);
    if (isNew) answer->second = controller_.Send(ipmi::GetSensorReading(key.number, key.lun));
    return answer->second;
}

const std::optional<ipmi::SensorThresholds>& Node::ThresholdsOf(const ipmi::SensorKey& key) {
    const auto [thresholds, isNew] = thresholds_.try_emplace(key);
    if (isNew) {
        thresholds->second = Query(controller_, ipmi::GetSensorThresholds(key.number, key.lun),
                                   ipmi::SensorThresholds::Parse);
    }
    return thresholds->second;
}

SensorState Node::ReadState(const ipmi::Sensor& sensor) {
    SensorState state;
    if (!IsReadable(sensor)) return state;
    if (const auto& answer = ReadingOf(sensor.key)) {
        auto reading = answer->Completed() ? ipmi::SensorReading::Parse(answer->data)
                                           : std::optional<ipmi::SensorReading>();
        state.unavailable = !answer->Completed() || (reading && !reading->Available());
        if (reading && reading->Available()) {
            state.value = ValueOf(sensor, reading->raw);
            state.reading = reading;
        }
    }
    if (!HasThresholds(sensor)) return state;
    state.thresholds = sensor.FixedThresholds();
    if (HasReadableThresholds(sensor)) {
        if (const auto& asked = ThresholdsOf(sensor.key)) state.thresholds = *asked;
    }
    for (std::size_t i = 0; i < ipmi::kThresholdCount; ++i) {
        if (const auto raw = state.thresholds.Get(static_cast<ipmi::Threshold>(i))) {
            state.limits[i] = ValueOf(sensor, *raw);
        }
    }
    return state;
}

Clock Node::ReadClock() {
    constexpr double kSecond = 1e6;  // microseconds
    Clock clock;
    clock.utcOffsetMinutes =
        Query(controller_, ipmi::GetSelTimeUtcOffset(), ipmi::ParseSelTimeUtcOffset);
    const std::int64_t before = NQORTQR20::TOSSpecific::GetLocalTime().TotalMicroseconds();
    const auto seconds = Query(controller_, ipmi::GetSelTime(), ipmi::ParseSelTime);
    const std::int64_t after = NQORTQR20::TOSSpecific::GetLocalTime().TotalMicroseconds();
    if (!seconds || ipmi::KindOfTime(*seconds) != ipmi::TimeKind::kClock) return clock;
    clock.time = std::int64_t{*seconds} - std::int64_t{60} * clock.utcOffsetMinutes.value_or(0);
    // Halfway through the exchange. The controller's second has begun, half a second ago as likely
    // as not; a collector's clock in whole seconds is cut in the same way.
    const double between = (static_cast<double>(before) + static_cast<double>(after)) / 2 / kSecond;
    const bool wholeSeconds = std::floor(between) == between;
    const double offset = static_cast<double>(*clock.time) + (wholeSeconds ? 0 : 0.5) - between;
    clock.offsetSeconds = std::round(offset * 1000) / 1000;
    const double roundTrip = static_cast<double>(std::max<std::int64_t>(0, after - before));
    clock.uncertaintySeconds = std::round((roundTrip / kSecond / 2 + 0.5) * 1000) / 1000;
    return clock;
}

std::vector<ipmi::SelRecord> Node::ReadLog() {
    std::vector<ipmi::SelRecord> records;
    if (LogInfo()) {
        if (LogInfo()->records == 0) return records;
        records.reserve(LogInfo()->records);
    }
    Walk([&](std::uint16_t id) -> std::optional<Link> {
        const auto entry = Query(controller_, ipmi::GetSelEntry(id), ipmi::ParseSelEntry);
        if (!entry) return std::nullopt;
        records.push_back(entry->record);
        return Link{entry->record.id, entry->nextRecordId};
    });
    return records;
}

std::vector<ipmi::EventFilter> Node::ReadFilters() {
    constexpr std::size_t kRevisionLength = 1;
    std::vector<ipmi::EventFilter> filters;
    const auto count =
        controller_.Completed(ipmi::GetPefConfigurationParameters(ipmi::kPefEventFilterCount));
    if (!count || count->size() <= kRevisionLength) return filters;
    const unsigned last = (*count)[kRevisionLength] & 0x7F;
    std::vector<ipmi::Command> entries;
    for (unsigned number = 1; number <= last; ++number) {
        entries.push_back(ipmi::GetPefConfigurationParameters(ipmi::kPefEventFilter,
                                                              static_cast<std::uint8_t>(number)));
    }
    controller_.Announce(entries);
    for (const ipmi::Command& command : entries) {
        const auto entry = controller_.Completed(command);
        if (!entry || entry->size() <= kRevisionLength) return filters;
        const auto filter = ipmi::EventFilter::Parse(std::span(*entry).subspan(kRevisionLength));
        if (!filter) return filters;
        filters.push_back(*filter);
    }
    return filters;
}

std::vector<ipmi::SdrRecord> Node::ReadRepository() {
    std::vector<ipmi::SdrRecord> records;
    const auto info =
        Query(controller_, ipmi::GetSdrRepositoryInfo(), ipmi::SdrRepositoryInfo::Parse);
    if (info && info->records == 0) return records;
    RepositoryReader reader(controller_);
    Walk([&](std::uint16_t id) -> std::optional<Link> {
        const auto record = reader.Read(id);
        if (!record) return std::nullopt;
        auto parsed = ipmi::SdrRecord::Parse(record->bytes);
        const std::uint16_t own = parsed ? parsed->header.recordId : id;
        if (parsed) records.push_back(*std::move(parsed));
        return Link{own, record->nextRecordId};
    });
    // The host compares this answer with the one before: whether it changed while it was read.
    if (info) controller_.Send(ipmi::GetSdrRepositoryInfo());
    return records;
}

}  // namespace standard
