// SMBIOS tables and entry points, and the structures as values.

#include <cstddef>
#include <cstdint>

#include "host/smbios/smbios_tables.h"
#include "ipmi/smbios.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::span<const std::uint8_t> bytes(data, size);
    tqrhost::ReadSmbiosEntryPoint(bytes);
    const auto structures = tqrhost::SplitSmbiosTable(bytes);
    tqrhost::SystemProductName(structures);
    for (const auto& structure : structures) {
        for (std::size_t number = 0; number < 4; ++number) {
            ipmi::SmbiosString(structure, number);
            ipmi::SmbiosStringAt(structure, number + 4);
        }
        ipmi::ReadSmbiosSystem(structure);
        ipmi::ReadSmbiosProcessor(structure);
        ipmi::ReadSmbiosSlot(structure);
        ipmi::ReadSmbiosMemoryDevice(structure);
    }
    return 0;
}
