#pragma once

#include <optional>
#include <string>

#include "ipmi/guid.h"

namespace standard {

/// The system's GUID in its text form, and, where SMBIOS has one too, which order of bytes was
/// taken; empty without a GUID.
struct GuidReading {
    std::string text;
    std::string order;
};
GuidReading ReadGuid(const std::optional<ipmi::Guid>& guid,
                     const std::optional<ipmi::Guid>& smbiosUuid);

}  // namespace standard
