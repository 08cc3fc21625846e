#include "program/reports/view.h"

#include <algorithm>
#include <charconv>
#include <chrono>
#include <type_traits>
#include <variant>

#include "base/hex.h"

namespace ipmisel {
namespace {

using NQORTQR20::Instance;
using NQORTQR20::PropertyValue;

template <typename View>
struct Field {
    std::string_view property;
    std::variant<std::string View::*, Integer View::*, Real View::*, Truth View::*,
                 MaybeTime View::*, Texts View::*, std::optional<Severity> View::*>
        member;
};

constexpr Field<Controller> kController[] = {
    {"Node", &Controller::node},
    {"GUID", &Controller::guid},
    {"GUIDOrder", &Controller::guidOrder},
    {"SystemManufacturer", &Controller::manufacturer},
    {"SystemProduct", &Controller::product},
    {"SystemSerialNumber", &Controller::serialNumber},
    {"FirmwareVersion", &Controller::firmware},
    {"AuxiliaryRevision", &Controller::auxiliaryRevision},
    {"IPMIVersion", &Controller::ipmiVersion},
    {"DeviceID", &Controller::deviceId},
    {"DeviceRevision", &Controller::deviceRevision},
    {"ManufacturerID", &Controller::manufacturerId},
    {"Manufacturer", &Controller::controllerManufacturer},
    {"ProductID", &Controller::productId},
    {"Capabilities", &Controller::capabilities},
    {"SelfTest", &Controller::selfTest},
    {"Time", &Controller::time},
    {"ClockOffsetSeconds", &Controller::clockOffset},
    {"ClockUncertaintySeconds", &Controller::clockUncertainty},
    {"UTCOffsetMinutes", &Controller::utcOffset},
    {"PowerOn", &Controller::powerOn},
    {"LastPowerEvent", &Controller::lastPowerEvent},
    {"PowerFaults", &Controller::powerFaults},
    {"ChassisIntrusion", &Controller::chassisIntrusion},
};

constexpr Field<EventLog> kEventLog[] = {
    {"Node", &EventLog::node},
    {"Version", &EventLog::version},
    {"Records", &EventLog::records},
    {"FreeBytes", &EventLog::freeBytes},
    {"UsedPercent", &EventLog::usedPercent},
    {"LastAddition", &EventLog::lastAddition},
    {"LastErase", &EventLog::lastErase},
    {"Overflow", &EventLog::overflow},
};

constexpr Field<Sensor> kSensor[] = {
    {"Node", &Sensor::node},
    {"RecordID", &Sensor::recordId},
    {"OwnerAddress", &Sensor::ownerAddress},
    {"LUN", &Sensor::lun},
    {"Number", &Sensor::number},
    {"Name", &Sensor::name},
    {"Type", &Sensor::type},
    {"Entity", &Sensor::entity},
    {"EntityInstance", &Sensor::entityInstance},
    {"Unit", &Sensor::unit},
    {"Reading", &Sensor::reading},
    {"Nominal", &Sensor::nominal},
    {"NormalMinimum", &Sensor::normalMinimum},
    {"NormalMaximum", &Sensor::normalMaximum},
    {"LowerNonRecoverable", &Sensor::lowerNonRecoverable},
    {"LowerCritical", &Sensor::lowerCritical},
    {"LowerNonCritical", &Sensor::lowerNonCritical},
    {"UpperNonCritical", &Sensor::upperNonCritical},
    {"UpperCritical", &Sensor::upperCritical},
    {"UpperNonRecoverable", &Sensor::upperNonRecoverable},
    {"States", &Sensor::states},
    {"Status", &Sensor::status},
    {"Part", &Sensor::part},
};

constexpr Field<Fru> kFru[] = {
    {"Node", &Fru::node},
    {"DeviceID", &Fru::deviceId},
    {"Name", &Fru::name},
    {"Entity", &Fru::entity},
    {"Manufacturer", &Fru::manufacturer},
    {"Product", &Fru::product},
    {"PartNumber", &Fru::partNumber},
    {"SerialNumber", &Fru::serialNumber},
    {"ProductVersion", &Fru::version},
    {"ProductAssetTag", &Fru::assetTag},
    {"BoardPartNumber", &Fru::boardPartNumber},
    {"BoardSerialNumber", &Fru::boardSerialNumber},
    {"BoardManufactured", &Fru::boardManufactured},
    {"ModuleManufacturer", &Fru::moduleManufacturer},
    {"ModulePartNumber", &Fru::modulePartNumber},
    {"ModuleSerialNumber", &Fru::moduleSerialNumber},
    {"ModuleType", &Fru::moduleType},
    {"ModuleSizeMiB", &Fru::moduleSizeMiB},
    {"MultiRecords", &Fru::multiRecords},
    {"Problems", &Fru::problems},
};

constexpr Field<Event> kEvent[] = {
    {"Key", &Event::key},
    {"Node", &Event::node},
    {"RecordID", &Event::recordId},
    {"RecordType", &Event::recordType},
    {"Time", &Event::time},
    {"TimeKind", &Event::timeKind},
    {"CorrectedTime", &Event::correctedTime},
    {"SecondsSinceStart", &Event::secondsSinceStart},
    {"TimeZoneKnown", &Event::timeZoneKnown},
    {"Severity", &Event::severity},
    {"SeverityFrom", &Event::severityFrom},
    {"State", &Event::state},
    {"ResolvedBy", &Event::resolvedBy},
    {"ResolvedTime", &Event::resolvedTime},
    {"StillPresent", &Event::stillPresent},
    {"Direction", &Event::direction},
    {"Generator", &Event::generator},
    {"Sensor", &Event::sensor},
    {"SensorNumber", &Event::sensorNumber},
    {"SensorType", &Event::sensorType},
    {"SensorTypeCode", &Event::sensorTypeCode},
    {"EventType", &Event::eventType},
    {"EventTypeCode", &Event::eventTypeCode},
    {"Offset", &Event::offset},
    {"Entity", &Event::entity},
    {"EntityID", &Event::entityId},
    {"EntityInstance", &Event::entityInstance},
    {"Text", &Event::text},
    {"Reading", &Event::reading},
    {"Threshold", &Event::threshold},
    {"Unit", &Event::unit},
    {"MakerData", &Event::makerData},
    {"Part", &Event::part},
    {"PartNumber", &Event::partNumber},
    {"SerialNumber", &Event::serialNumber},
    {"PartCertain", &Event::partCertain},
    {"PartCandidates", &Event::partCandidates},
    {"ContinuationOf", &Event::continuationOf},
    {"NonStandardRecord", &Event::nonStandardRecord},
    {"ManufacturerID", &Event::manufacturerId},
    {"Manufacturer", &Event::manufacturer},
    {"Sentence", &Event::sentence},
    {"Raw", &Event::raw},
};

constexpr Field<Finding> kFinding[] = {
    {"Node", &Finding::node},
    {"Severity", &Finding::severity},
    {"Title", &Finding::title},
    {"Part", &Finding::part},
    {"PartNumber", &Finding::partNumber},
    {"SerialNumber", &Finding::serialNumber},
    {"PartCandidates", &Finding::partCandidates},
    {"FirstTime", &Finding::firstTime},
    {"LastTime", &Finding::lastTime},
    {"Count", &Finding::count},
    {"Events", &Finding::events},
    {"FirstCause", &Finding::firstCause},
    {"Evidence", &Finding::evidence},
    {"StillPresent", &Finding::stillPresent},
};

// A value of another type than the member's is passed over: it cannot be shown for what it is not.
void Assign(const PropertyValue& value, std::string* member) {
    if (const auto* text = std::get_if<std::string>(&value)) *member = *text;
}
void Assign(const PropertyValue& value, Integer* member) {
    if (const auto* number = std::get_if<std::int64_t>(&value)) *member = *number;
}
void Assign(const PropertyValue& value, Real* member) {
    if (const auto* real = std::get_if<double>(&value)) *member = *real;
    if (const auto* number = std::get_if<std::int64_t>(&value)) {
        *member = static_cast<double>(*number);
    }
}
void Assign(const PropertyValue& value, Truth* member) {
    if (const auto* truth = std::get_if<bool>(&value)) *member = *truth;
}
void Assign(const PropertyValue& value, MaybeTime* member) {
    if (const auto* time = std::get_if<NQORTQR20::Time>(&value)) *member = *time;
    if (const auto* text = std::get_if<std::string>(&value)) *member = ParseTime(*text);
}
void Assign(const PropertyValue& value, Texts* member) {
    if (const auto* texts = std::get_if<Texts>(&value)) *member = *texts;
}
void Assign(const PropertyValue& value, std::optional<Severity>* member) {
    if (const auto* text = std::get_if<std::string>(&value)) *member = ParseSeverity(*text);
}

/// Properties come nearly in the order of the fields: the search goes on from the last one found.
template <typename View, std::size_t N>
View Read(const Instance& instance, const Field<View> (&fields)[N]) {
    View view;
    std::size_t next = 0;
    for (const auto& [name, value] : instance.properties) {
        for (std::size_t i = 0; i < N; ++i) {
            const Field<View>& field = fields[(next + i) % N];
            if (field.property != name) continue;
            const PropertyValue& found =
                value;  // no lambda may take a structured binding by reference
            std::visit([&view, &found](auto member) { Assign(found, &(view.*member)); },
                       field.member);
            next += i + 1;
            break;
        }
    }
    return view;
}

/// A number of exactly so many digits at the front, taken off the text.
std::optional<int> TakeNumber(std::string_view* text, std::size_t digits) {
    int number = 0;
    if (text->size() < digits || text->front() < '0' || text->front() > '9') return std::nullopt;
    const auto [end, error] = std::from_chars(text->data(), text->data() + digits, number);
    if (error != std::errc() || end != text->data() + digits) return std::nullopt;
    text->remove_prefix(digits);
    return number;
}

bool Take(std::string_view* text, std::string_view characters) {
    if (text->empty() || characters.find(text->front()) == std::string_view::npos) return false;
    text->remove_prefix(1);
    return true;
}

/// Seconds east of UTC: "Z", "+01:00".
std::optional<int> ParseOffset(std::string_view text) {
    if (text == "Z" || text == "z") return 0;
    const bool west = text.starts_with('-');
    if (!Take(&text, "+-")) return std::nullopt;
    const auto hours = TakeNumber(&text, 2);
    if (!hours || !Take(&text, ":")) return std::nullopt;
    const auto minutes = TakeNumber(&text, 2);
    if (!minutes || !text.empty() || *hours > 23 || *minutes > 59) return std::nullopt;
    const int seconds = (*hours * 60 + *minutes) * 60;
    return west ? -seconds : seconds;
}

}  // namespace

MaybeTime ParseTime(std::string_view text) {
    using namespace std::chrono;
    const auto year = TakeNumber(&text, 4);
    if (!year || !Take(&text, "-")) return std::nullopt;
    const auto month = TakeNumber(&text, 2);
    if (!month || !Take(&text, "-")) return std::nullopt;
    const auto day = TakeNumber(&text, 2);
    if (!day || !Take(&text, "Tt ")) return std::nullopt;
    const auto hour = TakeNumber(&text, 2);
    if (!hour || !Take(&text, ":")) return std::nullopt;
    const auto minute = TakeNumber(&text, 2);
    if (!minute || !Take(&text, ":")) return std::nullopt;
    const auto second = TakeNumber(&text, 2);
    const auto offset = second ? ParseOffset(text) : std::nullopt;
    const year_month_day date{std::chrono::year(*year),
                              std::chrono::month(static_cast<unsigned>(*month)),
                              std::chrono::day(static_cast<unsigned>(*day))};
    if (!offset || !date.ok() || *hour > 23 || *minute > 59 || *second > 60) return std::nullopt;
    const std::int64_t days = sys_days(date).time_since_epoch().count();
    return NQORTQR20::Time{((days * 24 + *hour) * 60 + *minute) * 60 + *second - *offset};
}

std::optional<std::array<std::uint8_t, 16>> Event::Record() const {
    std::array<std::uint8_t, 16> record{};
    const auto bytes = ParseHex(raw);
    if (!bytes || bytes->size() != record.size()) return std::nullopt;
    std::copy(bytes->begin(), bytes->end(), record.begin());
    return record;
}

Controller ControllerOf(const Instance& instance) { return Read(instance, kController); }
EventLog EventLogOf(const Instance& instance) { return Read(instance, kEventLog); }
Sensor SensorOf(const Instance& instance) { return Read(instance, kSensor); }
Fru FruOf(const Instance& instance) { return Read(instance, kFru); }
Event EventOf(const Instance& instance) { return Read(instance, kEvent); }
Finding FindingOf(const Instance& instance) { return Read(instance, kFinding); }

bool MachineState::Add(const Instance& instance) {
    if (instance.className == kControllerClass) {
        controllers.push_back(ControllerOf(instance));
    } else if (instance.className == kEventLogClass) {
        eventLogs.push_back(EventLogOf(instance));
    } else if (instance.className == kSensorClass) {
        sensors.push_back(SensorOf(instance));
    } else if (instance.className == kFruClass) {
        frus.push_back(FruOf(instance));
    } else if (instance.className == kFindingClass) {
        // Each node has its own worst first.
        Finding finding = FindingOf(instance);
        const auto place = std::upper_bound(
            findings.begin(), findings.end(), finding,
            [](const Finding& a, const Finding& b) { return a.severity > b.severity; });
        findings.insert(place, std::move(finding));
    } else {
        return false;
    }
    return true;
}

}  // namespace ipmisel
