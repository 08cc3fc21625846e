#include <dlfcn.h>

#include "tests/plugins/ipmisel/export/export_fixture.h"
#include "tqr/plugin.h"

bool ipmiseltest::gNoArrays = false;

/// In place of the host's own, to which it leads on.
NQORTQR20::TTQRStatusCode NQORTQR20::fdrNewCIMValueArray(TCIMValueArray** array) {
    if (ipmiseltest::gNoArrays) return {kStatusFailed};
    using Operation = TTQRStatusCode (*)(TCIMValueArray**);
    static const auto next = reinterpret_cast<Operation>(
        dlsym(RTLD_NEXT, "_ZN9NQORTQR2019fdrNewCIMValueArrayEPPNS_14TCIMValueArrayE"));
    return next(array);
}
