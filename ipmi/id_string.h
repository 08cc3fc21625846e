#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <string>

// Texts of sensor records (IPMI 2.0, 43.15) and of inventory fields (Platform Management FRU
// Information Storage Definition 1.0, 13). All results are UTF-8 and hold what the bytes hold: a
// text that is cut short is decoded as far as it goes.

namespace ipmi {

/// Bits 7..6 of a type/length byte. An inventory field has binary data where a sensor record has
/// Unicode.
enum class TextEncoding : std::uint8_t { kUnicode = 0, kBcdPlus = 1, kSixBit = 2, kLatin1 = 3 };

/// The type/length byte of a sensor record's ID string; the length is in characters.
struct TypeLength {
    TextEncoding encoding = TextEncoding::kLatin1;
    std::uint8_t length = 0;

    static TypeLength FromByte(std::uint8_t byte);
    /// How many bytes so many characters take.
    std::size_t Bytes() const;
};

/// Two characters per byte, the first in the high nibble; at most `characters`.
std::string DecodeBcdPlus(std::span<const std::uint8_t> bytes, std::size_t characters);
/// 6-bit ASCII: four characters in three bytes, the first in the lowest bits; at most `characters`.
std::string DecodeSixBit(std::span<const std::uint8_t> bytes, std::size_t characters);
/// 8-bit ASCII and Latin 1, up to the first NUL.
std::string DecodeLatin1(std::span<const std::uint8_t> bytes);
/// UTF-16, least significant byte first, up to the first NUL. Half a surrogate pair becomes U+FFFD.
std::string DecodeUtf16(std::span<const std::uint8_t> bytes);

/// The ID string behind a type/length byte: `bytes` are what follows it, to the record's end.
/// Blanks at the end are padding and left out.
std::string DecodeIdString(std::uint8_t typeLength, std::span<const std::uint8_t> bytes);

}  // namespace ipmi
