// The reader of captures: opened as the source that it is, then asked.

#include <sys/mman.h>
#include <unistd.h>

#include <cstddef>
#include <cstdint>
#include <string>

#include "host/spdriver/source.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const int file = memfd_create("capture", MFD_CLOEXEC);
    if (file < 0) return 0;
    if (write(file, data, size) == static_cast<ssize_t>(size)) {
        try {
            auto source =
                NQORTQR20::OpenSources({"replay:/proc/self/fd/" + std::to_string(file)}, {});
            const NQORTQR20::RequestFrame request(ipmi::GetSelInfo());
            for (const auto& node : source.nodes) node.transport->Exchange(request);
        } catch (const NQORTQR20::SourceError&) {
        }
    }
    close(file);
    return 0;
}
