#include "plugins/standard/part.h"

#include "ipmi/entities.h"
#include "plugins/standard/event.h"

namespace standard {

std::string CandidateText(const Part& part) {
    std::string text = part.name;
    if (!part.partNumber.empty()) text += ", part number " + part.partNumber;
    if (!part.serialNumber.empty()) text += ", serial number " + part.serialNumber;
    return text;
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
