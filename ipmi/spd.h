#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

// Serial presence detect data of a memory module, as JEDEC lays it down for each kind of memory
// (standard 21-C, annexes J, K and L): byte 0 the bytes that are used, byte 2 the memory type;
// further on the module's organization, manufacturer (JEP106), date, serial number and part number.
//
//                         DDR2      DDR3       DDR4
//   checksum                63   126-127    126-127   base section
//   manufacturer         64-71   117-118    320-321
//   part number          73-90   128-145    329-348
//   year, week (BCD)     93-94   120-121    323-324
//   serial number        95-98   122-125    325-328

namespace ipmi {

enum class SpdKind { kDdr2, kDdr3, kDdr4 };

/// The kind of memory whose image the bytes begin with, told by type and sizes alone: an image
/// that is damaged is no data of another kind. Empty for everything else.
std::optional<SpdKind> RecognizeSpd(std::span<const std::uint8_t> bytes);

/// Whether the checksum of the base section is right; empty when the bytes end before it.
std::optional<bool> SpdChecksumMatches(SpdKind kind, std::span<const std::uint8_t> bytes);

/// What identifies a module, as the bytes of its data. Borrowed from the image.
struct SpdIdentity {
    std::string_view manufacturer;               ///< by JEP106; empty when its code is not known
    std::span<const std::uint8_t> partNumber;    ///< 18 characters, DDR4: 20; padded
    std::span<const std::uint8_t> manufactured;  ///< year and week, two digits of BCD each
    std::span<const std::uint8_t> serialNumber;  ///< 4 bytes
};

/// Empty when the bytes end within it.
std::optional<SpdIdentity> ReadSpdIdentity(SpdKind kind, std::span<const std::uint8_t> bytes);

/// A week of a year, counted from 1.
struct YearWeek {
    unsigned year = 0;
    unsigned week = 0;
};
/// "2012-W34".
std::string YearWeekText(const YearWeek& when);

/// A memory module as far as its data say. An empty text is not known.
struct MemoryModule {
    std::string type;                      ///< "DDR3"
    std::optional<std::uint32_t> sizeMiB;  ///< of all ranks, without the bits for error correction
    std::string manufacturer;
    std::string partNumber;
    std::string serialNumber;  ///< eight hexadecimal digits
    std::optional<YearWeek> manufactured;
    std::vector<std::string> problems;  ///< a checksum that is wrong, an image that is cut
};

/// Reads the image of a module; empty when RecognizeSpd takes it for none.
std::optional<MemoryModule> ReadSpd(std::span<const std::uint8_t> bytes);

}  // namespace ipmi
