#pragma once

#include <algorithm>
#include <cstdint>
#include <iterator>
#include <numeric>
#include <string_view>
#include <vector>

// Serial presence detect images of memory modules, with what the plug-in reads of them and bytes
// of no meaning elsewhere.

namespace ipmiseltest {

inline void PutText(std::vector<std::uint8_t>* image, std::size_t at, std::string_view text,
                    std::size_t length) {
    for (std::size_t i = 0; i < length; ++i) {
        (*image)[at + i] = static_cast<std::uint8_t>(i < text.size() ? text[i] : ' ');
    }
}

/// The checksum of DDR3, low byte first.
inline void PutCrc(std::vector<std::uint8_t>* image, std::uint16_t crc) {
    (*image)[126] = static_cast<std::uint8_t>(crc);
    (*image)[127] = static_cast<std::uint8_t>(crc >> 8);
}

inline std::vector<std::uint8_t> Ddr2Image() {
    std::vector<std::uint8_t> image(256, 0x11);
    image[0] = 128;
    image[1] = 8;
    image[2] = 0x08;
    image[63] = static_cast<std::uint8_t>(std::accumulate(image.begin(), image.begin() + 63, 0));
    constexpr std::uint8_t kMaker[] = {0x7F, 0x7F, 0x7F, 0x7F, 0x43, 0x00, 0x00, 0x00};
    std::copy(std::begin(kMaker), std::end(kMaker), image.begin() + 64);
    PutText(&image, 73, "RML1520", 18);
    for (std::uint8_t i = 0; i < 4; ++i) image[95U + i] = i + 1;
    return image;
}

/// Its checksum leaves the bytes from 117 on out.
inline std::vector<std::uint8_t> Ddr3Image() {
    std::vector<std::uint8_t> image(256, 0x13);
    image[0] = 0x92;
    image[2] = 0x0B;
    image[117] = 0x80;
    image[118] = 0x2C;
    constexpr std::uint8_t kSerialNumber[] = {0xA1, 0xB2, 0xC3, 0xD4};
    std::copy(std::begin(kSerialNumber), std::end(kSerialNumber), image.begin() + 122);
    PutText(&image, 128, "18JSF1G72PZ-1G6", 18);
    PutCrc(&image, 0x21EA);
    return image;
}

/// Has runs of letters, which are no strings.
inline std::vector<std::uint8_t> Ddr4Image() {
    std::vector<std::uint8_t> image(256, 0x15);
    image[0] = 0x23;
    image[2] = 0x0C;
    for (std::size_t at = 130; at < 170; at += 4) PutText(&image, at, "AB", 2);
    return image;
}

}  // namespace ipmiseltest
