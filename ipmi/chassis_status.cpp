#include "ipmi/chassis_status.h"

#include "base/bytes.h"

namespace ipmi {
namespace {

struct BitName {
    std::uint8_t mask;
    std::string_view name;
};

// Table 28-3, current power state. Bit 0 tells that the power is on.
constexpr BitName kPowerFaults[] = {
    {0x02, "power overload"},
    {0x04, "interlock"},
    {0x08, "power fault"},
    {0x10, "power control fault"},
};

// Table 28-3, last power event.
constexpr BitName kPowerEvents[] = {
    {0x01, "AC failed"},
    {0x02, "power down by power overload"},
    {0x04, "power down by interlock"},
    {0x08, "power down by power fault"},
    {0x10, "power on by IPMI command"},
};

template <std::size_t N>
std::vector<std::string_view> NamesOf(std::uint8_t bits, const BitName (&table)[N]) {
    std::vector<std::string_view> names;
    for (const BitName& row : table) {
        if ((bits & row.mask) != 0) names.push_back(row.name);
    }
    return names;
}

}  // namespace

std::optional<ChassisStatus> ChassisStatus::Parse(std::span<const std::uint8_t> data) {
    ipmisel::ByteReader in(data);
    const std::uint8_t power = in.U8();
    const std::uint8_t lastEvent = in.U8();
    const std::uint8_t others = in.U8();
    if (!in.ok()) return std::nullopt;
    return ChassisStatus{
        .powerOn = (power & 0x01) != 0,
        .chassisIntrusion = (others & 0x01) != 0,
        .frontPanelLockout = (others & 0x02) != 0,
        .driveFault = (others & 0x04) != 0,
        .coolingFault = (others & 0x08) != 0,
        .powerFaults = NamesOf(power, kPowerFaults),
        .lastPowerEvent = NamesOf(lastEvent, kPowerEvents),
    };
}

}  // namespace ipmi
