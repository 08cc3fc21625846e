#include "plugin/state.h"

namespace ipmisel {

ModuleState& Module() {
    static ModuleState state;
    return state;
}

}  // namespace ipmisel
