#include "plugins/ipmisel/pass/state.h"

namespace ipmisel {

ModuleState& Module() {
    static ModuleState state;
    return state;
}

}  // namespace ipmisel
