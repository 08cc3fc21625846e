#pragma once

#include "tqr/plugin.h"

namespace NQORTQR20 {

// Reader of SMBIOS structures (DSP0134). All operations return 0 on success. Every successful
// smBiosLoad is paired with one smBiosClose.

int smBiosLoad(const TPluginManagerProvider* provider, void** handle);
/// The first structure of a type, formatted area and string set included.
/// `length`: in, the capacity of `structure`; out, the bytes written (a longer structure is cut),
/// or 0 when there is none (the result is then 0 too). Non-zero on misuse.
int smBiosGetFirst(void* handle, int type, void* structure, int* length);
/// The next structure of the type that smBiosGetFirst was asked for; as smBiosGetFirst.
int smBiosGetNext(void* handle, void* structure, int* length);
/// Closes the reader and clears *handle.
int smBiosClose(void** handle);

}  // namespace NQORTQR20
