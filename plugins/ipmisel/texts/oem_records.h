#pragma once

#include <cstdint>
#include <span>
#include <string>

namespace ipmisel {

/// One line for an OEM record that loses nothing (IPMI 2.0, 32.2 and 32.3). Time-stamped records
/// (0xC0, 0xC1): the manufacturer ID of three bytes, then the rest in hexadecimal.
std::string OemTimestampedText(std::span<const std::uint8_t> bytes);
/// Records without a time (0xE0 to 0xE3): all bytes in hexadecimal; printable runs of four or more
/// characters as text as well.
std::string OemPlainText(std::span<const std::uint8_t> bytes);

}  // namespace ipmisel
