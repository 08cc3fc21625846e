#pragma once

#include <algorithm>
#include <cstdint>
#include <initializer_list>
#include <string_view>
#include <vector>

#include "tests/support/wire.h"

// Inventory of FRU devices and their locators, as they come over the wire.

namespace ipmiseltest {

/// The fixed layout with its marker at 10.
inline std::vector<std::uint8_t> FixedLayout(std::string_view vendor, std::string_view name,
                                             std::string_view serialNumber) {
    constexpr std::size_t kMarkerAt = 10;
    std::vector<std::uint8_t> data(256);
    const auto put = [&](std::size_t offset, std::string_view text) {
        std::copy(text.begin(), text.end(),
                  data.begin() + static_cast<std::ptrdiff_t>(kMarkerAt + offset));
    };
    put(0, std::string_view("\x01%", 2));
    put(7, "Not told 2");
    put(38, vendor);
    put(71, name);
    put(102, serialNumber);
    put(134, "Not told 1");
    return data;
}

/// Strings without a layout.
inline std::vector<std::uint8_t> Runs(std::initializer_list<std::string_view> strings) {
    std::vector<std::uint8_t> data(4);
    for (const std::string_view text : strings) {
        data.push_back(static_cast<std::uint8_t>(0xC0 | text.size()));
        data.insert(data.end(), text.begin(), text.end());
    }
    data.resize(256);
    return data;
}

/// A FRU device locator (IPMI 2.0, table 43-7).
inline std::vector<std::uint8_t> FruLocator(std::uint16_t id, std::uint8_t device,
                                            std::string_view idString) {
    const auto length = static_cast<std::uint8_t>(11 + idString.size());
    const auto code = static_cast<std::uint8_t>(0xC0 | idString.size());
    std::vector<std::uint8_t> record{Low(id), High(id), 0x51, 0x11, length, 0x20, device, 0x80,
                                     0x00,    0x00,     0x10, 0x00, 0x0A,   0x01, 0x00,   code};
    record.insert(record.end(), idString.begin(), idString.end());
    return record;
}

}  // namespace ipmiseltest
