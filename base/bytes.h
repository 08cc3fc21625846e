#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

namespace ipmisel {

/// Reads fields from bytes, little-endian, straight through. Past the end it yields 0 and stays not
/// ok, so that one test at the end covers every field.
class ByteReader {
public:
    explicit ByteReader(std::span<const std::uint8_t> bytes) : bytes_(bytes) {}
    std::uint8_t U8() {
        if (at_ >= bytes_.size()) {
            ok_ = false;
            return 0;
        }
        return bytes_[at_++];
    }
    std::uint16_t U16() {
        const std::uint16_t low = U8();
        return static_cast<std::uint16_t>(low | U8() << 8);
    }
    std::uint32_t U24() {
        const std::uint32_t low = U16();
        return low | static_cast<std::uint32_t>(U8()) << 16;
    }
    std::uint32_t U32() {
        const std::uint32_t low = U16();
        return low | static_cast<std::uint32_t>(U16()) << 16;
    }
    void Skip(std::size_t count) {
        for (; count > 0; --count) U8();
    }
    bool ok() const { return ok_; }

private:
    std::span<const std::uint8_t> bytes_;
    std::size_t at_ = 0;
    bool ok_ = true;
};

/// How one byte of a dump is written; every byte is followed by one blank.
enum class Digits {
    kUpperHex,  ///< "%02X "
    kLowerHex,  ///< "%02x "
    kDecimal,   ///< "%d "
};

std::string DumpBytes(std::span<const std::uint8_t> bytes, Digits digits);
/// As DumpBytes, with "\n\t" before the first byte and before every fifth byte after it: the
/// form in which request frames are traced.
std::string DumpFrame(std::span<const std::uint8_t> frame, Digits digits);

/// Reads a text row back: hexadecimal numbers separated by white space, at most `most` of them, as
/// sscanf with a list of "%x" would. Empty when not even the first could be looked for (the text
/// ends before it); otherwise as many numbers as were there.
std::optional<std::vector<unsigned>> ScanHexRow(std::string_view text, std::size_t most);

}  // namespace ipmisel
