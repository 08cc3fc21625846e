#pragma once

#include <array>
#include <cstddef>
#include <string>

#include "base/text.h"
#include "plugins/ipmisel/log.h"
#include "tqr/status.h"

namespace ipmisel {

/// What a copy operation of a record has answered and written.
struct CopiedText {
    unsigned result;
    std::string text;
};

/// Runs a copy operation, called with a buffer and its length, over a buffer of its own.
template <typename Copy>
CopiedText RunCopy(Copy copy) {
    constexpr std::size_t kTextLength = 512;
    std::array<char, kTextLength> buffer{};
    const unsigned result = copy(buffer.data(), static_cast<unsigned>(buffer.size()));
    return {result, std::string(BoundedView(buffer.data(), buffer.size()))};
}

/// Whether the host has taken something of an instance; `what` is how the error line calls it.
inline bool Added(NQORTQR20::TTQRStatusCode status, const char* what) {
    if (status.code != NQORTQR20::kStatusFailed) return true;
    WriteLog(kWarning, std::string("Error adding ") + what + ".");
    return false;
}

}  // namespace ipmisel
