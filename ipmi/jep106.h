#pragma once

#include <cstdint>
#include <span>
#include <string_view>

// Manufacturer identification codes of JEDEC standard JEP106: banks of 126 codes each, where the
// bank is the number of continuation codes (7Fh) before the code. Bit 7 of a code is odd parity.

namespace ipmi {

/// Banks that the table holds, and codes in a bank.
inline constexpr unsigned kJep106Banks = 7;
inline constexpr unsigned kJep106Codes = 126;

/// Bank-major: entry bank * 126 + code - 1. A code that is not assigned is null.
extern const char* const kJep106Names[kJep106Banks * kJep106Codes];

/// The manufacturer of a code that follows its continuation codes, as in the presence detect data
/// of DDR2 modules. Empty for a code that the table does not have.
std::string_view ManufacturerAfterContinuations(std::span<const std::uint8_t> code);
/// The manufacturer of a number of continuation codes and a code, both with a parity bit, as in the
/// presence detect data of DDR3 and DDR4 modules. Empty for a code that the table does not have.
std::string_view ManufacturerOfBank(std::uint8_t continuations, std::uint8_t code);

}  // namespace ipmi
