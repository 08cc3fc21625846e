#pragma once

#include <array>
#include <cstdint>
#include <initializer_list>
#include <numeric>
#include <string_view>
#include <vector>

// Records and structures as they come over the wire, built from what a case is about.

namespace ipmiseltest {

constexpr std::uint8_t Low(std::uint16_t id) { return static_cast<std::uint8_t>(id); }
constexpr std::uint8_t High(std::uint16_t id) { return static_cast<std::uint8_t>(id >> 8); }

using SelRecord = std::array<std::uint8_t, 16>;

/// A system event record (IPMI 2.0, table 32-1) of the BMC itself.
inline SelRecord SystemEvent(std::uint16_t id, std::uint8_t sensorType, std::uint8_t sensor,
                             std::uint8_t directionAndType = 0x01, std::uint8_t data1 = 0x59,
                             std::uint8_t data2 = 0x50, std::uint8_t data3 = 0x45) {
    return {Low(id), High(id),         0x02,  0xB0,  0xE5, 0xE6, 0x65, 0x20, 0x00, 0x04, sensorType,
            sensor,  directionAndType, data1, data2, data3};
}

/// A record of another type; its payload counts up from 0x11.
inline SelRecord OtherRecord(std::uint16_t id, std::uint8_t recordType) {
    SelRecord record{Low(id), High(id), recordType};
    std::iota(record.begin() + 3, record.end(), std::uint8_t{0x11});
    return record;
}

/// A full sensor record (IPMI 2.0, table 43-1), linear, M = 1.
inline std::vector<std::uint8_t> FullSensor(std::uint16_t id, std::uint8_t sensor,
                                            std::uint8_t entity, std::uint8_t instance,
                                            std::string_view name) {
    std::vector<std::uint8_t> record{
        Low(id), High(id), 0x51,   0x01,   static_cast<std::uint8_t>(43 + name.size()),
        0x20,    0,        sensor, entity, instance};
    record.resize(48);
    record[21] = 0x01;  // degrees C
    record[24] = 0x01;  // M
    record[47] = static_cast<std::uint8_t>(0xC0 | name.size());
    record.insert(record.end(), name.begin(), name.end());
    return record;
}

/// An SMBIOS structure (DSP0134): header, formatted area, strings.
inline std::vector<std::uint8_t> SmbiosStructure(std::uint8_t type,
                                                 std::initializer_list<std::uint8_t> formatted,
                                                 std::initializer_list<std::string_view> strings) {
    std::vector<std::uint8_t> structure(formatted);
    structure.insert(structure.begin(),
                     {type, static_cast<std::uint8_t>(4 + formatted.size()), 0x00, 0x30});
    for (const std::string_view text : strings) {
        structure.insert(structure.end(), text.begin(), text.end());
        structure.push_back(0);
    }
    if (strings.size() == 0) structure.push_back(0);
    structure.push_back(0);
    return structure;
}

inline std::vector<std::uint8_t> IpmiDeviceStructure() {
    return SmbiosStructure(
        38, {0x01, 0x20, 0x20, 0x00, 0xA3, 0x0C, 0x00, 0x00, 0x00, 0x00, 0x00, 0x00, 0x01, 0x05},
        {});
}

inline std::vector<std::uint8_t> OemStrings(std::initializer_list<std::string_view> strings) {
    return SmbiosStructure(11, {static_cast<std::uint8_t>(strings.size())}, strings);
}

}  // namespace ipmiseltest
