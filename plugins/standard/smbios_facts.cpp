#include "plugins/standard/smbios_facts.h"

#include <cstddef>
#include <cstdint>
#include <utility>

#include "tqr/smbios.h"

namespace standard {
namespace {

/// An open reader of the host.
class Reader {
public:
    explicit Reader(const NQORTQR20::TPluginManagerProvider* provider) {
        if (NQORTQR20::smBiosLoad(provider, &handle_) != 0) handle_ = nullptr;
    }
    ~Reader() {
        if (handle_ != nullptr) NQORTQR20::smBiosClose(&handle_);
    }
    Reader(const Reader&) = delete;
    Reader& operator=(const Reader&) = delete;

    /// Hands every structure of the type to `take`.
    template <typename Take>
    void ForEach(std::uint8_t type, Take take) {
        constexpr std::size_t kMaxLength = 4096;  // strings included; what is longer is cut
        if (handle_ == nullptr) return;
        std::vector<std::uint8_t> bytes(kMaxLength);
        int length = static_cast<int>(kMaxLength);
        int result = NQORTQR20::smBiosGetFirst(handle_, type, bytes.data(), &length);
        while (result == 0 && length > 0) {
            take(std::span(bytes).first(static_cast<std::size_t>(length)));
            length = static_cast<int>(kMaxLength);
            result = NQORTQR20::smBiosGetNext(handle_, bytes.data(), &length);
        }
    }

private:
    void* handle_ = nullptr;
};

template <typename T>
void Append(std::vector<T>* list, std::optional<T> value) {
    if (value) list->push_back(*std::move(value));
}

}  // namespace

SmbiosFacts ReadSmbios(const NQORTQR20::TPluginManagerProvider* provider) {
    using Bytes = std::span<const std::uint8_t>;
    SmbiosFacts facts;
    Reader reader(provider);
    reader.ForEach(ipmi::kSmbiosSystem, [&](Bytes bytes) {
        if (!facts.system) facts.system = ipmi::ReadSmbiosSystem(bytes);
    });
    reader.ForEach(ipmi::kSmbiosMemoryDevice, [&](Bytes bytes) {
        Append(&facts.memoryDevices, ipmi::ReadSmbiosMemoryDevice(bytes));
    });
    reader.ForEach(ipmi::kSmbiosProcessor, [&](Bytes bytes) {
        Append(&facts.processors, ipmi::ReadSmbiosProcessor(bytes));
    });
    reader.ForEach(ipmi::kSmbiosSlot,
                   [&](Bytes bytes) { Append(&facts.slots, ipmi::ReadSmbiosSlot(bytes)); });
    return facts;
}

}  // namespace standard
