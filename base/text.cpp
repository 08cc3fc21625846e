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

/// One conversion of a format that FormatIntegers honours.
struct Conversion {
    bool left = false;
    bool plus = false;
    bool blank = false;
    bool alternate = false;
    bool zeros = false;
    std::size_t width = 0;
    char letter = 'd';
    std::size_t length = 0;  ///< characters of the format that it takes, the percent sign included
};

/// Widths have at most three digits, so that a hostile format cannot ask for gigabytes.
constexpr std::size_t kWidthDigits = 3;

/// The conversion at the start of `format`; its length is 0 when there is none to be honoured.
Conversion ScanConversion(std::string_view format) {
    Conversion found;
    std::size_t at = 1;
    const auto current = [&] { return at < format.size() ? format[at] : '\0'; };
    for (;; ++at) {
        if (current() == '-') {
            found.left = true;
        } else if (current() == '+') {
            found.plus = true;
        } else if (current() == ' ') {
            found.blank = true;
        } else if (current() == '#') {
            found.alternate = true;
        } else if (current() == '0') {
            found.zeros = true;
        } else {
            break;
        }
    }
    for (std::size_t digits = 0; digits < kWidthDigits && current() >= '0' && current() <= '9';
         ++digits, ++at) {
        found.width = found.width * 10 + static_cast<std::size_t>(current() - '0');
    }
    found.letter = current();
    if (found.letter != '\0' && std::strchr("dixXu", found.letter) != nullptr) {
        found.length = at + 1;
    }
    return found;
}

std::string Convert(const Conversion& conversion, int value) {
    const bool isSigned = conversion.letter == 'd' || conversion.letter == 'i';
    const bool isHex = conversion.letter == 'x' || conversion.letter == 'X';
    const bool negative = isSigned && value < 0;
    const auto bits = static_cast<unsigned>(value);
    const unsigned magnitude = negative ? 0U - bits : bits;

    char buffer[16];
    const auto [end, error] =
        std::to_chars(std::begin(buffer), std::end(buffer), magnitude, isHex ? 16 : 10);
    std::string digits(buffer, error == std::errc() ? end : buffer);
    std::string prefix;
    if (negative) {
        prefix = "-";
    } else if (isSigned && conversion.plus) {
        prefix = "+";
    } else if (isSigned && conversion.blank) {
        prefix = " ";
    } else if (isHex && conversion.alternate && magnitude != 0) {
        prefix = "0x";
    }
    if (conversion.letter == 'X') {
        for (std::string* part : {&prefix, &digits}) {
            for (char& c : *part) c = static_cast<char>(std::toupper(c));
        }
    }
    const std::size_t length = prefix.size() + digits.size();
    const std::size_t fill = conversion.width > length ? conversion.width - length : 0;
    if (conversion.left) return prefix + digits + std::string(fill, ' ');
    if (conversion.zeros) return prefix + std::string(fill, '0') + digits;
    return std::string(fill, ' ') + prefix + digits;
}

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
    constexpr std::size_t kMost = 100;
    // Room for a blank and one digit after the words.
    if (text.find(kMemoryCard) != std::string::npos) return text.substr(0, kMemoryCard.size() + 2);
    std::string clean;
    for (const char c : text) {
        if (static_cast<signed char>(c) > 31 && clean.size() < kMost) clean += c;
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
        const Conversion conversion = format[0] == '%' ? ScanConversion(format) : Conversion{};
        if (conversion.length != 0 && used < count) {
            text += Convert(conversion, values[used++]);
            format.remove_prefix(conversion.length);
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
