#include "plugins/standard/event.h"

#include "ipmi/event_types.h"
#include "ipmi/sensor_types.h"

namespace standard {

std::string_view SeverityOriginName(SeverityOrigin origin) {
    switch (origin) {
        case SeverityOrigin::kPlatform:
            return "platform";
        case SeverityOrigin::kUser:
            return "user";
        default:
            return "standard";
    }
}

std::string_view EventStateName(EventState state) {
    switch (state) {
        case EventState::kOpen:
            return "open";
        case EventState::kResolved:
            return "resolved";
        default:
            return "momentary";
    }
}

bool EventTarget::MayBe(const EventTarget& other) const {
    const auto mayBe = [](const auto& a, const auto& b) { return !a || !b || *a == *b; };
    return mayBe(memoryModule, other.memoryModule) && mayBe(slotNumber, other.slotNumber) &&
           mayBe(processorInstance, other.processorInstance) &&
           mayBe(sensorNumber, other.sensorNumber) && mayBe(fruDevice, other.fruDevice);
}

ipmi::SensorKey LoggedEvent::sensorKey() const {
    constexpr std::size_t kOwner = 7;
    return {
        .owner = record.bytes[kOwner], .lun = record.generator.lun, .number = record.sensorNumber};
}

const SensorFacts* LoggedEvent::agreeingSensor() const {
    return sensor != nullptr && sensor->sensor.sensorType == record.sensorType ? sensor : nullptr;
}

bool LoggedEvent::IsAsserted(std::uint8_t sensorType, std::uint8_t offset) const {
    return isSensorEvent() && !record.deassertion && record.sensorType == sensorType &&
           record.eventType == ipmi::kSensorSpecificEvents && record.offset() == offset;
}

bool IsLogCleared(const LoggedEvent& event) {
    constexpr std::uint8_t kCleared = 2;
    return event.IsAsserted(ipmi::sensor_type::kEventLoggingDisabled, kCleared);
}

}  // namespace standard
