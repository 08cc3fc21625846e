#pragma once

#include <cstdint>
#include <initializer_list>
#include <numeric>
#include <string_view>
#include <vector>

// Images of FRU devices, laid out by the Platform Management FRU Information Storage Definition.

namespace ipmiseltest {

using FruBytes = std::vector<std::uint8_t>;

/// What makes a sum of bytes 0.
inline std::uint8_t ZeroChecksum(const FruBytes& bytes) {
    return static_cast<std::uint8_t>(-std::accumulate(bytes.begin(), bytes.end(), 0));
}

inline FruBytes Field(std::uint8_t encoding, const FruBytes& bytes) {
    FruBytes field{static_cast<std::uint8_t>(encoding << 6 | bytes.size())};
    field.insert(field.end(), bytes.begin(), bytes.end());
    return field;
}
/// 8-bit text.
inline FruBytes Field(std::string_view text) {
    return Field(3, FruBytes(text.begin(), text.end()));
}

/// An area: `fixed` is what stands behind the length; the end mark, the padding and the checksum
/// are added.
inline FruBytes Area(const FruBytes& fixed, const std::vector<FruBytes>& fields) {
    FruBytes area{1, 0};
    area.insert(area.end(), fixed.begin(), fixed.end());
    for (const FruBytes& field : fields) area.insert(area.end(), field.begin(), field.end());
    area.push_back(0xC1);
    area.resize((area.size() + 1 + 7) / 8 * 8 - 1);
    area[1] = static_cast<std::uint8_t>((area.size() + 1) / 8);
    area.push_back(ZeroChecksum(area));
    return area;
}

inline FruBytes MultiRecord(std::uint8_t type, bool last, const FruBytes& data) {
    FruBytes record{type, static_cast<std::uint8_t>(last ? 0x82 : 0x02),
                    static_cast<std::uint8_t>(data.size()), ZeroChecksum(data)};
    record.push_back(ZeroChecksum(record));
    record.insert(record.end(), data.begin(), data.end());
    return record;
}

/// Areas behind their common header; an empty one is left out.
struct FruImage {
    FruBytes chassis, board, product, multiRecords;

    FruBytes Bytes() const {
        FruBytes header{1, 0};
        std::size_t at = 8;
        for (const FruBytes* area : {&chassis, &board, &product, &multiRecords}) {
            header.push_back(static_cast<std::uint8_t>(area->empty() ? 0 : at / 8));
            at += area->size();
        }
        header.push_back(0);
        header.push_back(ZeroChecksum(header));
        for (const FruBytes* area : {&chassis, &board, &product, &multiRecords}) {
            header.insert(header.end(), area->begin(), area->end());
        }
        return header;
    }
};

/// One with every area; English texts.
inline FruImage WholeFruImage() {
    return {
        .chassis = Area({0x17}, {Field("CH-1"), Field("CHS01"), Field("Rack 7")}),
        .board = Area({0x19, 0xC0, 0x5F, 0xE4},  // 14,966,720 minutes
                      {Field("Acme"), Field("Mainboard"), Field("BS01"), Field("BP-1"), Field("F1"),
                       Field("first"), Field("second")}),
        .product = Area({0x00}, {Field("Acme Systems"), Field("S-1"), Field("P-1"), Field("A00"),
                                 Field("SN01"), Field("T9"), Field("F2"), Field("third")}),
        .multiRecords = MultiRecord(0xC0, true, {0xD9, 0x7E, 0x00, 0xAB}),
    };
}

}  // namespace ipmiseltest
