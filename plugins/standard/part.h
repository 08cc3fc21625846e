#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "ipmi/sdr_record.h"

namespace standard {

struct Event;

/// A part as a person orders it. What is not known is empty.
struct Part {
    std::string name;  ///< slot label, inventory name, or entity and instance
    std::string partNumber;
    std::string serialNumber;

    bool operator==(const Part&) const = default;
};

/// Name, part number and serial number as far as known: "DIMM_A1, part number M16G, serial number
/// 7".
std::string CandidateText(const Part& part);

/// The number that a label ends in: 4 of "DIMM_A04"; none of more than four digits.
std::optional<unsigned> NumberAtEnd(std::string_view label);

/// What the evidence says of the part that an event is about: nothing, one part, or several of
/// which it is one.
struct PartEvidence {
    std::vector<Part> parts;
    bool certain = false;  ///< of a single part: the evidence names it itself, no inference between

    bool operator==(const PartEvidence&) const = default;
};

/// Whether the presence that a sensor tells of is that of its entity itself: by the sensor's type,
/// or since the entity is one that is put in and taken out. A slot on a system board is neither:
/// the board does not go with the card.
bool TellsOfItsEntity(const ipmi::Sensor& sensor);

class PartLookup {
public:
    virtual ~PartLookup() = default;
    /// The event has record, sensor and data.
    virtual PartEvidence OfEvent(const Event& event) const = 0;
    virtual PartEvidence OfSensor(const ipmi::Sensor& sensor) const = 0;
};

/// Names parts by the entity of the sensor's record alone, where that is a physical one.
class EntityParts : public PartLookup {
public:
    PartEvidence OfEvent(const Event& event) const override;
    PartEvidence OfSensor(const ipmi::Sensor& sensor) const override;
};

}  // namespace standard
