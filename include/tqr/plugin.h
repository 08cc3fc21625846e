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

/// Version of this interface. A plug-in states the oldest one that has what it uses; the host
/// refuses one of another major or a newer minor version. 1.1 has the typed properties,
/// fdrGetOption, fdrGetSystemName and SPLibrary::announceIPMICommand in addition.
inline constexpr const char* fdrPluginInterfaceVersion = "1.1";

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
/// What the user has set for the plug-ins, by name; *value is null when nothing is set, and lives
/// as long as the collection. Since 1.1. The options:
///   "severities"  the text of the file of the user's own severities
/// A plug-in that takes an option may export a function of the type fdrCheckOption under the name
/// fdrPluginCheckOption; a value that it refuses is refused before the collection begins.
TTQRStatusCode fdrGetOption(TCPluginCallbacks* context, const char* name, const char** value);
/// kStatusFailed for a value that cannot be used: why stands in problem[0..capacity) then, one line
/// that ends with a NUL.
using fdrCheckOption = TTQRStatusCode (*)(const char* name, const char* value, char* problem,
                                          std::uint32_t capacity);
/// How the user calls the system of a node (from 0): what --name says, else the host of the source.
/// *name is null for a node that there is not, and lives as long as the collection. Since 1.1.
TTQRStatusCode fdrGetSystemName(TCPluginCallbacks* context, int node, const char** name);

/// Opens an instance; one that is still open is dropped.
TTQRStatusCode fdrGetInstance(fdriIOHandle* output, const char* className);
TTQRStatusCode fdrAddProperty(fdriIOHandle* output, const char* name, const char* value);
// Typed properties; since 1.1.
TTQRStatusCode fdrAddIntegerProperty(fdriIOHandle* output, const char* name, std::int64_t value);
/// Refuses what is no number (an infinity, a NaN).
TTQRStatusCode fdrAddRealProperty(fdriIOHandle* output, const char* name, double value);
TTQRStatusCode fdrAddBooleanProperty(fdriIOHandle* output, const char* name, bool value);
/// A point in time in seconds since 1970-01-01 UTC, of the years 1 to 9999.
TTQRStatusCode fdrAddTimeProperty(fdriIOHandle* output, const char* name, std::int64_t seconds);
/// `texts` may be null when there is none; none of the texts is.
TTQRStatusCode fdrAddTextListProperty(fdriIOHandle* output, const char* name,
                                      const char* const* texts, std::uint32_t count);
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
