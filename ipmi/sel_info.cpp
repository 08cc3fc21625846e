#include "ipmi/sel_info.h"

#include "base/bytes.h"

namespace ipmi {

std::optional<SelInfo> ParseSelInfo(std::span<const std::uint8_t> response) {
    ipmisel::ByteReader in(response);
    SelInfo info;
    info.version = in.U8();
    info.records = in.U16();
    info.freeBytes = in.U16();
    info.lastAddition = in.U32();
    info.lastErase = in.U32();
    const std::uint8_t support = in.U8();
    info.overflow = (support & 0x80) != 0;
    info.deleteSupported = (support & 0x08) != 0;
    info.partialAddSupported = (support & 0x04) != 0;
    info.reserveSupported = (support & 0x02) != 0;
    info.allocationSupported = (support & 0x01) != 0;
    if (!in.ok()) return std::nullopt;
    return info;
}

std::optional<SelAllocation> ParseSelAllocation(std::span<const std::uint8_t> response) {
    ipmisel::ByteReader in(response);
    SelAllocation allocation;
    allocation.units = in.U16();
    allocation.unitSize = in.U16();
    allocation.freeUnits = in.U16();
    allocation.largestFreeBlock = in.U16();
    allocation.maxRecordSize = in.U8();
    if (!in.ok()) return std::nullopt;
    return allocation;
}

std::optional<std::uint32_t> ParseSelTime(std::span<const std::uint8_t> response) {
    ipmisel::ByteReader in(response);
    const std::uint32_t seconds = in.U32();
    if (!in.ok()) return std::nullopt;
    return seconds;
}

std::optional<int> ParseSelTimeUtcOffset(std::span<const std::uint8_t> response) {
    constexpr int kMinutesOfADay = 1440;
    ipmisel::ByteReader in(response);
    const auto minutes = static_cast<std::int16_t>(in.U16());
    if (!in.ok() || minutes < -kMinutesOfADay || minutes > kMinutesOfADay) return std::nullopt;
    return minutes;
}

}  // namespace ipmi
