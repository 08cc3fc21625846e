#include "plugins/ipmisel/inventory/spd.h"

#include <algorithm>
#include <string_view>

#include "base/hex.h"
#include "plugins/ipmisel/inventory/vpd_entry.h"
#include "plugins/ipmisel/log.h"

namespace ipmisel {
namespace {

using Bytes = std::span<const std::uint8_t>;

constexpr std::size_t kImageLength = 256;

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
    return HexText(field, HexCase::kUpper);
}

std::string Vendor(std::string_view vendor) {
    if (vendor.empty()) WriteLog(kNotice, "The memory module's manufacturer code is not known.");
    return Shown(std::string(vendor));
}

}  // namespace

std::optional<SpdKind> RecogniseSpd(Bytes bytes) {
    if (bytes.size() < kImageLength) return std::nullopt;
    return ipmi::RecognizeSpd(bytes);
}

std::optional<MemoryModule> DecodeSpd(SpdKind kind, Bytes bytes) {
    if (kind == SpdKind::kDdr4 || bytes.size() < kImageLength) return std::nullopt;
    const auto identity = ipmi::ReadSpdIdentity(kind, bytes);
    if (!identity) return std::nullopt;
    // The identity is mostly outside what the checksum covers, so it may be right all the same.
    if (ipmi::SpdChecksumMatches(kind, bytes) == false) {
        WriteLog(kNotice, "The checksum of the memory module's data does not match.");
    }
    return MemoryModule{.vendor = Vendor(identity->manufacturer),
                        .serialNumber = SerialNumber(identity->serialNumber),
                        .partNumber = Shown(Trimmed(identity->partNumber))};
}

}  // namespace ipmisel
