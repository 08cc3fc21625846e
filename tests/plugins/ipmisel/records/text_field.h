#pragma once

#include <algorithm>
#include <numeric>
#include <string_view>

#include "base/bytes.h"
#include "plugins/ipmisel/records/rows.h"
#include "tests/support/wire.h"

namespace ipmiseltest {

/// A text into a field of a row: cut at its size, no NUL of its own when it fills it.
template <std::size_t N>
void Fill(char (&field)[N], std::string_view text) {
    std::fill_n(field, N, '\0');
    std::copy_n(text.begin(), std::min(text.size(), N), field);
}

inline s_SEL_row Row(std::string_view text) {
    s_SEL_row row;
    Fill(row.data, text);
    return row;
}

/// The row of a record as the walk over the log leaves it.
inline s_SEL_row RowOf(const SelRecord& record) {
    return Row("00 FF FF " + ipmisel::DumpBytes(record, ipmisel::Digits::kUpperHex));
}

/// An entry of the extended log; from byte 7 on each byte is its index.
inline s_AuxLog_entry AuxEntry(std::uint16_t selId, std::uint16_t recordSize) {
    s_AuxLog_entry entry{
        {0x4D, 0x4F, 0x00, Low(recordSize), High(recordSize), Low(selId), High(selId)}};
    std::iota(entry.bytes + 7, std::end(entry.bytes), std::uint8_t{7});
    return entry;
}

}  // namespace ipmiseltest
