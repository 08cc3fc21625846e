#pragma once

namespace ipmiseltest {

/// The host has no memory for value arrays.
extern bool gNoArrays;

}  // namespace ipmiseltest
