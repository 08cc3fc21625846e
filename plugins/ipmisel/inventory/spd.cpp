#include "plugins/ipmisel/inventory/spd.h"

#include <algorithm>
#include <array>
#include <numeric>
#include <vector>

#include "base/text.h"
#include "plugins/ipmisel/inventory/vpd_entry.h"
#include "plugins/ipmisel/log.h"

namespace ipmisel {
namespace {

using Bytes = std::span<const std::uint8_t>;

constexpr std::size_t kImageLength = 256;
constexpr std::size_t kTypeAt = 2;

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

/// Bytes 126 and 127; bit 7 of byte 0 leaves the part that is programmed last out of it.
bool Ddr3ChecksumMatches(Bytes bytes) {
    constexpr std::size_t kAt = 126;
    const std::size_t covered = (bytes[0] & 0x80) != 0 ? 117 : kAt;
    return Crc16(bytes.first(covered)) == (bytes[kAt] | bytes[kAt + 1] << 8);
}

// ---- Sizes --------------------------------------------------------------------------------------

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

// ---- Layouts ------------------------------------------------------------------------------------

/// Where a kind of memory keeps what.
struct Layout {
    SpdKind kind;
    std::uint8_t typeCode;
    bool (*sizesFit)(Bytes bytes);
    bool (*checksumMatches)(Bytes bytes) = nullptr;  ///< null: the identity is beyond what is read
    std::size_t vendorAt = 0;
    bool vendorInTwoBytes = false;
    std::size_t serialNumberAt = 0;
    std::size_t partNumberAt = 0;
};

constexpr std::size_t kSerialNumberLength = 4;
constexpr std::size_t kPartNumberLength = 18;

constexpr std::array<Layout, 3> kLayouts{{
    {SpdKind::kDdr2, 0x08, Ddr2SizesFit, Ddr2ChecksumMatches, 64, false, 95, 73},
    {SpdKind::kDdr3, 0x0B, Ddr3SizesFit, Ddr3ChecksumMatches, 117, true, 122, 128},
    {SpdKind::kDdr4, 0x0C, Ddr4SizesFit},
}};

/// The text, or kNotAvailable when it may not be shown.
std::string Shown(const std::string& text) {
    const auto* const bytes = reinterpret_cast<const unsigned char*>(text.c_str());
    return IPMIVPDEntry::IsASCIIStr(bytes) ? text : kNotAvailable;
}

/// A field that a zero ends or blanks fill up.
std::string Trimmed(Bytes field) {
    std::string text(field.begin(), std::find(field.begin(), field.end(), 0));
    return text.erase(text.find_last_not_of(' ') + 1);
}

/// Of zeros alone it has not been programmed, or not been read.
std::string SerialNumber(Bytes field) {
    if (std::count(field.begin(), field.end(), 0) == std::ssize(field)) return kNotAvailable;
    return Format("%02X%02X%02X%02X", field[0], field[1], field[2], field[3]);
}

std::string Vendor(const Layout& layout, Bytes bytes) {
    std::string vendor =
        IPMIVPDEntry::getMDManufacturer(&bytes[layout.vendorAt], layout.vendorInTwoBytes);
    if (vendor.empty()) WriteLog(kNotice, "The memory module's manufacturer code is not known.");
    return Shown(vendor);
}

}  // namespace

std::optional<SpdKind> RecogniseSpd(Bytes bytes) {
    if (bytes.size() < kImageLength) return std::nullopt;
    const auto* const layout = std::find_if(kLayouts.begin(), kLayouts.end(), [&](const Layout& l) {
        return l.typeCode == bytes[kTypeAt];
    });
    if (layout == kLayouts.end() || !layout->sizesFit(bytes)) return std::nullopt;
    return layout->kind;
}

std::optional<MemoryModule> DecodeSpd(SpdKind kind, Bytes bytes) {
    const Layout& layout = *std::find_if(kLayouts.begin(), kLayouts.end(),
                                         [&](const Layout& l) { return l.kind == kind; });
    if (layout.checksumMatches == nullptr || bytes.size() < kImageLength) return std::nullopt;
    // The identity is mostly outside what the checksum covers, so it may be right all the same.
    if (!layout.checksumMatches(bytes)) {
        WriteLog(kNotice, "The checksum of the memory module's data does not match.");
    }
    return MemoryModule{
        .vendor = Vendor(layout, bytes),
        .serialNumber = SerialNumber(bytes.subspan(layout.serialNumberAt, kSerialNumberLength)),
        .partNumber = Shown(Trimmed(bytes.subspan(layout.partNumberAt, kPartNumberLength)))};
}

}  // namespace ipmisel
