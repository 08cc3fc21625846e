#include "plugins/standard/finding.h"

#include <algorithm>
#include <array>
#include <map>
#include <set>
#include <utility>

#include "base/text.h"
#include "ipmi/entities.h"
#include "ipmi/event_data.h"
#include "ipmi/event_types.h"
#include "ipmi/sensor_types.h"
#include "ipmi/units.h"
#include "plugins/standard/event_severity.h"
#include "plugins/standard/event_text.h"
#include "plugins/standard/time_text.h"

namespace standard {

namespace {

constexpr std::int64_t kBurstGap = 300;
constexpr std::int64_t kRecent = std::int64_t{7} * 24 * 3600;
constexpr std::size_t kRecentRecords = 64;
constexpr std::size_t kMaxKinds = 4;  // of events that are summed up among the evidence

bool IsOf(const LoggedEvent& event, std::uint8_t sensorType, std::uint16_t offsets) {
    const ipmi::SelRecord& record = event.record;
    return event.isSensorEvent() && record.eventType == ipmi::kSensorSpecificEvents &&
           record.sensorType == sensorType && (offsets >> record.offset() & 1) != 0;
}

constexpr std::uint16_t kAnyOffset = 0xFFFF;

bool IsOfMemory(const LoggedEvent& event) {
    return IsOf(event, ipmi::sensor_type::kMemory, kAnyOffset);
}
bool IsThermalTrip(const LoggedEvent& event) {
    return IsOf(event, ipmi::sensor_type::kProcessor, 0b10) ||
           IsOf(event, ipmi::sensor_type::kChipSet, 0b10);
}
bool IsSystemStop(const LoggedEvent& event) {
    return event.record.kind == ipmi::RecordKind::kLinuxPanic ||
           IsOf(event, ipmi::sensor_type::kOsStop, kAnyOffset) ||
           IsOf(event, ipmi::sensor_type::kWatchdog1, kAnyOffset) ||
           IsOf(event, ipmi::sensor_type::kWatchdog2, kAnyOffset) ||
           IsOf(event, ipmi::sensor_type::kBootError, kAnyOffset);
}
bool IsOfSlot(const LoggedEvent& event) {
    return IsOf(event, ipmi::sensor_type::kSlot, kAnyOffset);
}
bool IsPcieError(const LoggedEvent& event) {
    return ipmi::ParsePcieError(event.record).has_value();
}
bool IsAny(const LoggedEvent&) { return true; }

/// Which events are one finding.
enum class Scope : std::uint8_t {
    kModule,        ///< of one memory module, whichever sensor told of it
    kBurst,         ///< of one burst
    kDevice,        ///< of one PCI Express device
    kSlot,          ///< of one expansion slot, whichever sensor told of it
    kSensorOffset,  ///< of one offset of a sensor
    kSensor,        ///< of one sensor
};
struct Rule {
    bool (*applies)(const LoggedEvent&);
    Scope scope;
};
// The first rule that applies to an open or momentary fault says with which others it is one
// finding.
constexpr std::array kRules = std::to_array<Rule>({
    {IsOfMemory, Scope::kModule},
    {IsSystemStop, Scope::kBurst},
    {IsPcieError, Scope::kDevice},
    {IsOfSlot, Scope::kSlot},
    {IsThermalTrip, Scope::kSensorOffset},
    {IsAny, Scope::kSensor},
});

std::string SensorId(const LoggedEvent& event) {
    return ipmisel::Format("%02x/%d/%02x/%02x", event.sensorKey().owner, event.sensorKey().lun,
                           event.sensorKey().number, event.record.sensorType);
}

std::string ModuleId(const Events& events, std::size_t place) {
    const LoggedEvent& event = events.Logged()[place];
    const auto module = event.target.memoryModule;
    if (!module) return SensorId(event);
    const PartEvidence part = events.PartOf(place);
    if (part.parts.size() == 1) return part.parts[0].name;
    return ipmisel::Format("%02x module %d", event.sensorKey().owner, *module);
}

// The numbers of the expansion slots that a machine's slot sensors watch, by their names: "Slot 2".
// A number that several have, and one of a drive bay or of a connector, is none.
class ExpansionSlots {
public:
    explicit ExpansionSlots(const NodeFacts& node) {
        std::map<unsigned, unsigned> count;
        for (const SensorFacts& facts : node.sensors) {
            if (const auto number = NumberIn(facts.sensor)) ++count[*number];
        }
        for (const SensorFacts& facts : node.sensors) {
            const auto number = NumberIn(facts.sensor);
            if (number && count[*number] == 1) numbers_.emplace(facts.sensor.key, *number);
        }
    }
    std::optional<unsigned> NumberOf(const ipmi::SensorKey& key) const {
        const auto found = numbers_.find(key);
        return found == numbers_.end() ? std::nullopt : std::optional(found->second);
    }
    // By the event's own data, else by its sensor.
    std::optional<unsigned> NumberOf(const LoggedEvent& event) const {
        constexpr auto kTypes = std::to_array<std::uint8_t>(
            {ipmi::kPciSlot, ipmi::kExpansionSlot, ipmi::kPciExpressSlot});
        const EventTarget& data = event.target;
        if (!data.slotType && !data.slotNumber) {
            return event.agreeingSensor() ? NumberOf(event.sensorKey()) : std::nullopt;
        }
        const bool isExpansion =
            data.slotType && std::ranges::find(kTypes, *data.slotType) != kTypes.end();
        return isExpansion ? data.slotNumber : std::nullopt;
    }

private:
    static std::optional<unsigned> NumberIn(const ipmi::Sensor& sensor) {
        constexpr auto kEntities = std::to_array<std::uint8_t>(
            {ipmi::entity::kSystemBoard, 0x0B /* add-in card */,
             0x10 /* internal expansion board */, 0x30 /* PCI bus */, 0x31 /* PCI Express bus */});
        const bool isSlot = sensor.sensorType == ipmi::sensor_type::kSlot &&
                            sensor.eventType == ipmi::kSensorSpecificEvents &&
                            std::ranges::find(kEntities, sensor.entity.id) != kEntities.end();
        return isSlot ? NumberAtEnd(sensor.name) : std::nullopt;
    }

    std::map<ipmi::SensorKey, unsigned> numbers_;
};

std::string SlotId(unsigned number) { return "slot " + std::to_string(number); }

// What the finding of an event is called among those of the node.
std::string GroupOf(const Events& events, std::size_t place, std::size_t burst,
                    const ExpansionSlots& slots) {
    const LoggedEvent& event = events.Logged()[place];
    const auto* const rule = std::ranges::find_if(
        kRules, [&event](const Rule& candidate) { return candidate.applies(event); });
    const std::string prefix = std::to_string(rule - kRules.begin()) + ' ';
    switch (rule->scope) {
        case Scope::kModule:
            return prefix + ModuleId(events, place);
        case Scope::kBurst:
            return prefix + std::to_string(burst);
        case Scope::kDevice: {
            const ipmi::PcieError error = ipmi::ParsePcieError(event.record).value();
            return prefix + ipmisel::Format("%x:%x:%x.%x", error.segment, error.bus, error.device,
                                            error.function);
        }
        case Scope::kSlot: {
            const auto number = slots.NumberOf(event);
            return prefix + (number ? SlotId(*number) : SensorId(event));
        }
        case Scope::kSensorOffset:
            return prefix + SensorId(event) + ' ' + std::to_string(event.record.offset());
        default:
            return prefix + SensorId(event);
    }
}

// Whether a momentary fault is recent: within seven days of the newest record, or, without a time,
// among the last records of the log.
class Recency {
public:
    explicit Recency(std::span<const LoggedEvent> events) : count_(events.size()) {
        for (const LoggedEvent& event : events) {
            if (event.time) newest_ = event.time;
        }
    }
    // A time after that of the newest record is of a clock that was set back since.
    bool IsRecent(const LoggedEvent& event, std::size_t at) const {
        if (event.time && newest_ && *event.time <= *newest_) {
            return *event.time >= *newest_ - kRecent;
        }
        return at + kRecentRecords >= count_;
    }

private:
    std::size_t count_;
    std::optional<std::int64_t> newest_;
};

std::string EvidenceText(const Event& event) {
    if (event.time) return TimeText(*event.time) + ": " + event.sentence;
    if (event.timeKind() != ipmi::TimeKind::kSinceStart) return event.sentence;
    return std::to_string(event.record.time) + " s after the controller's start: " + event.sentence;
}

// What stands behind a title for the events that are not shown in it: those that say the same, and
// the others.
std::string CountText(std::size_t times, std::size_t others) {
    std::string text = times > 1 ? std::to_string(times) + " times" : "";
    if (others > 0) {
        text += (text.empty() ? "and " : ", and ") + std::to_string(others) + " other event" +
                (others == 1 ? "" : "s");
    }
    return text.empty() ? text : " (" + text + ')';
}

std::string TitleOf(const Event& worst) {
    const std::string subject = SubjectText(worst);
    return subject.empty() ? worst.text : subject + ": " + worst.text;
}

// The events of a finding that are not shown one by one, summed up by what they say.
std::vector<std::string> OthersText(const Events& events, std::span<const std::size_t> finding,
                                    const std::set<std::size_t>& shown) {
    std::vector<std::pair<std::string, std::size_t>> kinds;  // in the order of the log
    std::size_t rest = finding.size() - shown.size();
    for (const std::size_t i : finding) {
        if (shown.contains(i)) continue;
        const std::string text = events.TextOf(i);
        const auto kind = std::ranges::find(kinds, text, &decltype(kinds)::value_type::first);
        if (kind != kinds.end()) {
            ++kind->second;
        } else if (kinds.size() < kMaxKinds) {
            kinds.emplace_back(text, 1);
        }
    }
    std::vector<std::string> lines;
    for (const auto& [text, count] : kinds) {
        lines.push_back(std::to_string(count) + " more: " + text);
        rest -= count;
    }
    if (rest > 0) {
        lines.push_back(std::to_string(rest) + " more event" + (rest == 1 ? "" : "s"));
    }
    return lines;
}

// "CPU1 Temp reads 96 degrees C now".
std::string PresentText(const SensorFacts& facts, const Converter& convert) {
    if (!facts.reading || !facts.reading->Available()) return {};
    const auto value = convert(facts.sensor, facts.reading->raw);
    if (!value) return {};
    const std::string unit = ipmi::UnitText(facts.sensor.units);
    return facts.sensor.name + " reads " + NumberText(*value) + (unit.empty() ? "" : ' ' + unit) +
           " now";
}

void AddOrigin(const Event& event, Finding* finding) {
    if (event.severityFrom == SeverityOrigin::kPlatform) {
        finding->evidence.emplace_back("severity by the controller's own event filters");
    } else if (event.severityFrom == SeverityOrigin::kUser) {
        finding->evidence.emplace_back("severity by the user's rules");
    }
}

Finding FindingOf(const Events& events, std::vector<std::size_t> indices,
                  const Converter& convert) {
    const auto logged = events.Logged();
    Finding finding;
    finding.events = std::move(indices);
    // Of equals the last, whose reading is the newest.
    const std::size_t worst =
        *std::ranges::max_element(finding.events, [&logged](std::size_t a, std::size_t b) {
            return std::pair(*logged[a].severity, a) < std::pair(*logged[b].severity, b);
        });
    const Event event = events[worst];
    finding.severity = *event.severity;
    finding.isOpen = event.state == EventState::kOpen;
    finding.part = event.part;
    const auto same = static_cast<std::size_t>(std::ranges::count_if(
        finding.events, [&](std::size_t i) { return events.TextOf(i) == event.text; }));
    finding.title = TitleOf(event) + CountText(same, finding.events.size() - same);

    const std::set<std::size_t> shown{finding.events.front(), worst, finding.events.back()};
    for (const std::size_t i : shown) finding.evidence.push_back(EvidenceText(events[i]));
    for (std::string& line : OthersText(events, finding.events, shown)) {
        finding.evidence.push_back(std::move(line));
    }
    for (const std::size_t i : finding.events) {
        if (logged[i].stillPresent) finding.stillPresent = logged[i].stillPresent;
    }
    if (finding.stillPresent == true && event.sensor != nullptr) {
        std::string present = PresentText(*event.sensor, convert);
        if (present.empty()) present = SensorText(event) + " still says so";
        finding.evidence.push_back(std::move(present));
    }
    AddOrigin(event, &finding);
    return finding;
}

// What a sensor says now as the event that it would have sent.
Event PresentEvent(const SensorFacts& facts, std::uint8_t offset, const Converter& convert) {
    const ipmi::Sensor& sensor = facts.sensor;
    std::uint8_t data1 = offset;
    std::uint8_t reading = 0xFF;
    std::uint8_t threshold = 0xFF;
    if (sensor.IsThreshold()) {
        data1 |= 0x40;  // event data 2 is the reading
        reading = facts.reading->raw;
        const auto limit = facts.thresholds
                               ? facts.thresholds->Get(static_cast<ipmi::Threshold>(offset / 2))
                               : std::nullopt;
        if (limit) {
            data1 |= 0x10;  // event data 3 is the threshold
            threshold = *limit;
        }
    }
    Event event;
    event.record = *ipmi::ParseSelRecord(ipmi::SelBytes{
        0, 0, ipmi::kSystemEventType, 0xFF, 0xFF, 0xFF, 0xFF, sensor.key.owner, sensor.key.lun, 4,
        sensor.sensorType, sensor.key.number, sensor.eventType, data1, reading, threshold});
    event.sensor = &facts;
    event.data = ipmi::DecodeEventData(event.record);
    SetReading(convert, &event);
    return event;
}

// The offsets that hold now by the sensor's reading and are no bare statement of presence.
std::vector<std::uint8_t> PresentOffsets(const SensorFacts& facts) {
    const ipmi::Sensor& sensor = facts.sensor;
    std::vector<std::uint8_t> offsets;
    if (!facts.reading || !facts.reading->Available()) return offsets;
    if (sensor.IsThreshold()) {
        // Of each threshold the offset that stands for being past it.
        constexpr std::array<std::uint8_t, ipmi::kThresholdCount> kPast{0, 2, 4, 7, 9, 11};
        for (unsigned i = 0; i < kPast.size(); ++i) {
            if (facts.reading->Asserted(i)) offsets.push_back(kPast[i]);
        }
        return offsets;
    }
    for (std::uint8_t offset = 0; offset < 15; ++offset) {
        if (facts.reading->Asserted(offset) && (sensor.readingMask >> offset & 1) != 0 &&
            !ipmi::PresenceOf(sensor.eventType, sensor.sensorType, offset)) {
            offsets.push_back(offset);
        }
    }
    return offsets;
}

std::optional<Finding> FindingOfSensor(const NodeFacts& node, const SensorFacts& facts,
                                       const DerivationTools& tools) {
    std::optional<Event> worst;
    for (const std::uint8_t offset : PresentOffsets(facts)) {
        Event event = PresentEvent(facts, offset, tools.convert);
        SetSeverity(node.filters, tools.rules, &event);
        const bool lasts = event.duration == ipmi::Duration::kState;
        if (!lasts || !event.isFault() || (worst && *worst->severity >= *event.severity)) continue;
        worst = std::move(event);
    }
    if (!worst) return std::nullopt;
    worst->part = tools.parts.OfSensor(facts.sensor);
    SetText(&*worst);
    SetSentence(&*worst);
    Finding finding;
    finding.severity = *worst->severity;
    finding.part = worst->part;
    finding.title = TitleOf(*worst);
    finding.evidence.push_back("now: " + worst->sentence);
    finding.evidence.emplace_back("no open event of it in the log");
    AddOrigin(*worst, &finding);
    finding.stillPresent = true;
    return finding;
}

}  // namespace

std::vector<std::size_t> BurstsOf(std::span<const LoggedEvent> events) {
    std::vector<std::size_t> bursts;
    bursts.reserve(events.size());
    std::size_t burst = 0;
    const LoggedEvent* before = nullptr;  // the last one with a time
    for (const LoggedEvent& event : events) {
        if (event.timeKind() != ipmi::TimeKind::kNone) {
            if (before != nullptr &&
                (event.clockChanged ||
                 std::int64_t{event.record.time} - before->record.time > kBurstGap)) {
                ++burst;
            }
            before = &event;
        }
        if (IsLogCleared(event) && !bursts.empty() && bursts.back() == burst) ++burst;
        bursts.push_back(burst);
    }
    return bursts;
}

std::vector<Finding> DeriveFindings(const NodeFacts& node, const Events& events,
                                    const DerivationTools& tools) {
    const auto logged = events.Logged();
    const std::vector<std::size_t> bursts = BurstsOf(logged);
    const Recency recency(logged);
    const ExpansionSlots slots(node);
    std::map<std::string, std::vector<std::size_t>> groups;
    std::map<std::size_t, std::size_t> causeOf;  // by burst
    for (std::size_t i = 0; i < logged.size(); ++i) {
        const LoggedEvent& event = logged[i];
        if (IsLogCleared(event)) {
            // What stood before it is done with; open events are resolved by it anyway.
            std::erase_if(groups, [&logged](const auto& group) {
                return logged[group.second.front()].state != EventState::kOpen;
            });
        }
        if (!event.isFault() || event.continuationOf) continue;
        causeOf.emplace(bursts[i], i);
        const bool isOpen = event.state == EventState::kOpen;
        if (!isOpen && !(event.state == EventState::kMomentary && recency.IsRecent(event, i))) {
            continue;
        }
        groups[(isOpen ? "open " : "momentary ") + GroupOf(events, i, bursts[i], slots)].push_back(
            i);
    }

    std::vector<Finding> findings;
    std::map<unsigned, std::size_t> openSlots;       // findings of expansion slots, by their number
    std::map<ipmi::SensorKey, std::size_t> worstOf;  // of a sensor that has open events
    for (auto& [name, indices] : groups) {
        const LoggedEvent& first = logged[indices.front()];
        if (const auto number = slots.NumberOf(first);
            number && IsOfSlot(first) && first.state == EventState::kOpen) {
            openSlots.emplace(*number, findings.size());
        }
        Finding& finding =
            findings.emplace_back(FindingOf(events, std::move(indices), tools.convert));
        finding.firstCause = causeOf.at(bursts[finding.events.front()]);
        if (!finding.isOpen) continue;
        for (const std::size_t i : finding.events) {
            if (logged[i].agreeingSensor() == nullptr) continue;
            std::size_t& worst =
                worstOf.try_emplace(logged[i].sensorKey(), findings.size() - 1).first->second;
            if (findings[worst].severity < finding.severity) worst = findings.size() - 1;
        }
    }
    for (const SensorFacts& facts : node.sensors) {
        auto finding = FindingOfSensor(node, facts, tools);
        if (!finding) continue;
        if (const auto known = worstOf.find(facts.sensor.key); known != worstOf.end()) {
            // It has grown worse since its last event, which a full log may have dropped.
            Finding& told = findings[known->second];
            if (told.severity >= finding->severity) continue;
            told.severity = finding->severity;
            told.title = std::move(finding->title);
            told.evidence.push_back(std::move(finding->evidence.front()));
            told.stillPresent = true;
            continue;
        }
        const auto number = slots.NumberOf(facts.sensor.key);
        const auto known = number ? openSlots.find(*number) : openSlots.end();
        if (known == openSlots.end()) {
            findings.push_back(std::move(*finding));
            continue;
        }
        // The firmware told of the slot, and its sensor says so too.
        Finding& told = findings[known->second];
        told.severity = std::max(told.severity, finding->severity);
        told.evidence.push_back(std::move(finding->evidence.front()));
        told.stillPresent = true;
    }
    std::ranges::stable_sort(findings, [&events](const Finding& a, const Finding& b) {
        const auto place = [&events](const Finding& finding) {
            return finding.events.empty() ? events.size() : finding.events.front();
        };
        if (a.severity != b.severity) return a.severity > b.severity;
        if (a.isOpen != b.isOpen) return a.isOpen;
        return place(a) < place(b);
    });
    return findings;
}

}  // namespace standard
