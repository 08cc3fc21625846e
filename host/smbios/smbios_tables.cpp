#include "host/smbios/smbios_tables.h"

#include <algorithm>
#include <cerrno>
#include <fstream>
#include <numeric>
#include <string_view>

#include "base/bytes.h"
#include "ipmi/smbios.h"

namespace tqrhost {
namespace {

using Bytes = std::span<const std::uint8_t>;

constexpr std::size_t kHeaderLength = 4;
constexpr std::uint8_t kEndOfTable = 127;

bool StartsWith(Bytes bytes, std::string_view anchor) {
    return bytes.size() >= anchor.size() &&
           std::equal(anchor.begin(), anchor.end(), bytes.begin(), [](char c, std::uint8_t byte) {
               return static_cast<std::uint8_t>(c) == byte;
           });
}

/// Whether the bytes add up to 0, as every part of an entry point does with its checksum.
bool SumIsZero(Bytes bytes) { return std::accumulate(bytes.begin(), bytes.end(), 0U) % 256 == 0; }

/// Length of the structure at the start of `rest`, string set included; 0 when it does not end.
std::size_t StructureLength(Bytes rest) {
    if (rest.size() < kHeaderLength) return 0;
    const std::size_t formatted = rest[1];
    if (formatted < kHeaderLength || formatted > rest.size()) return 0;
    constexpr std::uint8_t kEnd[] = {0, 0};
    const Bytes strings = rest.subspan(formatted);
    const auto end = std::search(strings.begin(), strings.end(), std::begin(kEnd), std::end(kEnd));
    if (end == strings.end()) return 0;
    return formatted + static_cast<std::size_t>(end - strings.begin()) + std::size(kEnd);
}

/// At most `most` bytes of a file; empty when it cannot be read.
std::vector<std::uint8_t> ReadFile(const std::filesystem::path& file, std::size_t most) {
    std::vector<std::uint8_t> bytes;
    std::ifstream in(file, std::ios::binary);
    // In pieces: the length comes from the firmware, and is at times far more than there is.
    char piece[4096];
    while (in && bytes.size() < most) {
        const std::size_t wanted = std::min(sizeof piece, most - bytes.size());
        in.read(piece, static_cast<std::streamsize>(wanted));
        bytes.insert(bytes.end(), piece, piece + in.gcount());
    }
    return bytes;
}

}  // namespace

SmbiosStructures SplitSmbiosTable(Bytes table, std::size_t most) {
    SmbiosStructures structures;
    while (structures.size() < most) {
        const std::size_t length = StructureLength(table);
        if (length == 0 || table[0] == kEndOfTable) break;
        structures.emplace_back(table.begin(), table.begin() + static_cast<std::ptrdiff_t>(length));
        table = table.subspan(length);
    }
    return structures;
}

std::optional<SmbiosEntryPoint> ReadSmbiosEntryPoint(Bytes bytes) {
    SmbiosEntryPoint found;
    if (StartsWith(bytes, "_SM3_")) {
        constexpr std::size_t kLength = 0x18;
        if (bytes.size() < kLength || bytes[6] < kLength || bytes[6] > bytes.size() ||
            !SumIsZero(bytes.first(bytes[6]))) {
            return std::nullopt;
        }
        found.tableLength = ipmisel::ByteReader(bytes.subspan(0x0C)).U32();
        return found;
    }
    if (!StartsWith(bytes, "_SM_")) return std::nullopt;
    // SMBIOS 2.1 stated a length of 0x1E for these 0x1F bytes, and some firmware still does.
    constexpr std::size_t kLength = 0x1E;
    constexpr std::size_t kIntermediate = 0x10;
    constexpr std::size_t kIntermediateLength = 0x0F;
    if (bytes.size() < kLength || bytes[5] < kLength || bytes[5] > bytes.size() ||
        !SumIsZero(bytes.first(bytes[5]))) {
        return std::nullopt;
    }
    const Bytes intermediate = bytes.subspan(kIntermediate);
    if (!StartsWith(intermediate, "_DMI_") ||
        (intermediate.size() >= kIntermediateLength &&
         !SumIsZero(intermediate.first(kIntermediateLength)))) {
        return std::nullopt;
    }
    ipmisel::ByteReader in(bytes.subspan(0x16));
    found.tableLength = in.U16();
    in.Skip(4);  // address
    found.numberOfStructures = in.U16();
    return found;
}

SmbiosStructures ReadSystemSmbios(const std::filesystem::path& folder) {
    constexpr std::size_t kMaxEntryPoint = 256;  // its length is one byte
    const auto entryPoint =
        ReadSmbiosEntryPoint(ReadFile(folder / "smbios_entry_point", kMaxEntryPoint));
    if (!entryPoint) return {};
    const std::vector<std::uint8_t> table = ReadFile(folder / "DMI", entryPoint->tableLength);
    if (!entryPoint->numberOfStructures) return SplitSmbiosTable(table);
    return SplitSmbiosTable(table, *entryPoint->numberOfStructures);
}

int SystemSmbiosError(const std::filesystem::path& folder) {
    errno = 0;
    const std::ifstream table(folder / "DMI", std::ios::binary);
    return table || errno == ENOENT ? 0 : errno;
}

std::string SystemProductName(const SmbiosStructures& structures) {
    constexpr std::size_t kProductName = 5;
    const auto system =
        std::find_if(structures.begin(), structures.end(), [](const auto& structure) {
            return !structure.empty() && structure[0] == ipmi::kSmbiosSystem;
        });
    if (system == structures.end()) return {};
    std::string name = ipmi::SmbiosStringAt(*system, kProductName);
    name.erase(name.find_last_not_of(' ') + 1);
    return name;
}

}  // namespace tqrhost
