#pragma once

#include <cstdint>
#include <vector>

#include "host/spdriver/transport.h"

namespace ipmiseltest {

inline NQORTQR20::RequestFrame RequestOf(ipmi::CommandCode command,
                                         const std::vector<std::uint8_t>& data = {}) {
    return NQORTQR20::RequestFrame(ipmi::MakeCommand(command, data));
}

/// Get SEL Entry or Get SDR of a whole record, or from `offset`.
inline NQORTQR20::RequestFrame ReadRequest(ipmi::CommandCode command, std::uint16_t id,
                                           std::uint8_t offset = 0) {
    return RequestOf(command, {0, 0, static_cast<std::uint8_t>(id),
                               static_cast<std::uint8_t>(id >> 8), offset, 0xFF});
}

}  // namespace ipmiseltest
