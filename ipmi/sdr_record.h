#pragma once

#include <array>
#include <compare>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <variant>
#include <vector>

#include "ipmi/entities.h"
#include "ipmi/reading.h"
#include "ipmi/sensor_reading.h"
#include "ipmi/units.h"

// Records of the sensor data repository as values: IPMI 2.0, chapter 43. A record is a header of
// five bytes (record ID, version, type, length of what follows), a key, a body and, at its end,
// mostly an ID string. All are read as far as they go: `whole` says whether a record has every
// field of its type, and a field that is not there is left empty.

namespace ipmi {

constexpr std::size_t kSdrHeaderLength = 5;
/// The longest record there can be.
constexpr std::size_t kMaxSdrLength = kSdrHeaderLength + 0xFF;
/// The last offset that a part can be read from: Get SDR has one byte for it (clause 33.12).
constexpr std::size_t kMaxSdrOffset = 0xFF;

/// Where the ID string begins, type/length byte first (tables 43-1 to 43-3, 43-6 to 43-8).
constexpr std::size_t kFullNameAt = 47;
constexpr std::size_t kCompactNameAt = 31;
constexpr std::size_t kEventOnlyNameAt = 16;
constexpr std::size_t kLocatorNameAt = 15;

enum class SdrType : std::uint8_t {
    kFull = 0x01,
    kCompact = 0x02,
    kEventOnly = 0x03,
    kEntityAssociation = 0x08,
    kDeviceRelativeAssociation = 0x09,
    kGenericLocator = 0x10,
    kFruLocator = 0x11,
    kControllerLocator = 0x12,
    kControllerConfirmation = 0x13,
    kMessageChannel = 0x14,
    kOem = 0xC0,
};

struct SdrHeader {
    std::uint16_t recordId = 0;
    std::uint8_t version = 0;  ///< BCD, least significant nibble first: 51h is 1.5
    SdrType type{};
    std::uint8_t length = 0;  ///< of what follows

    std::size_t RecordLength() const { return kSdrHeaderLength + length; }
    static std::optional<SdrHeader> Parse(std::span<const std::uint8_t> bytes);
};

/// An entity and its instance (43.14). Instances 60h to 7Fh are relative to a device, lower ones
/// hold for the whole system.
struct Entity {
    std::uint8_t id = 0;
    std::uint8_t instance = 0;  ///< 7 bits

    bool IsDeviceRelative() const { return ipmi::IsDeviceRelative(instance); }
    bool IsSpecified() const { return id != 0; }
    auto operator<=>(const Entity&) const = default;
};

/// How a sensor is found: by its owner and its number there, never by the number alone.
struct SensorKey {
    std::uint8_t owner = 0;  ///< slave address, or with bit 0 set a software ID
    std::uint8_t lun = 0;
    std::uint8_t number = 0;
    auto operator<=>(const SensorKey&) const = default;
};

/// How thresholds or hysteresis of a sensor may be had (table 43-1, byte 12).
enum class LimitAccess : std::uint8_t {
    kNone = 0,
    kReadable = 1,
    kSettable = 2,  ///< and readable
    kFixed = 3,     ///< not readable; the record has the values
};

/// The analog part of a full sensor record.
struct AnalogSensor {
    Conversion conversion;
    std::optional<std::uint8_t> nominal, normalMaximum, normalMinimum;  ///< raw, where given
    SensorThresholds thresholds;  ///< as the record has them; the mask says which the sensor has
    std::optional<std::uint8_t> positiveHysteresis, negativeHysteresis;  ///< raw counts
};

/// A sensor: full, compact and event-only records (43.1 to 43.3).
struct Sensor {
    std::uint16_t recordId = 0;
    SdrType type{};
    SensorKey key;
    std::uint8_t channel = 0;  ///< of the owner
    Entity entity;
    bool entityIsLogical = false;
    std::uint8_t sensorType = 0;
    std::uint8_t eventType = 0;  ///< event/reading type code
    bool ignoredWithoutEntity = false;
    LimitAccess thresholdAccess = LimitAccess::kNone;
    LimitAccess hysteresisAccess = LimitAccess::kNone;
    std::uint16_t assertionMask = 0, deassertionMask = 0;
    /// Of a discrete sensor the states it can report, of a threshold sensor its readable
    /// thresholds in bits 0 to 5 and its settable ones in bits 8 to 13.
    std::uint16_t readingMask = 0;
    SensorUnits units;
    std::optional<AnalogSensor> analog;  ///< of full records that are long enough
    std::string name;                    ///< UTF-8; of a shared record with the modifier

    bool IsThreshold() const { return eventType == 0x01; }
    /// Whether it has a numeric reading: a full record with a number format, of a threshold sensor
    /// or at least with a unit.
    bool IsAnalog() const;
    /// Thresholds that the record itself has (access "fixed").
    SensorThresholds FixedThresholds() const;
};

/// What a container entity holds (43.4, 43.5).
struct EntityAssociation {
    struct Member {
        Entity entity;
        std::uint8_t address = 0, channel = 0;  ///< of device-relative records
        auto operator<=>(const Member&) const = default;
    };
    Entity container;
    std::uint8_t containerAddress = 0, containerChannel = 0;  ///< of device-relative records
    bool isRange = false;  ///< members are first and last of a range, in pairs
    bool isLinked = false;
    std::vector<Member> members;  ///< those that are specified

    /// Whether an entity is listed, or lies in one of the ranges.
    bool Contains(const Entity& entity) const;
};

/// Where a FRU inventory device is (43.8).
struct FruLocator {
    std::uint8_t accessAddress = 0;  ///< of the controller through which it is reached
    std::uint8_t deviceId = 0;       ///< FRU device ID, or a slave address when not logical
    bool isLogical = false;
    std::uint8_t lun = 0, bus = 0, channel = 0;
    std::uint8_t deviceType = 0, deviceTypeModifier = 0;
    Entity entity;
    std::string name;
};

/// A device on a bus that is neither controller nor inventory (43.7).
struct GenericLocator {
    std::uint8_t accessAddress = 0, slaveAddress = 0, channel = 0, lun = 0, bus = 0;
    std::uint8_t deviceType = 0, deviceTypeModifier = 0;
    Entity entity;
    std::string name;
};

/// A management controller (43.9).
struct ControllerLocator {
    std::uint8_t slaveAddress = 0, channel = 0, capabilities = 0;
    Entity entity;
    std::string name;
};

/// A management controller that was found earlier (43.10).
struct ControllerConfirmation {
    std::uint8_t slaveAddress = 0, deviceId = 0, channel = 0, deviceRevision = 0;
    std::array<std::uint8_t, 2> firmwareRevision{};
    std::uint8_t ipmiVersion = 0;
    std::uint32_t manufacturerId = 0;
    std::uint16_t productId = 0;
    std::array<std::uint8_t, 16> guid{};
};

/// Channels of the BMC (43.11).
struct MessageChannel {
    std::array<std::uint8_t, 8> channels{};
    std::uint8_t messageInterrupt = 0, eventInterrupt = 0;
};

/// A manufacturer's own record (43.12).
struct OemSdr {
    std::uint32_t manufacturerId = 0;
    std::vector<std::uint8_t> data;
};

struct SdrRecord {
    SdrHeader header;
    bool whole = false;
    /// std::monostate for a record of another type, or one that ends before its key does.
    std::variant<std::monostate, Sensor, EntityAssociation, FruLocator, GenericLocator,
                 ControllerLocator, ControllerConfirmation, MessageChannel, OemSdr>
        body;
    /// Of sensors: how many share a compact or event-only record, and how their names and entities
    /// differ (table 43-2, bytes 24 and 25).
    struct Sharing {
        unsigned count = 1;
        bool alphabetic = false;  ///< letters instead of numbers behind the names
        bool entityInstances = false;
        unsigned offset = 0;
    } sharing;

    /// `bytes` may be shorter or longer than the header says: what lies behind its length is not
    /// looked at. Empty when there is no whole header.
    static std::optional<SdrRecord> Parse(std::span<const std::uint8_t> bytes);

    /// Whether its type is one of the three that describe sensors.
    bool IsOfSensor() const;
    /// The record's sensors: none, one, or each that shares it, with its own number and name.
    std::vector<Sensor> Sensors() const;
};

/// What stands behind the names of shared records: "5", or "A" to "Z", "AA" and so on.
std::string InstanceModifier(bool alphabetic, unsigned offset);

}  // namespace ipmi
