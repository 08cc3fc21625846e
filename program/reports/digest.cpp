#include "program/reports/digest.h"

#include <algorithm>
#include <cstddef>

#include "base/sha256.h"

namespace ipmisel {

std::string Base64(std::span<const std::uint8_t> bytes) {
    constexpr std::string_view kDigits =
        "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
    constexpr std::size_t kGroup = 3;
    std::string text;
    text.reserve((bytes.size() + kGroup - 1) / kGroup * 4);
    for (std::size_t at = 0; at < bytes.size(); at += kGroup) {
        const auto group = bytes.subspan(at, std::min(kGroup, bytes.size() - at));
        std::uint32_t bits = 0;
        for (std::size_t i = 0; i < kGroup; ++i) {
            bits = bits << 8 | (i < group.size() ? group[i] : 0U);
        }
        for (std::size_t i = 0; i <= kGroup; ++i) {
            text += i <= group.size() ? kDigits[bits >> (18 - 6 * i) & 0x3F] : '=';
        }
    }
    return text;
}

std::string Sha256Base64(std::string_view text) {
    return Base64(
        Sha256(std::span(reinterpret_cast<const std::uint8_t*>(text.data()), text.size())));
}

}  // namespace ipmisel
