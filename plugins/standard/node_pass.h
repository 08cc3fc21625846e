#pragma once

#include <optional>
#include <string>
#include <vector>

#include "plugins/standard/events.h"
#include "plugins/standard/facts.h"
#include "plugins/standard/finding.h"
#include "plugins/standard/fru_device.h"
#include "plugins/standard/node.h"
#include "plugins/standard/parts.h"
#include "plugins/standard/smbios_facts.h"
#include "plugins/standard/system_identity.h"

namespace standard {

/// A node in one pass: what is read of it, and what is derived from that, each made when a class
/// first wants it.
class NodePass {
public:
    /// `rules` is borrowed; `smbios` is empty where it is not the node's own.
    NodePass(unsigned number, std::string systemName, NQORTQR20::SPLibrary& library,
             const SeverityRules& rules, SmbiosFacts smbios);
    NodePass(const NodePass&) = delete;
    NodePass& operator=(const NodePass&) = delete;

    /// Events() and what is derived from it will be wanted.
    void AnnounceEvents();
    /// FruDevices() will be wanted.
    void AnnounceInventory();
    Node& node() { return node_; }
    const SmbiosFacts& Smbios() const { return smbios_; }
    const std::vector<FruDevice>& FruDevices();
    /// Manufacturer, product and serial number of the system.
    SystemIdentity Identity() { return IdentifySystem(smbios_, OwnFruDevice()); }
    /// The part of a sensor.
    PartEvidence PartOf(const ipmi::Sensor& sensor);
    /// The events, with the present readings of the sensors that have open ones.
    const Events& GetEvents();
    /// From the events and the present readings of all sensors.
    const std::vector<Finding>& Findings();

private:
    const std::optional<FruDevice>& OwnFruDevice();
    void ReadSensors();
    Parts MakeParts();
    DerivationTools Tools();
    void ReadSensorOf(SensorFacts* facts);

    Node node_;
    std::string systemName_;
    const SeverityRules& rules_;
    SmbiosFacts smbios_;
    std::optional<std::optional<FruDevice>> ownFruDevice_;
    std::optional<std::vector<FruDevice>> fruDevices_;
    bool sensorsRead_ = false;
    NodeFacts facts_;
    std::optional<Parts> sensorParts_;  // without the log
    std::optional<Parts> parts_;
    std::optional<Events> events_;  // points into facts_ and parts_
    std::optional<std::vector<Finding>> findings_;
};

}  // namespace standard
