#pragma once

#include <array>
#include <cstdint>
#include <optional>
#include <span>
#include <string>

namespace ipmi {

/// The 16 bytes of Get System GUID or Get Device GUID as on the wire.
using Guid = std::array<std::uint8_t, 16>;

/// The order in which a controller sends the bytes of its GUID. The standard has one (20.8), but
/// controllers are found that use one of the others.
enum class GuidOrder : std::uint8_t {
    kIpmi,     ///< the last byte of the node first: the whole the other way round than RFC 4122
    kSmbios,   ///< the first three fields least significant byte first, as SMBIOS type 1 has them
    kRfc4122,  ///< as the text form reads
};

/// From the response data after the completion code. Bytes that are all 00h or all FFh mean that no
/// GUID is set.
std::optional<Guid> ParseGuid(std::span<const std::uint8_t> response);

/// The text form of RFC 4122, "00112233-4455-6677-8899-aabbccddeeff".
std::string GuidText(const Guid& guid, GuidOrder order);

/// The order in which the controller's bytes name the same system as the UUID field of SMBIOS type
/// 1 (16 bytes as in the structure); none when they name another in every order.
std::optional<GuidOrder> GuidOrderBySmbios(const Guid& guid, const Guid& smbiosUuid);

}  // namespace ipmi
