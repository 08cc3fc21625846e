#include "plugins/standard/event_key.h"

#include <span>

#include "base/hex.h"
#include "base/sha256.h"

namespace standard {

std::vector<std::uint8_t> SystemIdentity(const NodeFacts& node) {
    if (node.guid) return {node.guid->begin(), node.guid->end()};
    const std::string& name = node.serialNumber.empty() ? node.systemName : node.serialNumber;
    return {name.begin(), name.end()};
}

std::string EventKey(const std::vector<std::uint8_t>& systemIdentity,
                     const ipmi::SelRecord& record) {
    constexpr std::size_t kKeyBytes = 16;
    std::vector<std::uint8_t> input = systemIdentity;
    input.insert(input.end(), record.bytes.begin(), record.bytes.end());
    const auto digest = ipmisel::Sha256(input);
    return ipmisel::HexText(std::span(digest).first(kKeyBytes));
}

}  // namespace standard
