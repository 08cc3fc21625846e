#pragma once

#include <cstdint>

// What a plug-in says of its classes: one constant table, which the host looks up by its name when
// it has loaded the plug-in, and copies. A plug-in without one has no classes. Texts are static
// texts of the plug-in; the layout belongs to the major version of the plug-in interface.

namespace NQORTQR20 {

/// Which operation writes a property, and which value the reports show.
enum class fdrPropertyType : std::uint32_t {
    kText,       ///< fdrAddProperty
    kInteger,    ///< fdrAddIntegerProperty: 64 bits, signed
    kReal,       ///< fdrAddRealProperty
    kBoolean,    ///< fdrAddBooleanProperty
    kTime,       ///< fdrAddTimeProperty
    kTextList,   ///< fdrAddTextListProperty
    kByteList,   ///< fdrAddArrayProperty
    kReference,  ///< fdrAddReferenceProperty
};

struct fdrPropertyInfo {
    const char* name;
    fdrPropertyType type;
    const char* description;  ///< one line, with the unit
};

/// Marks of a class, joined by |.
enum fdrClassMark : std::uint32_t {
    kByDefault = 1,      ///< collected when no class is named
    kPerLogRecord = 2,   ///< one instance for each record of the event log
    kReadsLog = 4,       ///< the event log has to be read for it
    kReadsSensors = 8,   ///< the sensor repository has to be read for it
    kWrittenAtEnd = 16,  ///< written when the pass is over: what is asked for after it takes a pass
                         ///< of its own
    kInbandOnly = 32,    ///< empty where the controller is reached over the network
};

struct fdrClassInfo {
    const char* name;
    const char* description;  ///< one line
    std::uint32_t marks;      ///< of fdrClassMark
    /// The property that holds the number of the node, from 1, as an integer or a decimal text;
    /// null when instances belong to no node. A class with kPerLogRecord has one.
    const char* nodeProperty;
    /// The exported function `int name(TCPluginCallbacks*, fdriIOHandle*)` that writes the class,
    /// 0 on success; null for a class that getData collects.
    const char* exporter;
    const fdrPropertyInfo* properties;  ///< every one that an instance may have
    std::uint32_t propertyCount;
};

/// A file beside the plug-in without which its collections would be wrong. The host looks for it
/// before a collection.
struct fdrNeededFile {
    const char* name;       ///< without a folder
    std::uint64_t maxSize;  ///< in bytes; a larger one is refused
};

struct fdrClassTable {
    std::uint32_t size;           ///< of this record in bytes
    std::uint32_t classInfoSize;  ///< of one fdrClassInfo in bytes
    const fdrClassInfo* classes;  ///< in the order in which they are collected by default
    std::uint32_t classCount;
    const fdrNeededFile* neededFiles;  ///< null when there is none
    std::uint32_t neededFileCount;
};

}  // namespace NQORTQR20

/// The table that the plug-in exports; the host has none.
extern "C" __attribute__((visibility("default"))) const NQORTQR20::fdrClassTable fdrPluginClasses;
