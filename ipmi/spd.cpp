#include "ipmi/spd.h"

#include <algorithm>
#include <array>
#include <bit>
#include <numeric>

#include "base/hex.h"
#include "base/text.h"
#include "ipmi/id_string.h"
#include "ipmi/jep106.h"

namespace ipmi {
namespace {

using Bytes = std::span<const std::uint8_t>;

constexpr std::size_t kTypeAt = 2;
constexpr std::size_t kSizesEnd = 3;  // what tells the kind
constexpr std::size_t kSerialNumberLength = 4;
constexpr std::size_t kDateLength = 2;

// ---- Checksums ----------------------------------------------------------------------------------

/// Byte 63: the sum of the bytes before it.
bool Ddr2ChecksumMatches(Bytes bytes) {
    constexpr std::size_t kAt = 63;
    const unsigned sum = std::accumulate(bytes.begin(), bytes.begin() + kAt, 0U);
    return bytes[kAt] == (sum & 0xFF);
}

/// CRC-16, polynomial 0x1021, from 0, most significant bit first.
std::uint16_t Crc16(Bytes bytes) {
    unsigned crc = 0;
    for (const std::uint8_t byte : bytes) {
        crc ^= static_cast<unsigned>(byte) << 8;
        for (int bit = 0; bit < 8; ++bit) crc = (crc & 0x8000) != 0 ? crc << 1 ^ 0x1021 : crc << 1;
    }
    return static_cast<std::uint16_t>(crc);
}

constexpr std::size_t kCrcAt = 126;

bool CrcMatches(Bytes bytes, std::size_t covered) {
    return Crc16(bytes.first(covered)) == (bytes[kCrcAt] | bytes[kCrcAt + 1] << 8);
}
/// Bit 7 of byte 0 leaves the part that is programmed last out of it.
bool Ddr3ChecksumMatches(Bytes bytes) {
    return CrcMatches(bytes, (bytes[0] & 0x80) != 0 ? 117 : kCrcAt);
}
bool Ddr4ChecksumMatches(Bytes bytes) { return CrcMatches(bytes, kCrcAt); }

// ---- Sizes of the device ------------------------------------------------------------------------

/// 128 bytes used of a device of 2^8 bytes.
bool Ddr2SizesFit(Bytes bytes) { return bytes[0] == 128 && bytes[1] == 8; }
/// 176 or 256 bytes used of 256.
bool Ddr3SizesFit(Bytes bytes) {
    const unsigned sizes = bytes[0] & 0x7F;
    return sizes == 0x12 || sizes == 0x13;
}
/// 384 or 512 bytes used of 512.
bool Ddr4SizesFit(Bytes bytes) {
    const unsigned sizes = bytes[0] & 0x7F;
    return sizes == 0x23 || sizes == 0x24;
}

// ---- Sizes of the module ------------------------------------------------------------------------

/// Ranks (byte 5) of the density whose bit is set in byte 31: 1 to 16 GB in bits 0 to 4, 128 to
/// 512 MB in bits 5 to 7.
std::optional<std::uint32_t> Ddr2Size(Bytes bytes) {
    const unsigned density = bytes[31];
    if (!std::has_single_bit(density)) return std::nullopt;
    const int bit = std::countr_zero(density);
    const std::uint32_t mebibytes = bit < 5 ? 1024U << bit : 128U << (bit - 5);
    return mebibytes * ((bytes[5] & 7U) + 1);
}

/// A rank is as many devices as its width needs, each of `megabits`.
std::optional<std::uint32_t> RankedSize(std::uint32_t megabits, unsigned organization,
                                        unsigned busWidth, std::uint32_t diesPerRank) {
    const unsigned deviceWidth = organization & 7;  // 4 bits << this
    const unsigned width = busWidth & 7;            // 8 bits << this
    if (deviceWidth > 3 || width > 3 || megabits == 0) return std::nullopt;
    const std::uint32_t ranks = (organization >> 3 & 7U) + 1;
    return megabits / 8 * (8U << width) / (4U << deviceWidth) * ranks * diesPerRank;
}

/// Byte 4: capacity of a device; 7: ranks and width of a device; 8: width of the bus.
std::optional<std::uint32_t> Ddr3Size(Bytes bytes) {
    const unsigned capacity = bytes[4] & 0x0F;
    if (capacity > 6) return std::nullopt;
    return RankedSize(256U << capacity, bytes[7], bytes[8], 1);
}

/// Byte 4: capacity of a die; 6: dies stacked in a package; 12: ranks of packages and width of a
/// device, bit 6 when the ranks differ; 13: width of the bus.
std::optional<std::uint32_t> Ddr4Size(Bytes bytes) {
    constexpr std::array<std::uint16_t, 10> kGigabits{0, 0, 1, 2, 4, 8, 16, 32, 12, 24};
    const unsigned capacity = bytes[4] & 0x0F;
    const bool ranksDiffer = (bytes[12] & 0x40) != 0;
    if (capacity >= kGigabits.size() || ranksDiffer) return std::nullopt;
    const std::uint32_t megabits = capacity < 2 ? 256U << capacity : kGigabits[capacity] * 1024U;
    const bool stackedRanks = (bytes[6] & 0x83) == 0x82;  // 3DS: each die is a rank of its own
    return RankedSize(megabits, bytes[12], bytes[13], stackedRanks ? (bytes[6] >> 4 & 7U) + 1 : 1);
}

// ---- Layouts ------------------------------------------------------------------------------------

struct Layout {
    SpdKind kind;
    std::uint8_t typeCode;
    const char* type;
    bool (*sizesFit)(Bytes bytes);
    std::size_t baseEnd;  ///< of what size and checksum are read from
    bool (*checksumMatches)(Bytes bytes);
    std::optional<std::uint32_t> (*size)(Bytes bytes);
    std::size_t manufacturerAt;
    std::size_t manufacturerLength;
    std::size_t partNumberAt;
    std::size_t partNumberLength;
    std::size_t manufacturedAt;
    std::size_t serialNumberAt;
};

constexpr std::array<Layout, 3> kLayouts{{
    {SpdKind::kDdr2, 0x08, "DDR2", Ddr2SizesFit, 64, Ddr2ChecksumMatches, Ddr2Size,  //
     64, 7, 73, 18, 93, 95},
    {SpdKind::kDdr3, 0x0B, "DDR3", Ddr3SizesFit, 128, Ddr3ChecksumMatches, Ddr3Size,  //
     117, 2, 128, 18, 120, 122},
    {SpdKind::kDdr4, 0x0C, "DDR4", Ddr4SizesFit, 128, Ddr4ChecksumMatches, Ddr4Size,  //
     320, 2, 329, 20, 323, 325},
}};

const Layout& LayoutOf(SpdKind kind) {
    return *std::find_if(kLayouts.begin(), kLayouts.end(),
                         [&](const Layout& layout) { return layout.kind == kind; });
}

/// Zeros or ones alone: not programmed.
bool IsBlank(Bytes field) {
    return std::all_of(field.begin(), field.end(), [&](std::uint8_t byte) {
        return byte == field.front() && (byte == 0x00 || byte == 0xFF);
    });
}

/// Two digits; empty for what is no BCD.
std::optional<unsigned> Bcd(std::uint8_t byte) {
    if (byte >> 4 > 9 || (byte & 0x0F) > 9) return std::nullopt;
    return (byte >> 4) * 10 + (byte & 0x0F);
}

std::optional<YearWeek> ReadDate(Bytes field) {
    constexpr unsigned kCentury = 2000;  // the oldest kind is of 2003
    const auto year = Bcd(field[0]);
    const auto week = Bcd(field[1]);
    if (!year || !week || *week < 1 || *week > 53) return std::nullopt;
    return YearWeek{kCentury + *year, *week};
}

}  // namespace

std::optional<SpdKind> RecognizeSpd(Bytes bytes) {
    if (bytes.size() < kSizesEnd) return std::nullopt;
    const auto* const layout = std::find_if(kLayouts.begin(), kLayouts.end(), [&](const Layout& l) {
        return l.typeCode == bytes[kTypeAt];
    });
    if (layout == kLayouts.end() || !layout->sizesFit(bytes)) return std::nullopt;
    return layout->kind;
}

std::string YearWeekText(const YearWeek& when) {
    return ipmisel::Format("%u-W%02u", when.year, when.week);
}

std::optional<bool> SpdChecksumMatches(SpdKind kind, Bytes bytes) {
    const Layout& layout = LayoutOf(kind);
    if (bytes.size() < layout.baseEnd) return std::nullopt;
    return layout.checksumMatches(bytes);
}

std::optional<SpdIdentity> ReadSpdIdentity(SpdKind kind, Bytes bytes) {
    const Layout& layout = LayoutOf(kind);
    const std::size_t end = std::max(layout.partNumberAt + layout.partNumberLength,
                                     layout.serialNumberAt + kSerialNumberLength);
    if (bytes.size() < end) return std::nullopt;
    const Bytes code = bytes.subspan(layout.manufacturerAt, layout.manufacturerLength);
    return SpdIdentity{.manufacturer = kind == SpdKind::kDdr2
                                           ? ManufacturerAfterContinuations(code)
                                           : ManufacturerOfBank(code[0], code[1]),
                       .partNumber = bytes.subspan(layout.partNumberAt, layout.partNumberLength),
                       .manufactured = bytes.subspan(layout.manufacturedAt, kDateLength),
                       .serialNumber = bytes.subspan(layout.serialNumberAt, kSerialNumberLength)};
}

std::optional<MemoryModule> ReadSpd(Bytes bytes) {
    const auto kind = RecognizeSpd(bytes);
    if (!kind) return std::nullopt;
    const Layout& layout = LayoutOf(*kind);
    MemoryModule module;
    module.type = layout.type;
    if (const auto matches = SpdChecksumMatches(*kind, bytes)) {
        module.sizeMiB = layout.size(bytes);
        if (!*matches) module.problems.emplace_back("memory module: checksum is wrong");
    }
    const auto identity = ReadSpdIdentity(*kind, bytes);
    if (!identity) {
        module.problems.push_back(ipmisel::Format(
            "memory module: data end after %zu bytes, before the module's identity", bytes.size()));
        return module;
    }
    module.manufacturer = identity->manufacturer;
    if (!IsBlank(identity->partNumber)) {
        module.partNumber = DecodeLatin1(identity->partNumber);
        module.partNumber.erase(module.partNumber.find_last_not_of(' ') + 1);
    }
    if (const Bytes serial = identity->serialNumber; !IsBlank(serial)) {
        module.serialNumber = ipmisel::HexText(serial, ipmisel::HexCase::kUpper);
    }
    if (!IsBlank(identity->manufactured)) module.manufactured = ReadDate(identity->manufactured);
    return module;
}

}  // namespace ipmi
