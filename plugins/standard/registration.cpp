#include <cstdint>
#include <span>

#include "plugins/standard/plugin.h"
#include "tqr/log.h"

// Only in the shared library, so that programs that link its parts do not register.

namespace {

struct Registration {
    Registration() {
        NQORTQR20::fdrPluginCallbacks record{.size = sizeof record,
                                             .initialise = standard::Initialise,
                                             .deinitialise = standard::Deinitialise,
                                             .getData = standard::GetData,
                                             .getInfo = standard::GetInfo,
                                             .reserved = nullptr};
        NQORTQR20::TCPluginCallbacks* context = nullptr;
        if (NQORTQR20::fdrRegisterPlugin(&record, &context).code != NQORTQR20::kStatusOk) {
            NQORTQR20::fdrWriteLog(NQORTQR20::ILogger::kError,
                                   "the plug-in of the standard's own reading was not registered");
        }
    }
};
const Registration gRegistration;

}  // namespace

extern "C" __attribute__((visibility("default"))) NQORTQR20::TTQRStatusCode fdrPluginCheckOption(
    const char* name, const char* value, char* problem, std::uint32_t capacity) {
    return standard::CheckOption(name, value, std::span(problem, capacity));
}
