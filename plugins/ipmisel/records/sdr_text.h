#pragma once

#include <string>

#include "plugins/ipmisel/records/sdr_entry.h"

namespace ipmisel {

/// The identity and unit fields and the ID string of a sensor record, in hexadecimal; ends in a
/// line feed.
std::string SdrFieldsText(const IPMISDREntry& entry);

}  // namespace ipmisel
