#pragma once

#include <string>
#include <utility>
#include <vector>

#include "tqr/plugin.h"

namespace ipmisel {

/// One instance as it is kept: its properties in the order in which they are written.
using PropertyMap = std::vector<std::pair<std::string, std::string>>;

}  // namespace ipmisel

/// Builder and collector of inventory instances: properties are gathered into an instance, closed
/// instances are kept until they are written.
class IPMIVPDEntry {
public:
    /// Adds a property to the open instance. An empty value is written as a single blank.
    void AddProperty(const std::string& name, const std::string& value);
    /// Closes the open instance and keeps it; one without a property is dropped.
    void AddInstance();
    /// Drops what was added since the last AddInstance.
    void DropInstance() { open_.clear(); }

    const std::vector<ipmisel::PropertyMap>& GetFruInstances() const { return instances_; }
    void SetFruInstances(std::vector<ipmisel::PropertyMap> instances) {
        instances_ = std::move(instances);
    }

    /// Writes every kept instance as one of the class. An instance that the host refuses is left
    /// out, with a log line; 1 when there was one, else 0.
    unsigned GenerateCIMInstance(NQORTQR20::fdriIOHandle* output, const char* className) const;

    /// The manufacturer of a memory module from its JEDEC code (JEP106): `twoBytes` false, up to
    /// six continuation bytes 0x7F and the code; true, the number of continuation bytes and the
    /// code, both with a parity bit. At most 7 resp. 2 bytes are read. Empty when it cannot be
    /// told.
    static std::string getMDManufacturer(const unsigned char* code, bool twoBytes);
    /// Whether a NUL-terminated text may be shown: not empty, characters 0x20 to 0x7E only.
    static bool IsASCIIStr(const unsigned char* text);

private:
    ipmisel::PropertyMap open_;
    std::vector<ipmisel::PropertyMap> instances_;
};
