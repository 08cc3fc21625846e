#include "plugins/standard/part.h"

#include "ipmi/entities.h"
#include "plugins/standard/event.h"

namespace standard {

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
