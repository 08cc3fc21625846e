#pragma once

#include <cstddef>
#include <cstdint>
#include <map>
#include <optional>
#include <vector>

#include "ipmi/sdr_record.h"
#include "ipmi/sel_record.h"
#include "plugins/standard/facts.h"
#include "plugins/standard/fru_device.h"
#include "plugins/standard/part.h"
#include "plugins/standard/smbios_facts.h"

namespace standard {

/// What is known of the parts of a node's machine.
struct PartFacts {
    std::vector<FruDevice> devices;
    std::vector<ipmi::EntityAssociation> associations;
    SmbiosFacts smbios;  ///< empty over the network
};

/// Names the part that a sensor or an event is about, as far as the evidence names it:
/// - the event's own data: number of a memory module, a slot, a processor or a FRU device, address
///   of a PCI device;
/// - the entity of the sensor's record: the FRU device of that entity, else a memory device or a
///   processor of SMBIOS that carries its number, else the FRU device of an entity that contains it
///   (association records), else the entity's name and instance.
/// Only physical entities are parts. An event from before its part was taken out, or from before
/// the part was made, has the part's name and not the numbers of what is there now.
class Parts : public PartLookup {
public:
    /// `node` is borrowed; its log is looked at here.
    Parts(PartFacts facts, const NodeFacts& node);

    PartEvidence OfEvent(const Event& event) const override;
    PartEvidence OfSensor(const ipmi::Sensor& sensor) const override;

private:
    struct Candidate;
    struct Found;

    Found ByEntity(const EntityKey& key, bool logical) const;
    std::optional<Found> BySmbios(const EntityKey& key) const;
    std::optional<Found> ByContainer(const EntityKey& key) const;
    Found OfDevices(const std::vector<const FruDevice*>& devices, const EntityKey& key) const;
    std::vector<const FruDevice*> DevicesOf(const EntityKey& key) const;

    std::optional<Found> ByEventData(const Event& event) const;
    Found ByMemoryModule(unsigned number) const;
    std::optional<Found> BySlot(unsigned type, unsigned number, const ipmi::Sensor* sensor) const;
    std::optional<Found> ByPciAddress(const ipmi::SmbiosSlot::Address& address) const;

    /// Whether the part was taken out or exchanged after the event.
    bool IsGoneSince(const Event& event, const Candidate& candidate) const;
    /// Whether a record that tells of a removal means the event's part.
    bool Removes(const ipmi::SelRecord& record, const Event& event,
                 const Candidate& candidate) const;

    PartFacts facts_;
    const NodeFacts* node_;
    std::vector<std::size_t> removals_;  ///< places of records that tell of a removal
    /// Where there are removals, the places of all records in the order of their bytes.
    std::vector<std::uint32_t> byBytes_;
};

}  // namespace standard
