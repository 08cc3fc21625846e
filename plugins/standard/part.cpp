#include "plugins/standard/part.h"

#include <algorithm>
#include <array>

#include "ipmi/entities.h"
#include "ipmi/sensor_types.h"
#include "plugins/standard/event.h"

namespace standard {

std::string CandidateText(const Part& part) {
    std::string text = part.name;
    if (!part.partNumber.empty()) text += ", part number " + part.partNumber;
    if (!part.serialNumber.empty()) text += ", serial number " + part.serialNumber;
    return text;
}

std::optional<unsigned> NumberAtEnd(std::string_view label) {
    constexpr std::size_t kMaxDigits = 4;
    const std::size_t last = label.find_last_not_of("0123456789");
    const std::string_view digits = last == label.npos ? label : label.substr(last + 1);
    if (digits.empty() || digits.size() > kMaxDigits) return std::nullopt;
    unsigned number = 0;
    for (const char digit : digits) number = number * 10 + static_cast<unsigned>(digit - '0');
    return number;
}

bool TellsOfItsEntity(const ipmi::Sensor& sensor) {
    namespace type = ipmi::sensor_type;
    constexpr auto kTypes =
        std::to_array<std::uint8_t>({type::kModule, type::kAddInCard, type::kChassis,
                                     type::kOtherFru, type::kEntityPresence, type::kFruState});
    constexpr auto kExchanged = std::to_array<std::uint8_t>({
        ipmi::entity::kProcessor,
        0x04,  // disk
        0x05,  // peripheral bay
        ipmi::entity::kMemoryModule,
        0x09,  // processor module
        ipmi::entity::kPowerSupply,
        0x0B,  // add-in card
        0x14,  // power module
        0x1A,  // disk drive bay
        0x1B,  // peripheral bay
        0x1C,  // device bay
        0x1D,  // fan
        ipmi::entity::kMemoryDevice,
        0x28,  // battery
        0x29,  // processing blade
        0x2A,  // connectivity switch
        0x2B,  // processor/memory module
        0x2C,  // I/O module
        0x2D,  // processor/I/O module
    });
    const auto isIn = [](const auto& list, std::uint8_t code) {
        return std::ranges::find(list, code) != list.end();
    };
    return isIn(kTypes, sensor.sensorType) || isIn(kExchanged, sensor.entity.id);
}

PartEvidence EntityParts::OfEvent(const Event& event) const {
    const SensorFacts* const facts = event.agreeingSensor();
    return facts == nullptr ? PartEvidence() : OfSensor(facts->sensor);
}

PartEvidence EntityParts::OfSensor(const ipmi::Sensor& sensor) const {
    const ipmi::Entity& entity = sensor.entity;
    if (!ipmi::IsPhysicalEntity(entity.id)) return {};
    return {.parts = {{.name = ipmi::EntityText(entity.id, entity.instance),
                       .partNumber = {},
                       .serialNumber = {}}},
            .certain = true};
}

}  // namespace standard
