#pragma once

#include <cstdint>
#include <optional>
#include <span>

namespace ipmi {

/// Answer of Get SDR Repository Info (IPMI 2.0, 33.9).
struct SdrRepositoryInfo {
    std::uint8_t version = 0;  ///< BCD, least significant nibble first: 51h is 1.5
    std::uint16_t records = 0;
    std::uint16_t freeBytes = 0;     ///< FFFEh: that many or more; FFFFh: not told
    std::uint32_t lastAddition = 0;  ///< seconds since 1970, FFFFFFFFh unspecified
    std::uint32_t lastErase = 0;
    std::uint8_t operations = 0;

    bool operator==(const SdrRepositoryInfo&) const = default;
    /// Whether records came or went between the two answers.
    bool HasChanged(const SdrRepositoryInfo& later) const {
        return records != later.records || lastAddition != later.lastAddition ||
               lastErase != later.lastErase;
    }
    /// From the data after the completion code; empty when a byte is missing.
    static std::optional<SdrRepositoryInfo> Parse(std::span<const std::uint8_t> data);
};

}  // namespace ipmi
