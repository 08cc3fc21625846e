#pragma once

#include <array>
#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

// Bounded text routines. The four StringCch routines and the old-fashioned helpers keep the exact
// edge behaviour around which the callers size their buffers.

/// Copies at most size - 1 characters, always terminates, and pads a longer buffer with NULs.
void StringCchCopy(char* destination, unsigned int size, const char* source);
/// Appends at most `size` characters of the source; the visible text never exceeds size - 1, and
/// the last byte is a NUL whatever the length. The limit counts appended characters, but nothing is
/// written outside destination[0..size).
void StringCchCat(char* destination, unsigned int size, const char* source);
/// As StringCchCat, with at most the smaller of `count` and `size` characters appended.
void StringCchCatN(char* destination, unsigned int size, const char* source, unsigned int count);
/// Formats with vsnprintf into size characters; always terminates.
void StringCchPrintf(char* destination, unsigned int size, const char* format, ...)
    __attribute__((format(printf, 3, 4)));

/// The index-th (from 1) string of a block of NUL-separated strings: 1 and copied into `out`, or 0
/// when the block ends before it. The first string is copied without its NUL, later ones with it;
/// `out` must be cleared and hold the longest string of the block.
int getString(const unsigned char* block, char* out, int blockLength, int index);
/// As getString, for the SMBIOS callers.
int IPMIselGetString(const unsigned char* block, char* out, int blockLength, int index);

/// Whether the text has a visible ASCII character (33 to 126).
bool isPrintable(std::string text);
/// A text of device data, cleaned: only characters 32 to 127, at most 100 of them; a text that
/// contains "Memory Card" becomes its first 13 characters.
std::string GetPrintableString(std::string text);
/// The pieces of text[0..length) that are each ended by `separator`; what follows the last
/// separator is left out.
std::vector<std::string> multiStringTok(char* text, unsigned int length, char separator);

namespace ipmisel {

/// Copies with strncpy semantics: cut at `length`, padded with NULs, not terminated when it fills
/// the buffer. Nothing happens for a null or empty buffer. The only place that knows this rule.
void CopyOut(char* out, std::size_t length, std::string_view text);

/// printf into a string.
std::string Format(const char* format, ...) __attribute__((format(printf, 1, 2)));

/// Fills a format that comes from the numbered texts with integers. Only "%d", "%x", "%X", "%u",
/// "%i" with flags, width and "%%" are honoured, as many as there are values; everything else
/// stands as it is.
std::string FormatIntegers(std::string_view format, const int* values, std::size_t count);

/// A text whose capacity is part of what readers see: `N` bytes, so N - 1 characters; what does not
/// fit is cut.
template <std::size_t N>
class FixedText {
public:
    void Append(std::string_view text) {
        const std::size_t space = N - 1 - text_.size();
        text_.append(text.substr(0, space));
    }
    std::string_view view() const { return text_; }
    const std::string& str() const { return text_; }
    bool empty() const { return text_.empty(); }

private:
    std::string text_;
};

/// A text in a caller's character buffer that need not be terminated.
std::string_view BoundedView(const char* text, std::size_t capacity);

}  // namespace ipmisel
