#pragma once

#include <string>
#include <vector>

#include "host/core/host.h"

namespace ipmisel {

/// The JSON Schema (draft 2020-12) of the instances of these classes, as the reports in JSON hold
/// them: one definition for each class, and an instance is of any of them.
std::string ClassSchema(const std::vector<NQORTQR20::ClassInfo>& classes);

}  // namespace ipmisel
