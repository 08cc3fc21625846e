#pragma once

#include <cstdint>
#include <string_view>

namespace ipmisel {

constexpr std::uint8_t kLastNumberedEntity = 0x28;  ///< names up to here are numbered texts
constexpr int kEntityTextBase = 1000;               ///< text number of entity ID 0

/// Name of an entity ID above the numbered ones (IPMI 2.0, table 43-13): 0x29 to 0x34; empty for
/// every other ID.
std::string_view HeldEntityName(std::uint8_t entityId);

}  // namespace ipmisel
