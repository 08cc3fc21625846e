// SMBIOS tables and entry points.

#include <cstddef>
#include <cstdint>

#include "host/smbios/smbios_tables.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::span<const std::uint8_t> bytes(data, size);
    tqrhost::ReadSmbiosEntryPoint(bytes);
    const auto structures = tqrhost::SplitSmbiosTable(bytes);
    tqrhost::SystemProductName(structures);
    for (const auto& structure : structures) {
        for (std::size_t number = 0; number < 4; ++number) {
            tqrhost::SmbiosString(structure, number);
            tqrhost::SmbiosStringAt(structure, number + 4);
        }
    }
    return 0;
}
