#include "plugins/ipmisel/texts/entity_names.h"

#include <array>

namespace ipmisel {
namespace {

constexpr std::uint8_t kFirstHeldEntity = kLastNumberedEntity + 1;

constexpr std::array<std::string_view, 12> kHeldEntities{"Processing blade",
                                                         "Connectivity switch",
                                                         "Processor or memory module",
                                                         "IO module",
                                                         "Processor or IO module",
                                                         "Management Controller Firmware",
                                                         "IPMI Channel",
                                                         "PCI Bus",
                                                         "PCI Express Bus",
                                                         "SCSI Bus",
                                                         "SATA or SAS bus",
                                                         "Processor or front-side bus"};
static_assert(kHeldEntities[0x2C - kFirstHeldEntity] == "IO module");

}  // namespace

std::string_view HeldEntityName(std::uint8_t entityId) {
    if (entityId < kFirstHeldEntity || entityId - kFirstHeldEntity >= int{kHeldEntities.size()}) {
        return {};
    }
    return kHeldEntities[entityId - kFirstHeldEntity];
}

}  // namespace ipmisel
