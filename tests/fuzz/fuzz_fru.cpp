// What a FRU device holds: an inventory or the presence detect data of a memory module, read whole,
// and the answers out of which it is put together.

#include <algorithm>
#include <cstddef>
#include <cstdint>

#include "ipmi/fru_device_reader.h"
#include "ipmi/fru_inventory.h"
#include "ipmi/spd.h"

namespace {

/// Size and access, then answers: the completion code, how many bytes, the bytes.
void ReadDevice(std::span<const std::uint8_t> bytes) {
    const auto info = ipmi::ParseFruAreaInfo(bytes);
    if (!info) return;
    ipmi::FruDeviceReader reader(0, *info);
    for (std::size_t at = 3; at + 2 <= bytes.size() && reader.NextRequest();) {
        const std::size_t length = std::min<std::size_t>(bytes[at + 1], bytes.size() - at - 2);
        reader.TakeAnswer(bytes[at], bytes.subspan(at + 2, length));
        if (reader.bytes().size() > info->size) __builtin_trap();
        at += 2 + length;
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::span<const std::uint8_t> bytes(data, size);
    for (const auto& record : ipmi::ReadFruInventory(bytes, size).multiRecords) {
        ipmi::MultiRecordText(record);
    }
    ipmi::ReadSpd(bytes);
    ReadDevice(bytes);
    return 0;
}
