#include "program/store/visit_recorder.h"

#include <algorithm>
#include <chrono>
#include <iterator>
#include <span>
#include <utility>

#include "base/hex.h"
#include "base/sha256.h"
#include "program/reports/completeness_json.h"
#include "program/reports/json_text.h"
#include "program/reports/terminal_text.h"
#include "program/reports/view.h"

namespace ipmisel {
namespace {

constexpr std::size_t kKeyBytes = 16;

std::int64_t Now() {
    const auto now = std::chrono::system_clock::now().time_since_epoch();
    return std::chrono::duration_cast<std::chrono::seconds>(now).count();
}

std::string DigestOf(std::string_view text) {
    const auto digest =
        Sha256(std::span(reinterpret_cast<const std::uint8_t*>(text.data()), text.size()));
    return HexText(std::span(digest).first(kKeyBytes));
}

std::string PropertiesOf(const NQORTQR20::Instance& instance) {
    return "{" + JsonProperties(instance) + "}";
}

/// What of a controller holds for the moment only.
constexpr std::string_view kMomentary[] = {
    "SelfTest",         "Time",    "ClockOffsetSeconds", "ClockUncertaintySeconds",
    "UTCOffsetMinutes", "PowerOn", "LastPowerEvent",     "PowerFaults",
    "ChassisIntrusion"};

NQORTQR20::Instance Without(NQORTQR20::Instance instance,
                            std::span<const std::string_view> properties) {
    std::erase_if(instance.properties, [&](const auto& property) {
        return std::find(properties.begin(), properties.end(), property.first) != properties.end();
    });
    return instance;
}

std::optional<std::int64_t> SecondsOf(const MaybeTime& time) {
    return time ? std::optional(time->seconds) : std::nullopt;
}

std::string NameOf(const std::optional<Severity>& severity) {
    return severity ? std::string(InfoOf(*severity).name) : "";
}

VisitEvent EventOfVisit(const NQORTQR20::Instance& instance) {
    const Event event = EventOf(instance);
    // What follows from the two clocks of the moment is no change of the event.
    NQORTQR20::Instance lasting = instance;
    std::erase_if(lasting.properties,
                  [](const auto& property) { return property.first == "CorrectedTime"; });
    return {event.key,
            event.recordId.value_or(0),
            SecondsOf(event.time),
            NameOf(event.severity),
            event.state,
            event.sensor,
            event.part,
            event.sentence,
            event.raw,
            PropertiesOf(instance),
            DigestOf(PropertiesOf(lasting))};
}

VisitFinding FindingOfVisit(const NQORTQR20::Instance& instance) {
    const Finding finding = FindingOf(instance);
    VisitFinding found{.key = finding.events.empty() ? "" : finding.events.front(),
                       .severity = NameOf(finding.severity),
                       .state = "",
                       .title = finding.title,
                       .part = finding.part,
                       .partNumber = finding.partNumber,
                       .serial = finding.serialNumber,
                       .firstTime = SecondsOf(finding.firstTime),
                       .lastTime = SecondsOf(finding.lastTime),
                       .count = finding.count.value_or(0),
                       .events = finding.events,
                       .properties = PropertiesOf(instance)};
    for (const auto& [name, value] : instance.properties) {
        const auto* const text = std::get_if<std::string>(&value);
        if (name == "State" && text != nullptr) found.state = *text;
    }
    return found;
}

void AddParts(const NQORTQR20::Instance& instance, Visit* visit) {
    const Fru fru = FruOf(instance);
    const std::string number = "FRU " + std::to_string(fru.deviceId.value_or(0));
    std::string slot = fru.name.empty() ? number : fru.name;
    const auto taken = [&](const VisitPart& part) { return part.slot == slot; };
    if (std::any_of(visit->parts.begin(), visit->parts.end(), taken)) slot += ", " + number;
    const std::string properties = PropertiesOf(instance);
    visit->parts.push_back({"part", slot, fru.manufacturer, fru.product, fru.partNumber,
                            fru.serialNumber, fru.version, properties});
    if (fru.modulePartNumber.empty() && fru.moduleSerialNumber.empty()) return;
    visit->parts.push_back({"module", slot, fru.moduleManufacturer, fru.moduleType,
                            fru.modulePartNumber, fru.moduleSerialNumber, "", properties});
}

}  // namespace

std::vector<std::string> StoredClasses() {
    std::vector<std::string> names;
    for (const std::string_view name : {kControllerClass, kFruClass, kEventClass, kFindingClass}) {
        names.emplace_back(name);
    }
    return names;
}

VisitRecorder::VisitRecorder(ReportWriter& report, std::size_t nodes,
                             std::vector<std::string> reported, std::set<std::string> withheld)
    : report_(report),
      reported_(std::move(reported)),
      withheld_(std::move(withheld)),
      visits_(nodes) {}

void VisitRecorder::Add(const NQORTQR20::Instance& instance) {
    bool known = false;
    const std::int64_t node = NodeOf(instance, "Node").value_or(1);
    if (node >= 1 && static_cast<std::size_t>(node) <= visits_.size()) {
        Visit& visit = visits_[static_cast<std::size_t>(node - 1)];
        const std::size_t events = visit.events.size();
        Record(instance, &visit);
        known = visit.events.size() > events && withheld_.contains(visit.events.back().key);
    }
    const bool wanted =
        std::find(reported_.begin(), reported_.end(), instance.className) != reported_.end();
    if (wanted && !known) report_.Add(instance);
}

void VisitRecorder::Record(const NQORTQR20::Instance& instance, Visit* visit) {
    if (instance.className == kEventClass) {
        visit->events.push_back(EventOfVisit(instance));
    } else if (instance.className == kFruClass) {
        AddParts(instance, visit);
    } else if (instance.className == kFindingClass) {
        visit->findings.push_back(FindingOfVisit(instance));
    } else if (instance.className == kControllerClass) {
        const Controller controller = ControllerOf(instance);
        visit->guid = controller.guid;
        visit->manufacturer = controller.manufacturer;
        visit->product = controller.product;
        visit->serial = controller.serialNumber;
        if (controller.firmware.empty()) return;
        visit->parts.push_back(
            {"firmware", "Controller", controller.controllerManufacturer, "", "", "",
             controller.firmware +
                 (controller.auxiliaryRevision.empty() ? "" : " " + controller.auxiliaryRevision),
             PropertiesOf(Without(instance, kMomentary))});
    }
}

StoredCollection::StoredCollection(std::string uri, bool onlyNew)
    : uri_(std::move(uri)), onlyNew_(onlyNew), started_(Now()) {
    const Store store(uri_);
}

void StoredCollection::Begin(const std::vector<SystemInfo>& systems) {
    Store store(uri_);
    for (const SystemInfo& system : systems) {
        std::string name = system.name;
        for (int i = 2; std::find(names_.begin(), names_.end(), name) != names_.end(); ++i) {
            name = system.name + " node " + std::to_string(i);
        }
        before_.push_back(store.Find(name));
        names_.push_back(std::move(name));
        sources_.push_back(system.source);
    }
}

std::vector<std::optional<NQORTQR20::KnownController>> StoredCollection::Known() const {
    std::vector<std::optional<NQORTQR20::KnownController>> known;
    if (!onlyNew_) return known;
    for (const auto& system : before_) {
        known.push_back(system ? system->known : std::nullopt);
    }
    return known;
}

bool StoredCollection::Unchanged(const std::vector<NQORTQR20::NodeReading>& readings) {
    return !readings.empty() &&
           std::all_of(readings.begin(), readings.end(), [](const auto& reading) {
               return reading.logChange == NQORTQR20::LogChange::kUnchanged;
           });
}

std::vector<std::string> StoredCollection::NoticesOfUnchanged() const {
    std::vector<std::string> notices;
    for (std::size_t node = 0; node < names_.size(); ++node) {
        const auto& read = before_[node]->logRead;
        notices.push_back(names_[node] + ": the event log is unchanged" +
                          (read ? " since " + NQORTQR20::TimeText({*read}) : "") +
                          "; nothing else was read");
    }
    return notices;
}

ReportWriter& StoredCollection::Record(ReportWriter& report, std::vector<std::string> reported) {
    std::set<std::string> withheld;
    if (onlyNew_) {
        Store store(uri_);
        for (const std::string& name : names_) withheld.merge(store.KeysOf(name));
    }
    recorder_ = std::make_unique<VisitRecorder>(report, names_.size(), std::move(reported),
                                                std::move(withheld));
    return *recorder_;
}

void StoredCollection::Finish(const ReportEnd& end, std::vector<NQORTQR20::NodeReading> readings) {
    Store store(uri_);
    const std::int64_t finished = Now();
    if (Unchanged(readings)) {
        for (const auto& system : before_) store.AddUnchanged(*system, started_, finished);
        return;
    }
    readings.resize(names_.size());
    const Json completeness = CompletenessJson(end);
    const Outcome outcome = OutcomeOf(end);
    const bool passed =
        end.status.code == NQORTQR20::kStatusOk && end.stopped == NQORTQR20::StopReason::kNone;
    for (std::size_t node = 0; node < names_.size(); ++node) {
        Visit& visit = recorder_->Visits()[node];
        const NQORTQR20::NodeCompleteness& account = end.completeness.at(node);
        visit.name = names_[node];
        visit.source = sources_[node];
        visit.started = started_;
        visit.finished = finished;
        // Events, of which the log announced some, that did not come were not all told.
        visit.complete = passed && account.Whole();
        visit.identityRead = readings[node].guidAnswered;
        visit.partsRead = account.inventory.Missing() == 0;
        if (!visit.complete) visit.problem = outcome.problem;
        visit.completeness = JsonLine(completeness.at(node));
        visit.known = std::move(readings[node].known);
        for (VisitFinding& finding : visit.findings) {
            // One that only a sensor tells has no event to be known by.
            if (finding.key.empty()) {
                finding.key = DigestOf(visit.Identity() + "\n" + visit.name + "\n" + finding.title +
                                       "\n" + finding.part);
            }
        }
        for (const std::string& line : store.Add(visit, before_[node])) SayOf(visit.name, line);
    }
}

void StoredCollection::Fail(const std::vector<std::string>& names, const std::string& problem) {
    Store store(uri_);
    for (const std::string& name : names) store.AddFailed(name, started_, Now(), problem);
}

}  // namespace ipmisel
