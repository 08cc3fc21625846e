#pragma once

#include <array>
#include <cstdint>
#include <span>

namespace ipmisel {

/// The digest of FIPS 180-4, for keys that stay equal for ever. Our own, since the 32-bit build has
/// no cryptographic library; not meant for secrets.
std::array<std::uint8_t, 32> Sha256(std::span<const std::uint8_t> message);

}  // namespace ipmisel
