#pragma once

// The host libraries export namespace NQORTQR20 and nothing else (host/exports.map). What is their
// own is in namespace tqrhost, each library's for itself.
namespace NQORTQR20 {}
namespace tqrhost {
using namespace NQORTQR20;
}  // namespace tqrhost
