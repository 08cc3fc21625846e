#include "tqr/smbios.h"

#include <algorithm>
#include <cstdint>
#include <memory>
#include <vector>

#include "host/core/handle_registry.h"
#include "host/core/provider.h"

namespace {

constexpr int kOk = 0;
constexpr int kMisused = NQORTQR20::kStatusFailed;
constexpr int kNoType = -1;

/// What a handle of the reader leads to.
struct Reader : tqrhost::HandleRegistry<Reader> {
    explicit Reader(const NQORTQR20::TPluginManagerProvider& theProvider) : provider(theProvider) {}
    const NQORTQR20::TPluginManagerProvider& provider;
    int type = kNoType;    ///< that smBiosGetFirst was asked for
    std::size_t next = 0;  ///< index of the first structure that was not looked at
};

/// The reader behind a handle; null when there is none.
Reader* ReaderOf(void* handle) {
    auto* const reader = static_cast<Reader*>(handle);
    return tqrhost::HandleRegistry<Reader>::Is(reader) ? reader : nullptr;
}

bool MayWrite(const void* structure, const int* length) {
    return structure != nullptr && length != nullptr && *length >= 0;
}

/// Copies the next structure of the reader's type.
int Next(Reader* reader, void* out, int* length) {
    const auto& structures = reader->provider.facts->smbios;
    const int capacity = *length;
    *length = 0;
    while (reader->next < structures.size()) {
        const std::vector<std::uint8_t>& structure = structures[reader->next++];
        if (structure.empty() || structure[0] != reader->type) continue;
        const std::size_t count = std::min(structure.size(), static_cast<std::size_t>(capacity));
        std::copy_n(structure.begin(), count, static_cast<std::uint8_t*>(out));
        *length = static_cast<int>(count);
        break;
    }
    return kOk;
}

}  // namespace

namespace NQORTQR20 {

int smBiosLoad(const TPluginManagerProvider* provider, void** handle) {
    if (handle == nullptr) return kMisused;
    *handle = nullptr;
    if (provider == nullptr || provider->facts == nullptr) return kMisused;
    *handle = new Reader(*provider);
    return kOk;
}

int smBiosGetFirst(void* handle, int type, void* structure, int* length) {
    Reader* const reader = ReaderOf(handle);
    if (reader == nullptr || !MayWrite(structure, length)) return kMisused;
    reader->type = type;
    reader->next = 0;
    return Next(reader, structure, length);
}

int smBiosGetNext(void* handle, void* structure, int* length) {
    Reader* const reader = ReaderOf(handle);
    if (reader == nullptr || reader->type == kNoType || !MayWrite(structure, length)) {
        return kMisused;
    }
    return Next(reader, structure, length);
}

int smBiosClose(void** handle) {
    if (handle == nullptr) return kMisused;
    const std::unique_ptr<Reader> reader(ReaderOf(*handle));
    *handle = nullptr;
    return reader == nullptr ? kMisused : kOk;
}

}  // namespace NQORTQR20
