#pragma once

#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <optional>
#include <span>
#include <string>
#include <vector>

// SMBIOS as it stands in memory and in files (DSP0134): an entry point that says where the table is
// and how long, and the table, structure after structure.
//
// A structure (ipmi/smbios.h) without strings ends with two NULs.

namespace tqrhost {

/// Raw structures, string set included, each at least 4 bytes of formatted area long.
using SmbiosStructures = std::vector<std::vector<std::uint8_t>>;

/// Cuts a table into its structures, at most `most` of them. The end-of-table structure (type 127)
/// ends the walk and is left out, and so does a structure that is shorter than its own header or
/// that does not end within the table.
SmbiosStructures SplitSmbiosTable(std::span<const std::uint8_t> table,
                                  std::size_t most = static_cast<std::size_t>(-1));

struct SmbiosEntryPoint {
    std::uint32_t tableLength = 0;                    ///< bytes; at most, for SMBIOS 3
    std::optional<std::uint16_t> numberOfStructures;  ///< SMBIOS 2 only
};

/// Reads an entry point, 32-bit ("_SM_") or 64-bit ("_SM3_"). Empty when it is neither, when it is
/// cut or when a checksum is wrong.
std::optional<SmbiosEntryPoint> ReadSmbiosEntryPoint(std::span<const std::uint8_t> bytes);

/// The structures of the machine that this program runs on: files smbios_entry_point and DMI of
/// `folder`, as Linux has them. Empty when they are not there, may not be read or make no sense.
SmbiosStructures ReadSystemSmbios(const std::filesystem::path& folder = "/sys/firmware/dmi/tables");

/// Why those files may not be read although they are there: the error number of the system, else 0.
int SystemSmbiosError(const std::filesystem::path& folder = "/sys/firmware/dmi/tables");

/// The product name of the system information structure (type 1) without trailing blanks.
std::string SystemProductName(const SmbiosStructures& structures);

}  // namespace tqrhost
