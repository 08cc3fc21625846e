#pragma once

/// Banks of JEDEC manufacturer codes that the table holds, and codes a bank.
constexpr unsigned kJedecBanks = 7;
constexpr unsigned kJedecCodes = 126;

/// Manufacturer names of JEDEC standard JEP106, banks 1 to 7, bank-major: entry bank * 126 + code -
/// 1, where bank counts continuation codes. The last entry is null: its code is not assigned.
extern const char* const JEDEC_Types[kJedecBanks * kJedecCodes];
