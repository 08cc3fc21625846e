#include "plugins/standard/parts.h"

#include <algorithm>
#include <array>
#include <chrono>
#include <numeric>
#include <set>
#include <string>
#include <string_view>
#include <utility>
#include <variant>

#include "base/text.h"
#include "ipmi/entities.h"
#include "ipmi/event_data.h"
#include "ipmi/event_types.h"
#include "ipmi/sensor_types.h"
#include "ipmi/severity.h"
#include "ipmi/timestamp.h"
#include "plugins/standard/event.h"

namespace standard {

/// A part that may be meant, with what tells whether it was there already.
struct Parts::Candidate {
    Part part;
    std::vector<EntityKey> entities;
    std::optional<std::int64_t> made;           ///< seconds since 1970-01-01
    std::optional<unsigned> memoryModule = {};  ///< its number as the controller counts
};

struct Parts::Found {
    std::vector<Candidate> candidates;
    bool certain = false;

    void Add(Candidate candidate) {
        const bool known = std::any_of(candidates.begin(), candidates.end(),
                                       [&](const auto& c) { return c.part == candidate.part; });
        if (!known) candidates.push_back(std::move(candidate));
    }
};

namespace {

constexpr std::uint8_t kSystemChassis = 0x17;
constexpr std::uint8_t kSubChassis = 0x18;

/// Entities that are ordered and exchanged by themselves: what contains them is another part.
constexpr auto kPartsOfTheirOwn = std::to_array<std::uint8_t>(
    {ipmi::entity::kProcessor, 0x04 /* disk */, ipmi::entity::kMemoryModule,
     0x09 /* processor module */, ipmi::entity::kPowerSupply, 0x0B /* add-in card */,
     ipmi::entity::kMemoryDevice});

bool IsMemory(std::uint8_t entityId) {
    return entityId == ipmi::entity::kMemoryModule || entityId == ipmi::entity::kMemoryDevice;
}

EntityKey KeyOf(const ipmi::Sensor& sensor) {
    return {sensor.entity, sensor.key.owner, sensor.channel};
}

/// Those of a list that carry the number in their label.
template <typename T, typename Label>
std::vector<const T*> Labelled(const std::vector<T>& list, unsigned number, Label label) {
    std::vector<const T*> found;
    for (const T& item : list) {
        if (NumberAtEnd(label(item)) == number) found.push_back(&item);
    }
    return found;
}

/// Those that are meant when counting begins with 0, and with 1.
template <typename T>
std::vector<const T*> Counted(const std::vector<T>& list, unsigned number) {
    std::vector<const T*> found;
    if (number >= 1 && number - 1 < list.size()) found.push_back(&list[number - 1]);
    if (number < list.size()) found.push_back(&list[number]);
    return found;
}

std::string SlotOf(const ipmi::SmbiosMemoryDevice& device) { return device.slot; }
std::string SocketOf(const ipmi::SmbiosProcessor& processor) { return processor.socket; }
std::string NameOf(const FruDevice& device) { return device.name; }

Part PartOf(const ipmi::SmbiosMemoryDevice& device) {
    return {device.slot.empty() ? device.bank : device.slot, device.partNumber,
            device.serialNumber};
}
Part PartOf(const ipmi::SmbiosProcessor& processor) {
    return {processor.socket, processor.partNumber, processor.serialNumber};
}

/// The part that a FRU device is the inventory of. A system board has the numbers of the board and
/// a chassis those of the chassis, where the device tells them apart from the product.
Part PartOf(const FruDevice& device, const ipmi::Entity& entity) {
    Part part{device.name.empty() ? ipmi::EntityText(entity.id, entity.instance) : device.name,
              device.PartNumber(), device.SerialNumber()};
    if (!device.inventory) return part;
    if (entity.id == ipmi::entity::kSystemBoard && device.inventory->board) {
        part.partNumber = device.inventory->board->partNumber;
        part.serialNumber = device.inventory->board->serialNumber;
    } else if (entity.id == kSystemChassis && device.inventory->chassis) {
        part.partNumber = device.inventory->chassis->partNumber;
        part.serialNumber = device.inventory->chassis->serialNumber;
    }
    return part;
}

std::optional<std::int64_t> MadeAt(const FruDevice& device) {
    using std::chrono::January;
    if (device.inventory && device.inventory->board) return device.inventory->board->manufactured;
    if (!device.module || !device.module->manufactured) return std::nullopt;
    const auto [year, week] = *device.module->manufactured;
    const std::chrono::sys_days start(std::chrono::year(static_cast<int>(year)) / January / 1);
    return std::chrono::sys_seconds(start + std::chrono::weeks(week - 1))
        .time_since_epoch()
        .count();
}

/// Whether the record says that a part was taken out, or exchanged.
bool TellsOfRemoval(const ipmi::SelRecord& record) {
    constexpr std::uint8_t kHardwareChanged = 0;
    constexpr std::uint8_t kHardwareChangeSucceeded = 6;
    if (record.kind != ipmi::RecordKind::kSensorEvent) return false;
    const auto presence = ipmi::PresenceOf(record.eventType, record.sensorType, record.offset());
    if (presence) return (*presence == ipmi::Presence::kAbsent) != record.deassertion;
    return record.sensorType == ipmi::sensor_type::kVersionChange &&
           record.eventType == ipmi::kSensorSpecificEvents && !record.deassertion &&
           (record.offset() == kHardwareChanged || record.offset() == kHardwareChangeSucceeded);
}

/// Whether two events of one sensor may be about one part: one that tells of several modules names
/// the module.
bool MayBeOfOnePart(const ipmi::SelRecord& one, const ipmi::SelRecord& other) {
    const auto first = ipmi::DecodeEventData(one).memoryModule;
    const auto second = ipmi::DecodeEventData(other).memoryModule;
    return !first || !second || *first == *second;
}

/// Whether the record names that module itself.
bool IsOfModule(const Event& event, unsigned number) {
    if (event.data.memoryModule) return *event.data.memoryModule == number;
    if (event.data.slotType == ipmi::kMemorySlot) return event.data.slotNumber == number;
    const SensorFacts* const facts = event.agreeingSensor();
    return facts != nullptr && IsMemory(facts->sensor.entity.id) &&
           facts->sensor.entity.instance == number;
}

bool MadeAfter(const std::optional<std::int64_t>& made, const ipmi::SelRecord& record) {
    constexpr std::int64_t kDay = 86400;  // neither time is certain of its zone
    return made && ipmi::KindOfTime(record.time) == ipmi::TimeKind::kClock &&
           *made > record.time + kDay;
}

}  // namespace

Parts::Parts(PartFacts facts, const NodeFacts& node) : facts_(std::move(facts)), node_(&node) {
    for (std::size_t i = 0; i < node.log.size(); ++i) {
        if (TellsOfRemoval(node.log[i])) removals_.push_back(i);
    }
    if (!removals_.empty()) {
        byBytes_.resize(node.log.size());
        std::iota(byBytes_.begin(), byBytes_.end(), 0U);
        std::ranges::stable_sort(byBytes_, {}, [&](std::uint32_t i) { return node.log[i].bytes; });
    }
    // A module that the firmware lists twice, all alike, is one.
    auto& modules = facts_.smbios.memoryDevices;
    for (auto module = modules.begin(); module != modules.end();) {
        const bool again = std::any_of(modules.begin(), module, [&](const auto& earlier) {
            return !module->slot.empty() && PartOf(earlier) == PartOf(*module);
        });
        module = again ? modules.erase(module) : module + 1;
    }
}

// ---- By entity ----------------------------------------------------------------------------------

std::vector<const FruDevice*> Parts::DevicesOf(const EntityKey& key) const {
    std::vector<const FruDevice*> found;
    for (const FruDevice& device : facts_.devices) {
        const auto& entities = device.entities;
        if (std::find(entities.begin(), entities.end(), key) != entities.end()) {
            found.push_back(&device);
        }
    }
    return found;
}

Parts::Found Parts::OfDevices(const std::vector<const FruDevice*>& devices,
                              const EntityKey& key) const {
    Found found;
    for (const FruDevice* device : devices) {
        found.Add({PartOf(*device, key.entity), device->entities, MadeAt(*device)});
    }
    found.certain = found.candidates.size() == 1 && devices[0]->IsSound();
    return found;
}

/// Only where every number that the sensors give the entity is on a label: else the controller
/// counts in another way than the labels do.
std::optional<Parts::Found> Parts::BySmbios(const EntityKey& key) const {
    const bool memory = IsMemory(key.entity.id);
    if ((!memory && key.entity.id != ipmi::entity::kProcessor) || key.entity.IsDeviceRelative()) {
        return std::nullopt;
    }
    const auto labelled = [&](unsigned number) {
        return memory ? Labelled(facts_.smbios.memoryDevices, number, SlotOf).size()
                      : Labelled(facts_.smbios.processors, number, SocketOf).size();
    };
    for (const SensorFacts& sensor : node_->sensors) {
        const ipmi::Entity& entity = sensor.sensor.entity;
        if (entity.id == key.entity.id && labelled(entity.instance) != 1) return std::nullopt;
    }
    const unsigned number = key.entity.instance;
    if (labelled(number) != 1) return std::nullopt;
    const Part part = memory ? PartOf(*Labelled(facts_.smbios.memoryDevices, number, SlotOf)[0])
                             : PartOf(*Labelled(facts_.smbios.processors, number, SocketOf)[0]);
    return Found{{{part, {key}, {}}}, false};
}

std::optional<Parts::Found> Parts::ByContainer(const EntityKey& key) const {
    const auto isOneOf = [](std::uint8_t id, const auto& ids) {
        return std::find(ids.begin(), ids.end(), id) != ids.end();
    };
    std::set<EntityKey> seen;
    std::vector<EntityKey> contained{key};
    // From container to container outwards; each entity is looked at once.
    for (std::size_t i = 0; i < contained.size(); ++i) {
        const EntityKey inner = contained[i];
        if (!seen.insert(inner).second || isOneOf(inner.entity.id, kPartsOfTheirOwn)) continue;
        for (const ipmi::EntityAssociation& association : facts_.associations) {
            if (!association.Contains(inner.entity)) continue;
            const auto& members = association.members;
            const bool sameDevice =
                !inner.entity.IsDeviceRelative() ||
                std::any_of(members.begin(), members.end(), [&](const auto& member) {
                    return member.address == inner.address && member.channel == inner.channel;
                });
            if (!sameDevice) continue;
            const EntityKey outer(association.container, association.containerAddress,
                                  association.containerChannel);
            // A chassis contains everything; what is in it is not the chassis.
            if (outer.entity.id == kSystemChassis || outer.entity.id == kSubChassis) continue;
            const auto devices = DevicesOf(outer);
            if (!devices.empty()) {
                Found found = OfDevices(devices, outer);
                found.certain = false;
                return found;
            }
            contained.push_back(outer);
        }
    }
    return std::nullopt;
}

Parts::Found Parts::ByEntity(const EntityKey& key, bool logical) const {
    if (!ipmi::IsPhysicalEntity(key.entity.id)) return {};
    if (const auto devices = DevicesOf(key); !devices.empty()) return OfDevices(devices, key);
    if (logical) return {};  // a group of parts, for which no inventory stands
    if (auto found = BySmbios(key)) return *std::move(found);
    if (auto found = ByContainer(key)) return *std::move(found);
    return {{{{ipmi::EntityText(key.entity.id, key.entity.instance), "", ""}, {key}, {}}}, true};
}

// ---- By event data ------------------------------------------------------------------------------

Parts::Found Parts::ByMemoryModule(unsigned number) const {
    std::vector<FruDevice> modules;
    for (const FruDevice& device : facts_.devices) {
        const bool memory =
            std::any_of(device.entities.begin(), device.entities.end(),
                        [](const EntityKey& key) { return IsMemory(key.entity.id); });
        if (memory) modules.push_back(device);
    }
    const auto slots = Labelled(facts_.smbios.memoryDevices, number, SlotOf);
    const auto devices = Labelled(modules, number, NameOf);
    const bool oneSlot = !slots.empty() && std::all_of(slots.begin(), slots.end(), [&](auto* slot) {
        return slot->slot == slots[0]->slot;
    });
    Found found;
    if (oneSlot) {
        for (const auto* slot : slots) found.Add({PartOf(*slot), {}, {}});
    }
    const bool hasNumbers = std::any_of(
        found.candidates.begin(), found.candidates.end(), [](const Candidate& candidate) {
            return !candidate.part.partNumber.empty() || !candidate.part.serialNumber.empty();
        });
    if (!hasNumbers && devices.size() == 1) {
        const FruDevice& device = *devices[0];
        Candidate candidate{PartOf(device, {}), device.entities, MadeAt(device)};
        if (found.candidates.size() == 1) candidate.part.name = found.candidates[0].part.name;
        found.candidates = {std::move(candidate)};
    }
    found.certain = found.candidates.size() == 1;
    if (found.candidates.empty()) {
        for (const auto* module : Counted(facts_.smbios.memoryDevices, number)) {
            if (module->isInstalled()) found.Add({PartOf(*module), {}, {}});
        }
    }
    if (found.candidates.empty()) {
        found.Add({{ipmisel::Format("Memory Module %u", number), "", ""}, {}, {}});
    }
    for (Candidate& candidate : found.candidates) candidate.memoryModule = number;
    return found;
}

std::optional<Parts::Found> Parts::BySlot(unsigned type, unsigned number,
                                          const ipmi::Sensor* sensor) const {
    if (type == ipmi::kMemorySlot) return ByMemoryModule(number);
    if (type == ipmi::kEntitySlot && sensor != nullptr && number < 0x80) {
        ipmi::Entity entity = sensor->entity;
        entity.instance = static_cast<std::uint8_t>(number);
        return ByEntity({entity, sensor->key.owner, sensor->channel}, false);
    }
    if (type != ipmi::kPciSlot && type != ipmi::kExpansionSlot && type != ipmi::kPciExpressSlot) {
        return std::nullopt;
    }
    auto slots = Labelled(facts_.smbios.slots, number,
                          [](const ipmi::SmbiosSlot& slot) { return slot.designation; });
    if (slots.size() != 1) {
        slots.clear();
        for (const ipmi::SmbiosSlot& slot : facts_.smbios.slots) {
            if (slot.id == number && !slot.designation.empty()) slots.push_back(&slot);
        }
    }
    if (slots.size() != 1) return std::nullopt;
    return Found{{{{slots[0]->designation, "", ""}, {}, {}}}, true};
}

std::optional<Parts::Found> Parts::ByPciAddress(const ipmi::SmbiosSlot::Address& address) const {
    Found found;
    for (const ipmi::SmbiosSlot& slot : facts_.smbios.slots) {
        if (!slot.address || slot.designation.empty()) continue;
        // The functions of one device are in one slot.
        if (slot.address->segment == address.segment && slot.address->bus == address.bus &&
            slot.address->device == address.device) {
            found.Add({{slot.designation, "", ""}, {}, {}});
        }
    }
    if (found.candidates.empty()) return std::nullopt;
    found.certain = true;
    return found;
}

std::optional<Parts::Found> Parts::ByEventData(const Event& event) const {
    const ipmi::EventData& data = event.data;
    if (const auto error = ipmi::ParsePcieError(event.record)) {
        return ByPciAddress({error->segment, error->bus, error->device, error->function});
    }
    if (data.memoryModule) return ByMemoryModule(*data.memoryModule);
    if (data.slotType && data.slotNumber) {
        const SensorFacts* const facts = event.agreeingSensor();
        const ipmi::Sensor* const sensor = facts == nullptr ? nullptr : &facts->sensor;
        if (auto found = BySlot(*data.slotType, *data.slotNumber, sensor)) return found;
    }
    if (data.processorInstance) {
        const auto& all = facts_.smbios.processors;
        auto processors = Labelled(all, *data.processorInstance, SocketOf);
        Found found;
        found.certain = processors.size() == 1;
        if (!found.certain) processors = Counted(all, *data.processorInstance);
        const EntityKey entity({ipmi::entity::kProcessor, *data.processorInstance}, 0, 0);
        for (const auto* processor : processors) found.Add({PartOf(*processor), {entity}, {}});
        if (!found.candidates.empty()) return found;
    }
    if (data.fruDevice && event.sensorKey().owner == ipmi::kBmcAddress) {
        for (const FruDevice& device : facts_.devices) {
            if (device.deviceId == *data.fruDevice &&
                device.controllerAddress == ipmi::kBmcAddress) {
                return OfDevices({&device},
                                 device.entities.empty() ? EntityKey() : device.entities[0]);
            }
        }
    }
    return std::nullopt;
}

// ---- Answers ------------------------------------------------------------------------------------

bool Parts::IsGoneSince(const Event& event, const Candidate& candidate) const {
    if (MadeAfter(candidate.made, event.record)) return true;
    // Of equal records the first.
    const auto place = std::ranges::lower_bound(
        byBytes_, event.record.bytes, {}, [&](std::uint32_t i) { return node_->log[i].bytes; });
    if (place == byBytes_.end() || node_->log[*place] != event.record) return false;
    // The removal itself is about the part that went, too.
    const auto later = std::lower_bound(removals_.begin(), removals_.end(), *place);
    return std::any_of(later, removals_.end(),
                       [&](std::size_t at) { return Removes(node_->log[at], event, candidate); });
}

bool Parts::Removes(const ipmi::SelRecord& record, const Event& event,
                    const Candidate& candidate) const {
    Event removal;
    removal.record = record;
    removal.data = ipmi::DecodeEventData(record);
    removal.sensor = node_->FindSensor(removal.sensorKey());
    if (removal.sensorKey() == event.sensorKey() && record.sensorType == event.record.sensorType) {
        return MayBeOfOnePart(record, event.record);
    }
    if (candidate.memoryModule && IsOfModule(removal, *candidate.memoryModule)) return true;
    const SensorFacts* const facts = removal.agreeingSensor();
    if (facts == nullptr) return false;
    const ipmi::Sensor& sensor = facts->sensor;
    if (!sensor.name.empty() && sensor.name == candidate.part.name) return true;
    const auto& entities = candidate.entities;
    return ipmi::IsPhysicalEntity(sensor.entity.id) && TellsOfItsEntity(sensor) &&
           std::find(entities.begin(), entities.end(), KeyOf(sensor)) != entities.end();
}

PartEvidence Parts::OfSensor(const ipmi::Sensor& sensor) const {
    const Found found = ByEntity(KeyOf(sensor), sensor.entityIsLogical);
    PartEvidence evidence;
    for (const Candidate& candidate : found.candidates) evidence.parts.push_back(candidate.part);
    evidence.certain = found.certain && evidence.parts.size() == 1;
    return evidence;
}

PartEvidence Parts::OfEvent(const Event& event) const {
    Found found;
    if (auto byData = ByEventData(event)) {
        found = *std::move(byData);
    } else if (const SensorFacts* const facts = event.agreeingSensor()) {
        found = ByEntity(KeyOf(facts->sensor), facts->sensor.entityIsLogical);
    }
    PartEvidence evidence;
    for (Candidate& candidate : found.candidates) {
        if (IsGoneSince(event, candidate)) {
            candidate.part.partNumber.clear();
            candidate.part.serialNumber.clear();
        }
        const auto& parts = evidence.parts;
        if (std::find(parts.begin(), parts.end(), candidate.part) == parts.end()) {
            evidence.parts.push_back(std::move(candidate.part));
        }
    }
    evidence.certain = found.certain && evidence.parts.size() == 1;
    return evidence;
}

}  // namespace standard
