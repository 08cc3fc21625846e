#pragma once

#include <string>
#include <vector>

namespace standard {

/// A part as a person orders it. What is not known is empty.
struct Part {
    std::string name;  ///< slot label, inventory name, or entity and instance
    std::string partNumber;
    std::string serialNumber;

    bool operator==(const Part&) const = default;
};

/// What the evidence says of the part that an event is about: nothing, one part, or several of
/// which it is one.
struct PartEvidence {
    std::vector<Part> parts;
    bool certain = false;  ///< of a single part: the evidence names it itself, no inference between

    bool operator==(const PartEvidence&) const = default;
};

}  // namespace standard
