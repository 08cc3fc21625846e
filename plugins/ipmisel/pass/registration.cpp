#include "plugins/ipmisel/pass/entry_points.h"

// Only in the shared library, so that programs that link its parts do not register.

namespace {

struct Registration {
    Registration() { IPMISELInit(); }
};
const Registration gRegistration;

}  // namespace
