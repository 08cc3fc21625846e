#pragma once

/// Marks a function that the shared library exports by name; everything else of the plug-in is
/// hidden. The list of names stands in pass/libipmisel.map.
#define IPMISEL_EXPORTED extern "C" __attribute__((visibility("default")))
