#pragma once

namespace ipmiseltest {

/// The host has no memory for value arrays.
inline bool gNoArrays = false;

}  // namespace ipmiseltest
