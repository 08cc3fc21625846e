#pragma once

#include <cstdint>
#include <optional>
#include <span>

// The answers that tell of the event log as a whole, IPMI 2.0 clauses 31.2, 31.3, 31.10 and 31.11a.
// Each parse function takes the response data after the completion code; a short answer is none.

namespace ipmi {

/// The version of event log and sensor repository that IPMI 1.5 and 2.0 have.
constexpr std::uint8_t kSelVersion = 0x51;
/// "That many bytes are free, or more."
constexpr std::uint16_t kMaxFreeBytes = 0xFFFF;

struct SelInfo {
    std::uint8_t version = 0;  ///< two BCD digits, the major one in bits 3..0
    std::uint16_t records = 0;
    std::uint16_t freeBytes = 0;
    std::uint32_t lastAddition = 0;  ///< time stamps as in the records
    std::uint32_t lastErase = 0;
    bool overflow = false;  ///< events were dropped for want of space
    bool deleteSupported = false;
    bool partialAddSupported = false;
    bool reserveSupported = false;
    bool allocationSupported = false;

    /// Whether records came or went between the two answers.
    bool HasChanged(const SelInfo& later) const {
        return records != later.records || lastAddition != later.lastAddition ||
               lastErase != later.lastErase;
    }
};
std::optional<SelInfo> ParseSelInfo(std::span<const std::uint8_t> response);

struct SelAllocation {
    std::uint16_t units = 0;     ///< 0: unspecified
    std::uint16_t unitSize = 0;  ///< bytes; 0: unspecified
    std::uint16_t freeUnits = 0;
    std::uint16_t largestFreeBlock = 0;  ///< in units
    std::uint8_t maxRecordSize = 0;      ///< in units
};
std::optional<SelAllocation> ParseSelAllocation(std::span<const std::uint8_t> response);

/// Get SEL Time: seconds since 1970-01-01, or since the controller's start (KindOfTime).
std::optional<std::uint32_t> ParseSelTime(std::span<const std::uint8_t> response);

/// Get SEL Time UTC Offset: minutes from UTC to the controller's time, -1440 to 1440; none for
/// 07FFh, which means that the controller does not know, and for a value past that range.
std::optional<int> ParseSelTimeUtcOffset(std::span<const std::uint8_t> response);

}  // namespace ipmi
