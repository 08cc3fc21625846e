#include "ipmi/guid.h"

#include <algorithm>
#include <cstddef>

#include "base/hex.h"

namespace ipmi {

namespace {

Guid InTextOrder(Guid guid, GuidOrder order) {
    switch (order) {
        case GuidOrder::kIpmi:
            std::ranges::reverse(guid);
            break;
        case GuidOrder::kSmbios:
            std::reverse(guid.begin(), guid.begin() + 4);
            std::reverse(guid.begin() + 4, guid.begin() + 6);
            std::reverse(guid.begin() + 6, guid.begin() + 8);
            break;
        case GuidOrder::kRfc4122:
            break;
    }
    return guid;
}

}  // namespace

std::optional<Guid> ParseGuid(std::span<const std::uint8_t> response) {
    Guid guid{};
    if (response.size() < guid.size()) return std::nullopt;
    std::copy_n(response.begin(), guid.size(), guid.begin());
    const auto all = [&guid](std::uint8_t value) {
        return std::ranges::all_of(guid, [value](std::uint8_t byte) { return byte == value; });
    };
    if (all(0x00) || all(0xFF)) return std::nullopt;
    return guid;
}

std::string GuidText(const Guid& guid, GuidOrder order) {
    std::string text = ipmisel::HexText(InTextOrder(guid, order));
    for (const std::size_t at : {20, 16, 12, 8}) text.insert(at, 1, '-');
    return text;
}

std::optional<GuidOrder> GuidOrderBySmbios(const Guid& guid, const Guid& smbiosUuid) {
    const Guid wanted = InTextOrder(smbiosUuid, GuidOrder::kSmbios);
    for (const GuidOrder order : {GuidOrder::kIpmi, GuidOrder::kSmbios, GuidOrder::kRfc4122}) {
        if (InTextOrder(guid, order) == wanted) return order;
    }
    return std::nullopt;
}

}  // namespace ipmi
