#pragma once

#include <string>

namespace ipmisel {

/// What the message of a system event record is made of, as the properties show it.
struct EventMessage {
    std::string entity;
    std::string entityInstance;
    std::string sensorType;
    std::string sensorInformation;
    bool deassertion = false;
    std::string event;
};

/// entity + " " + instance + " (" + sensor type + " - " + sensor + "): " + direction + event, after
/// the rewrites that make some sensors' names readable.
std::string Compose(EventMessage parts);

}  // namespace ipmisel
