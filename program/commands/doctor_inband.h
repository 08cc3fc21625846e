#pragma once

#include <cstdint>
#include <span>
#include <vector>

#include "program/commands/doctor_steps.h"

namespace ipmisel {

/// The steps before this machine's BMC is opened: modules of the kernel, device, permission.
void ExamineDriver(Steps* steps);

/// What SMBIOS says of the BMC against what the driver has found; when the device is open.
void CompareSmbios(std::span<const std::vector<std::uint8_t>> structures, Steps* steps);

}  // namespace ipmisel
