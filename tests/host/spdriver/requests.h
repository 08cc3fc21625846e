#pragma once

#include <cstdint>
#include <vector>

#include "host/spdriver/transport.h"

namespace ipmiseltest {

/// A request frame of the Storage NetFn.
inline NQORTQR20::RequestFrame StorageRequest(std::uint8_t command,
                                              const std::vector<std::uint8_t>& data = {}) {
    return NQORTQR20::RequestFrame(ipmi::MakeCommand({ipmi::kNetFnStorage, command}, data));
}

/// Get SEL Entry or Get SDR of a whole record, or from `offset`.
inline NQORTQR20::RequestFrame ReadRequest(std::uint8_t command, std::uint16_t id,
                                           std::uint8_t offset = 0) {
    return StorageRequest(command, {0, 0, static_cast<std::uint8_t>(id),
                                    static_cast<std::uint8_t>(id >> 8), offset, 0xFF});
}

}  // namespace ipmiseltest
