#pragma once

#include <cstdlib>
#include <utility>

namespace ipmiseltest {

/// First and last seed of a random test: IPMISEL_SEEDS=COUNT or IPMISEL_SEEDS=FIRST-LAST, else as
/// many as given.
inline std::pair<unsigned, unsigned> Seeds(unsigned count) {
    const char* const seeds = std::getenv("IPMISEL_SEEDS");
    if (seeds == nullptr) return {1, count};
    char* rest = nullptr;
    const auto first = static_cast<unsigned>(std::strtoul(seeds, &rest, 10));
    if (*rest != '-') return {1, first};
    return {first, static_cast<unsigned>(std::strtoul(rest + 1, nullptr, 10))};
}

}  // namespace ipmiseltest
