#include "plugins/standard/event_state.h"

#include <algorithm>
#include <cstddef>
#include <map>
#include <tuple>
#include <utility>
#include <vector>

#include "ipmi/entities.h"
#include "ipmi/event_types.h"

namespace standard {

namespace {

using SensorAndTypes = std::tuple<ipmi::SensorKey, std::uint8_t, std::uint8_t, std::uint8_t>;

SensorAndTypes KeyOf(const LoggedEvent& event) {
    return {event.sensorKey(), event.record.generator.channel, event.record.sensorType,
            event.record.eventType};
}

// The place where a part is put: an entity of the node, or of one controller where it is relative
// to that; else what one sensor watches.
struct Place {
    ipmi::Entity entity;
    ipmi::SensorKey sensor;
    auto operator<=>(const Place&) const = default;
};

Place PlaceOfSensor(const LoggedEvent& event) {
    return {.entity = {}, .sensor = event.sensorKey()};
}

std::optional<Place> PlaceOfEntity(const LoggedEvent& event) {
    const SensorFacts* const facts = event.agreeingSensor();
    if (facts == nullptr || !ipmi::IsPhysicalEntity(facts->sensor.entity.id)) return std::nullopt;
    const ipmi::Entity& entity = facts->sensor.entity;
    Place place{.entity = entity, .sensor = {}};
    if (entity.IsDeviceRelative()) place.sensor.owner = event.sensorKey().owner;
    return place;
}

// What a record of presence says is there or not.
Place PlaceOfPresence(const LoggedEvent& event) {
    const std::optional<Place> entity = PlaceOfEntity(event);
    return entity && TellsOfItsEntity(event.sensor->sensor) ? *entity : PlaceOfSensor(event);
}

// What a sensor said of one of its offsets.
struct Statement {
    std::uint8_t offset = 0;
    bool deassertion = false;
    auto operator<=>(const Statement&) const = default;
};

// Whether the event takes back what its sensor said before.
bool TakesBack(const ipmi::SelRecord& now, const Statement& before) {
    if (now.offset() == before.offset) return now.deassertion != before.deassertion;
    return !now.deassertion && !before.deassertion &&
           ipmi::Excludes(now.eventType, now.sensorType, now.offset(), before.offset);
}

std::optional<ipmi::Presence> PresenceToldBy(const LoggedEvent& event) {
    const ipmi::SelRecord& record = event.record;
    const auto presence = ipmi::PresenceOf(record.eventType, record.sensorType, record.offset());
    if (!presence || !record.deassertion) return presence;
    return *presence == ipmi::Presence::kPresent ? ipmi::Presence::kAbsent
                                                 : ipmi::Presence::kPresent;
}

class Pairing {
public:
    explicit Pairing(std::span<LoggedEvent> events) : events_(events) {}

    void Run() {
        for (std::size_t i = 0; i < events_.size(); ++i) {
            LoggedEvent& event = events_[i];
            if (IsLogCleared(event)) ResolveAll(i);
            if (event.isSensorEvent()) {
                Sensor(i);
                PartReplaced(i);
            }
            SetOwnState(i);
        }
    }

private:
    void SetOwnState(std::size_t i) {
        LoggedEvent& event = events_[i];
        if (event.continuationOf) return;
        if (event.duration == ipmi::Duration::kMomentary) {
            if (!event.record.deassertion || event.isFault()) event.state = EventState::kMomentary;
        } else if (event.isFault()) {
            event.state = EventState::kOpen;
            open_.push_back(i);
            if (event.isSensorEvent()) {
                const ipmi::SelRecord& record = event.record;
                openOf_[KeyOf(event)][{record.offset(), record.deassertion}].push_back(i);
                openAt_[PlaceOfSensor(event)].push_back(i);
                if (const auto entity = PlaceOfEntity(event)) openAt_[*entity].push_back(i);
            }
        }
    }

    bool IsOpen(std::size_t i) const { return events_[i].state == EventState::kOpen; }
    void Resolve(std::size_t i, std::size_t by) {
        events_[i].state = EventState::kResolved;
        events_[i].resolvedBy = by;
    }

    void ResolveAll(std::size_t by) {
        for (const std::size_t i : open_) {
            if (IsOpen(i)) Resolve(i, by);
        }
        open_.clear();
        openOf_.clear();
        openAt_.clear();
    }

    void Sensor(std::size_t now) {
        const auto found = openOf_.find(KeyOf(events_[now]));
        if (found == openOf_.end()) return;
        for (auto& [statement, open] : found->second) {
            if (!TakesBack(events_[now].record, statement)) continue;
            for (const std::size_t i : open) {
                if (IsOpen(i) && events_[now].target.MayBe(events_[i].target)) Resolve(i, now);
            }
            std::erase_if(open, [this](std::size_t i) { return !IsOpen(i); });
        }
    }

    // What was open before a part went is over when one has come in its place.
    void PartReplaced(std::size_t now) {
        const auto presence = PresenceToldBy(events_[now]);
        if (!presence) return;
        const Place place = PlaceOfPresence(events_[now]);
        if (*presence == ipmi::Presence::kAbsent) {
            goneAt_[place] = now;
            return;
        }
        const auto gone = goneAt_.find(place);
        if (gone == goneAt_.end()) return;
        for (const std::size_t i : openAt_[place]) {
            if (i <= gone->second && IsOpen(i) && events_[now].target.MayBe(events_[i].target)) {
                Resolve(i, now);
            }
        }
        std::erase_if(openAt_[place], [this](std::size_t i) { return !IsOpen(i); });
        goneAt_.erase(gone);
    }

    std::span<LoggedEvent> events_;
    std::vector<std::size_t> open_;
    std::map<SensorAndTypes, std::map<Statement, std::vector<std::size_t>>> openOf_;
    std::map<Place, std::vector<std::size_t>> openAt_;
    std::map<Place, std::size_t> goneAt_;
};

// The thresholds whose comparison Get Sensor Reading answers: bits 14..12 of the lower and of the
// upper threshold reading mask (table 43-1, bytes 15 to 18).
unsigned ComparisonMask(const ipmi::Sensor& sensor) {
    return (sensor.assertionMask >> 12 & 7U) | (sensor.deassertionMask >> 12 & 7U) << 3;
}

// Whether what the event says holds by the sensor's present reading.
std::optional<bool> IsPresent(const LoggedEvent& event) {
    const SensorFacts& facts = *event.sensor;
    const ipmi::SelRecord& record = event.record;
    if (!facts.reading || !facts.reading->Available() || !facts.reading->states ||
        facts.sensor.eventType != record.eventType ||
        facts.sensor.sensorType != record.sensorType) {
        return std::nullopt;
    }
    // Two offsets for each threshold, down and up.
    const bool isThreshold = record.eventType == ipmi::kThresholdEvents;
    const unsigned bit = isThreshold ? record.offset() / 2 : record.offset();
    const bool asserted = facts.reading->Asserted(bit);
    const bool told =
        isThreshold ? ComparisonMask(facts.sensor) >> bit & 1 : facts.sensor.readingMask >> bit & 1;
    if (!asserted && !told) return std::nullopt;
    return asserted != record.deassertion;
}

}  // namespace

void SetStates(std::span<LoggedEvent> events) { Pairing(events).Run(); }

void SetPresentStates(std::span<LoggedEvent> events) {
    for (LoggedEvent& event : events) {
        if (event.state != EventState::kOpen || event.sensor == nullptr) continue;
        const std::optional<bool> present = IsPresent(event);
        if (!present) continue;
        if (event.duration == ipmi::Duration::kState) {
            event.stillPresent = present;
            if (!*present) event.state = EventState::kResolved;
        } else if (*present) {
            event.stillPresent = true;
        }
    }
}

}  // namespace standard
