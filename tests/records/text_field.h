#pragma once

#include <algorithm>
#include <string_view>

#include "records/rows.h"

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

}  // namespace ipmiseltest
