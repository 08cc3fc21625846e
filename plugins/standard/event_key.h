#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "plugins/standard/facts.h"

namespace standard {

/// The bytes by which the events of one system are told from those of another: its GUID as on the
/// wire, else its serial number, else what the user calls it.
std::vector<std::uint8_t> SystemIdentity(const NodeFacts& node);

/// An event's identity for ever: the first 32 lower-case hexadecimal digits of SHA-256 over the
/// system's identity and the record's sixteen bytes. Equal records of one system are one event.
std::string EventKey(const std::vector<std::uint8_t>& systemIdentity,
                     const ipmi::SelRecord& record);

}  // namespace standard
