#include "plugins/ipmisel/export/message_log.h"

#include <memory>
#include <utility>

#include "plugins/ipmisel/class_names.h"

using ipmisel::kMessageLogClass;
using NQORTQR20::fdriIOHandle;
using NQORTQR20::TCIMReference;
using NQORTQR20::TCPluginCallbacks;

namespace {

constexpr const char* kLogName = "MessageLogEntry";

struct DeleteReference {
    void operator()(TCIMReference* reference) const { NQORTQR20::fdrDeleteCIMReference(reference); }
};
/// An object path; given back to the host with the object.
using Reference = std::unique_ptr<TCIMReference, DeleteReference>;

Reference NewReference(fdriIOHandle* output) {
    TCIMReference* reference = nullptr;
    NQORTQR20::fdrNewCIMReference(&reference, output);
    return Reference(reference);
}

void SetPath(const Reference& reference, const char* className, const char* key,
             const char* value) {
    NQORTQR20::fdrSetReferenceClassName(reference.get(), className);
    NQORTQR20::fdrReferenceAddString(reference.get(), key, value);
}

/// Fills and closes the open association.
void Associate(fdriIOHandle* output, const Reference& log, Reference record, const char* recordId) {
    SetPath(record, ipmisel::kLogRecordClass, "RecordID", recordId);
    NQORTQR20::fdrAddReferenceProperty(output, "MessageLog", log.get());
    NQORTQR20::fdrAddReferenceProperty(output, "LogRecord", record.get());
    record.reset();
    NQORTQR20::fdrAddInstance(output);
}

}  // namespace

int ExportMessageLog(TCPluginCallbacks* /*context*/, fdriIOHandle* output) {
    NQORTQR20::fdrGetInstance(output, kMessageLogClass);
    NQORTQR20::fdrAddProperty(output, "CreationClassName", kMessageLogClass);
    NQORTQR20::fdrAddProperty(output, "Name", kLogName);
    NQORTQR20::fdrAddInstance(output);
    return 0;
}

int ExportReferences(TCPluginCallbacks* /*context*/, fdriIOHandle* output) {
    // Compatibility: the records 1 and 2 whatever the log holds
    // (MessageLog.TwoReferencesWhateverTheLogHolds).
    const Reference log = NewReference(output);
    Reference record = NewReference(output);
    NQORTQR20::fdrGetInstance(output, ipmisel::kRecordInLogClass);
    SetPath(log, kMessageLogClass, "Name", kLogName);
    Associate(output, log, std::move(record), "1");
    NQORTQR20::fdrGetInstance(output, ipmisel::kRecordInLogClass);
    Associate(output, log, NewReference(output), "2");
    return 0;
}
