#pragma once

#include <cstdint>

#include "tqr/status.h"

// The host's plug-in interface: registration, output of instances, paths, notices. Every operation
// checks its arguments and answers kStatusFailed on misuse (a null pointer, a property without an
// open instance). Names and texts are NUL-terminated bytes, copied by the host before it returns.

namespace NQORTQR20 {

struct TCPluginCallbacks;       ///< per-plug-in context, owned by the host
struct fdriIOHandle;            ///< where instances of one collection go, owned by the host
struct TCIMReference;           ///< an object path under construction
struct TCIMValueArray;          ///< an array value under construction
struct TPluginManagerProvider;  ///< what the SMBIOS reader needs of the host

/// Version of this interface; a plug-in states the one that it was built against.
inline constexpr const char* fdrPluginInterfaceVersion = "1.0";

/// Answer of the information callback. The texts are static texts of the plug-in.
struct fdrPluginInfo {
    const char* name;
    const char* version;
    const char* interfaceVersion;
    std::uint32_t reserved1;
    std::uint32_t reserved2;
};

/// What a plug-in registers. The host copies the record.
struct fdrPluginCallbacks {
    std::uint32_t size;  ///< of this record in bytes
    TTQRStatusCode (*initialise)(TCPluginCallbacks* context);
    TTQRStatusCode (*deinitialise)(TCPluginCallbacks* context);
    /// One collection: the classes asked for in the host's order.
    TTQRStatusCode (*getData)(TCPluginCallbacks* context, fdriIOHandle* output,
                              const char** classNames, int classCount);
    fdrPluginInfo (*getInfo)(TCPluginCallbacks* context);
    void (*reserved)();  ///< null
};
static_assert(sizeof(void*) != 4 || sizeof(fdrPluginCallbacks) == 24);

/// Registers the plug-in that is being loaded; called while the library loads, and refused at any
/// other time. On success *context is the host's context for the plug-in.
TTQRStatusCode fdrRegisterPlugin(fdrPluginCallbacks* record, TCPluginCallbacks** context);
TTQRStatusCode fdrGetHandle(TCPluginCallbacks* context, const TPluginManagerProvider** provider);
/// The folder of the plug-in followed by "/ipmisel". The text lives as long as the context.
TTQRStatusCode fdrGetPluginPath(TCPluginCallbacks* context, const char** path);
/// Hands the host a notice for the person who runs the collection: as plain text with line breaks
/// and with hyperlink mark-up (null where there is none).
TTQRStatusCode fdrShowNotice(TCPluginCallbacks* context, const char* plainText,
                             const char* markupText);

/// Opens an instance; one that is still open is dropped.
TTQRStatusCode fdrGetInstance(fdriIOHandle* output, const char* className);
TTQRStatusCode fdrAddProperty(fdriIOHandle* output, const char* name, const char* value);
/// Closes the open instance and hands it on.
TTQRStatusCode fdrAddInstance(fdriIOHandle* output);

TTQRStatusCode fdrNewCIMValueArray(TCIMValueArray** array);
TTQRStatusCode fdrArrayAddUint8(TCIMValueArray* array, unsigned char value);
TTQRStatusCode fdrAddArrayProperty(fdriIOHandle* output, const char* name, TCIMValueArray* array);
TTQRStatusCode fdrDeleteCIMValueArray(TCIMValueArray* array);

TTQRStatusCode fdrNewCIMReference(TCIMReference** reference, fdriIOHandle* output);
TTQRStatusCode fdrSetReferenceClassName(TCIMReference* reference, const char* className);
TTQRStatusCode fdrReferenceAddString(TCIMReference* reference, const char* key, const char* value);
TTQRStatusCode fdrAddReferenceProperty(fdriIOHandle* output, const char* name,
                                       TCIMReference* reference);
TTQRStatusCode fdrDeleteCIMReference(TCIMReference* reference);

}  // namespace NQORTQR20
