#pragma once

#include <array>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "host/core/sink.h"
#include "program/reports/severity.h"

// The standard's own reading as values: the one place that knows the properties of the IPMI_...
// classes by name. What is not known is an empty text or an empty optional. An instance of a saved
// report, whose times are texts, gives the same values as the one that was saved.

namespace ipmisel {

inline constexpr std::string_view kControllerClass = "IPMI_Controller";
inline constexpr std::string_view kEventLogClass = "IPMI_EventLog";
inline constexpr std::string_view kSensorClass = "IPMI_Sensor";
inline constexpr std::string_view kFruClass = "IPMI_FRU";
inline constexpr std::string_view kEventClass = "IPMI_Event";
inline constexpr std::string_view kFindingClass = "IPMI_Finding";

using Integer = std::optional<std::int64_t>;
using Real = std::optional<double>;
using Truth = std::optional<bool>;
using MaybeTime = std::optional<NQORTQR20::Time>;
using Texts = std::vector<std::string>;

struct Controller {
    Integer node;
    std::string guid, guidOrder;
    std::string manufacturer, product, serialNumber;  ///< of the system
    std::string firmware, auxiliaryRevision, ipmiVersion, deviceId, deviceRevision;
    Integer manufacturerId, productId;
    std::string controllerManufacturer;
    Texts capabilities;
    std::string selfTest;
    MaybeTime time;
    Real clockOffset, clockUncertainty;  ///< seconds
    Integer utcOffset;                   ///< minutes
    Truth powerOn, chassisIntrusion;
    Texts lastPowerEvent, powerFaults;
};

struct EventLog {
    Integer node, records, freeBytes;
    std::string version;
    Real usedPercent;
    MaybeTime lastAddition, lastErase;
    Truth overflow;
};

struct Sensor {
    Integer node, recordId, ownerAddress, lun, number;
    std::string name, type, entity, unit, status, part;
    Integer entityInstance;
    Real reading;
    Real lowerNonRecoverable, lowerCritical, lowerNonCritical;
    Real upperNonCritical, upperCritical, upperNonRecoverable;
    Real nominal, normalMinimum, normalMaximum;
    Texts states;
};

struct Fru {
    Integer node, deviceId;
    std::string name, entity;
    std::string manufacturer, product, partNumber, serialNumber;  ///< the ones to order by
    std::string version, assetTag;
    std::string boardPartNumber, boardSerialNumber;
    MaybeTime boardManufactured;
    std::string moduleManufacturer, modulePartNumber, moduleSerialNumber, moduleType;
    Integer moduleSizeMiB;
    Texts multiRecords, problems;
};

struct Event {
    std::string key;
    Integer node, recordId, recordType;
    MaybeTime time, correctedTime;
    std::string timeKind;
    Integer secondsSinceStart;
    Truth timeZoneKnown;
    std::optional<Severity> severity;
    std::string severityFrom, state, resolvedBy;
    MaybeTime resolvedTime;
    Truth stillPresent;
    std::string direction, generator;
    std::string sensor, sensorType, eventType, entity;
    Integer sensorNumber, sensorTypeCode, eventTypeCode, offset, entityId, entityInstance;
    std::string text;
    Real reading, threshold;
    std::string unit, makerData;
    std::string part, partNumber, serialNumber;
    Truth partCertain;
    Texts partCandidates;
    std::string continuationOf;
    Truth nonStandardRecord;
    Integer manufacturerId;
    std::string manufacturer, sentence, raw;

    bool IsDeasserted() const { return direction == "deasserted"; }
    /// The sixteen bytes of the record in wire order; empty when `raw` is something else.
    std::optional<std::array<std::uint8_t, 16>> Record() const;
};

struct Finding {
    Integer node;
    std::optional<Severity> severity;
    std::string title, part, partNumber, serialNumber, firstCause;
    Texts partCandidates;
    MaybeTime firstTime, lastTime;
    Integer count;
    Texts events, evidence;  ///< keys of events; sentences
    Truth stillPresent;
};

Controller ControllerOf(const NQORTQR20::Instance& instance);
EventLog EventLogOf(const NQORTQR20::Instance& instance);
Sensor SensorOf(const NQORTQR20::Instance& instance);
Fru FruOf(const NQORTQR20::Instance& instance);
Event EventOf(const NQORTQR20::Instance& instance);
Finding FindingOf(const NQORTQR20::Instance& instance);

/// The point in time of an RFC 3339 text, "2026-03-09T02:31:44Z" or with an offset, whole seconds;
/// empty when it is none.
MaybeTime ParseTime(std::string_view text);

/// Everything but the events, for the reports that show it side by side.
struct MachineState {
    std::vector<Controller> controllers;
    std::vector<EventLog> eventLogs;
    std::vector<Sensor> sensors;
    std::vector<Fru> frus;
    std::vector<Finding> findings;  ///< the worst first

    /// False when it is an instance of another class.
    bool Add(const NQORTQR20::Instance& instance);
};

}  // namespace ipmisel
