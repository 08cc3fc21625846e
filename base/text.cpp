#include "base/text.h"

#include <algorithm>
#include <cctype>
#include <charconv>
#include <cstdarg>
#include <cstdio>
#include <cstring>

namespace {

/// Appends at most `most` characters; see StringCchCat for the limit.
void AppendBounded(char* destination, unsigned int size, const char* source, std::size_t most) {
    if (destination == nullptr || size == 0 || source == nullptr) return;
    const std::size_t used = std::min<std::size_t>(strnlen(destination, size), size - 1);
    const std::size_t count = std::min(strnlen(source, most), size - 1 - used);
    std::memcpy(destination + used, source, count);
    destination[used + count] = '\0';
    destination[size - 1] = '\0';
}

/// The length of the integer conversion at the start of a format, 0 when there is none: flags, a
/// width of at most three digits, so that a hostile format cannot ask for gigabytes, and the
/// letter.
std::size_t ConversionLength(std::string_view format) {
    constexpr std::size_t kWidthDigits = 3;
    std::size_t at = std::min(format.find_first_not_of("-+ #0", 1), format.size());
    const std::size_t digits = std::min(format.find_first_not_of("0123456789", at), format.size());
    at = std::min(digits, at + kWidthDigits);
    const bool isInteger = at < format.size() && std::strchr("dixXu", format[at]) != nullptr;
    return isInteger && format[at] != '\0' ? at + 1 : 0;
}

// The format has been held to what is allowed.
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wformat-nonliteral"
std::string Convert(const std::string& conversion, int value) {
    return ipmisel::Format(conversion.c_str(), value);
}
#pragma GCC diagnostic pop

}  // namespace

void StringCchCopy(char* destination, unsigned int size, const char* source) {
    if (destination == nullptr || size == 0 || source == nullptr) return;
    const std::size_t count = strnlen(source, size - 1);
    std::memcpy(destination, source, count);
    std::memset(destination + count, 0, size - count);
}

void StringCchCat(char* destination, unsigned int size, const char* source) {
    AppendBounded(destination, size, source, size);
}

void StringCchCatN(char* destination, unsigned int size, const char* source, unsigned int count) {
    AppendBounded(destination, size, source, std::min(count, size));
}

void StringCchPrintf(char* destination, unsigned int size, const char* format, ...) {
    if (destination == nullptr || size == 0 || format == nullptr) return;
    va_list arguments;
    va_start(arguments, format);
    std::vsnprintf(destination, size, format, arguments);
    va_end(arguments);
    destination[size - 1] = '\0';
}

int getString(const unsigned char* block, char* out, int blockLength, int index) {
    if (block == nullptr || out == nullptr) return 0;
    int counter = 1;
    int start = 0;
    int stop = 0;
    for (; stop < blockLength; ++stop) {
        if (block[stop] != 0) continue;
        if (counter == index) break;
        ++counter;
        start = stop;
    }
    if (stop >= blockLength) return 0;
    // Compatibility: the first string comes without its NUL, every later one with it
    // (GetString.FirstStringWithoutAndLaterOnesWithTheirNul).
    const unsigned char* const from = counter == 1 ? block : block + start + 1;
    std::memcpy(out, from, static_cast<std::size_t>(stop - start));
    return 1;
}

int IPMIselGetString(const unsigned char* block, char* out, int blockLength, int index) {
    return getString(block, out, blockLength, index);
}

// Texts by value: callers know the routines by these signatures.
// NOLINTBEGIN(performance-unnecessary-value-param)
bool isPrintable(std::string text) {
    return std::any_of(text.begin(), text.end(), [](char c) { return c >= 33 && c <= 126; });
}

std::string GetPrintableString(std::string text) {
    constexpr std::string_view kMemoryCard = "Memory Card";
    constexpr std::size_t kMaxLength = 100;
    // Room for a blank and one digit after the words.
    if (text.find(kMemoryCard) != std::string::npos) return text.substr(0, kMemoryCard.size() + 2);
    std::string clean;
    for (const char c : text) {
        if (static_cast<signed char>(c) > 31 && clean.size() < kMaxLength) clean += c;
    }
    return clean;
}
// NOLINTEND(performance-unnecessary-value-param)

std::vector<std::string> multiStringTok(char* text, unsigned int length, char separator) {
    std::vector<std::string> pieces;
    if (text == nullptr) return pieces;
    std::string_view rest(text, length);
    for (;;) {
        const std::size_t end = rest.find(separator);
        if (end == std::string_view::npos) return pieces;
        pieces.emplace_back(rest.substr(0, end));
        rest.remove_prefix(end + 1);
    }
}

namespace ipmisel {

void CopyOut(char* out, std::size_t length, std::string_view text) {
    if (out == nullptr || length == 0) return;
    const std::size_t count = std::min(length, std::min(text.find('\0'), text.size()));
    std::copy_n(text.begin(), count, out);
    std::fill(out + count, out + length, '\0');
}

std::string Format(const char* format, ...) {
    char buffer[256];
    va_list arguments;
    va_start(arguments, format);
    const int length = std::vsnprintf(buffer, sizeof buffer, format, arguments);
    va_end(arguments);
    if (length < 0) return {};
    const auto needed = static_cast<std::size_t>(length);
    if (needed < sizeof buffer) return std::string(buffer, needed);
    std::string text(needed + 1, '\0');
    va_start(arguments, format);
    std::vsnprintf(text.data(), text.size(), format, arguments);
    va_end(arguments);
    text.resize(needed);
    return text;
}

std::string FormatIntegers(std::string_view format, const int* values, std::size_t count) {
    std::string text;
    std::size_t used = 0;
    while (!format.empty()) {
        if (format.starts_with("%%")) {
            text += '%';
            format.remove_prefix(2);
            continue;
        }
        const std::size_t length = format[0] == '%' ? ConversionLength(format) : 0;
        if (length != 0 && used < count) {
            text += Convert(std::string(format.substr(0, length)), values[used++]);
            format.remove_prefix(length);
            continue;
        }
        text += format[0];
        format.remove_prefix(1);
    }
    return text;
}

std::string_view BoundedView(const char* text, std::size_t capacity) {
    if (text == nullptr) return {};
    return {text, strnlen(text, capacity)};
}

}  // namespace ipmisel
