#include "ipmi/id_string.h"

#include <algorithm>
#include <string_view>

namespace ipmi {
namespace {

constexpr std::string_view kBcdPlusCharacters = "0123456789 -.:,_";

void AppendUtf8(std::string* text, std::uint32_t code) {
    const auto append = [&](std::uint32_t byte) { text->push_back(static_cast<char>(byte)); };
    if (code < 0x80) {
        append(code);
    } else if (code < 0x800) {
        append(0xC0 | code >> 6);
        append(0x80 | (code & 0x3F));
    } else {
        if (code < 0x10000) {
            append(0xE0 | code >> 12);
        } else {
            append(0xF0 | code >> 18);
            append(0x80 | (code >> 12 & 0x3F));
        }
        append(0x80 | (code >> 6 & 0x3F));
        append(0x80 | (code & 0x3F));
    }
}

}  // namespace

TypeLength TypeLength::FromByte(std::uint8_t byte) {
    return {static_cast<TextEncoding>(byte >> 6), static_cast<std::uint8_t>(byte & 0x1F)};
}

std::size_t TypeLength::Bytes() const {
    switch (encoding) {
        case TextEncoding::kUnicode:
            return std::size_t{2} * length;
        case TextEncoding::kBcdPlus:
            return (length + 1U) / 2;
        case TextEncoding::kSixBit:
            return (length * 6U + 7) / 8;
        case TextEncoding::kLatin1:
            break;
    }
    return length;
}

std::string DecodeBcdPlus(std::span<const std::uint8_t> bytes, std::size_t characters) {
    characters = std::min(characters, bytes.size() * 2);
    std::string text;
    for (std::size_t i = 0; i < characters; ++i) {
        const std::uint8_t byte = bytes[i / 2];
        text.push_back(kBcdPlusCharacters[i % 2 == 0 ? byte >> 4 : byte & 0x0F]);
    }
    return text;
}

std::string DecodeSixBit(std::span<const std::uint8_t> bytes, std::size_t characters) {
    characters = std::min(characters, bytes.size() * 8 / 6);
    std::string text;
    for (std::size_t i = 0; i < characters; ++i) {
        const std::size_t bit = i * 6;
        unsigned both = bytes[bit / 8];
        if (bit / 8 + 1 < bytes.size()) both |= static_cast<unsigned>(bytes[bit / 8 + 1]) << 8;
        text.push_back(static_cast<char>(' ' + (both >> bit % 8 & 0x3F)));
    }
    return text;
}

std::string DecodeLatin1(std::span<const std::uint8_t> bytes) {
    std::string text;
    for (const std::uint8_t byte : bytes) {
        if (byte == 0) break;
        AppendUtf8(&text, byte);
    }
    return text;
}

std::string DecodeUtf16(std::span<const std::uint8_t> bytes) {
    const auto unit = [&](std::size_t at) -> std::uint32_t {
        return at + 1 < bytes.size() ? bytes[at] | static_cast<std::uint32_t>(bytes[at + 1]) << 8
                                     : 0;
    };
    std::string text;
    for (std::size_t at = 0; unit(at) != 0; at += 2) {
        std::uint32_t code = unit(at);
        const std::uint32_t next = unit(at + 2);
        if (code >= 0xD800 && code < 0xDC00 && next >= 0xDC00 && next < 0xE000) {
            code = 0x10000 + ((code - 0xD800) << 10 | (next - 0xDC00));
            at += 2;
        } else if (code >= 0xD800 && code < 0xE000) {
            code = 0xFFFD;
        }
        AppendUtf8(&text, code);
    }
    return text;
}

std::string DecodeIdString(std::uint8_t typeLength, std::span<const std::uint8_t> bytes) {
    const TypeLength type = TypeLength::FromByte(typeLength);
    bytes = bytes.first(std::min(bytes.size(), type.Bytes()));
    std::string text;
    switch (type.encoding) {
        case TextEncoding::kUnicode:
            text = DecodeUtf16(bytes);
            break;
        case TextEncoding::kBcdPlus:
            text = DecodeBcdPlus(bytes, type.length);
            break;
        case TextEncoding::kSixBit:
            text = DecodeSixBit(bytes, type.length);
            break;
        case TextEncoding::kLatin1:
            text = DecodeLatin1(bytes);
            break;
    }
    text.erase(text.find_last_not_of(' ') + 1);
    return text;
}

}  // namespace ipmi
