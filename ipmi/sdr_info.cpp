#include "ipmi/sdr_info.h"

#include "base/bytes.h"

namespace ipmi {

std::optional<SdrRepositoryInfo> SdrRepositoryInfo::Parse(std::span<const std::uint8_t> data) {
    ipmisel::ByteReader in(data);
    SdrRepositoryInfo info;
    info.version = in.U8();
    info.records = in.U16();
    info.freeBytes = in.U16();
    info.lastAddition = in.U32();
    info.lastErase = in.U32();
    info.operations = in.U8();
    if (!in.ok()) return std::nullopt;
    return info;
}

}  // namespace ipmi
