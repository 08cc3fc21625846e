#include "ipmi/jep106.h"

#include <algorithm>
#include <cstddef>

namespace ipmi {
namespace {

constexpr std::uint8_t kContinuation = 0x7F;
constexpr std::uint8_t kWithoutParity = 0x7F;

}  // namespace

std::string_view ManufacturerAfterContinuations(std::span<const std::uint8_t> code) {
    const auto first =
        std::find_if(code.begin(), code.end(), [](std::uint8_t c) { return c != kContinuation; });
    const auto bank = first - code.begin();
    if (first == code.end() || bank >= std::ptrdiff_t{kJep106Banks}) return {};
    return ManufacturerOfBank(static_cast<std::uint8_t>(bank), *first);
}

std::string_view ManufacturerOfBank(std::uint8_t continuations, std::uint8_t code) {
    const unsigned bank = continuations & kWithoutParity;
    const unsigned number = code & kWithoutParity;
    if (bank >= kJep106Banks || number == 0 || number > kJep106Codes) return {};
    const char* const name = kJep106Names[bank * kJep106Codes + number - 1];
    return name == nullptr ? std::string_view() : std::string_view(name);
}

}  // namespace ipmi
