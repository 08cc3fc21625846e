#include "plugins/ipmisel/export/message_log.h"

#include <initializer_list>

#include "plugins/ipmisel/class_names.h"

using ipmisel::kMessageLogClass;
using NQORTQR20::fdriIOHandle;
using NQORTQR20::TCIMReference;
using NQORTQR20::TCPluginCallbacks;

namespace {

constexpr const char* kLogName = "MessageLogEntry";

/// An object path with one key; given back to the host with the object.
class Reference {
public:
    Reference(fdriIOHandle* output, const char* className, const char* key, const char* value) {
        NQORTQR20::fdrNewCIMReference(&reference_, output);
        NQORTQR20::fdrSetReferenceClassName(reference_, className);
        NQORTQR20::fdrReferenceAddString(reference_, key, value);
    }
    ~Reference() {
        if (reference_ != nullptr) NQORTQR20::fdrDeleteCIMReference(reference_);
    }
    Reference(const Reference&) = delete;
    Reference& operator=(const Reference&) = delete;

    TCIMReference* get() const { return reference_; }

private:
    TCIMReference* reference_ = nullptr;
};

}  // namespace

int ExportMessageLog(TCPluginCallbacks* /*context*/, fdriIOHandle* output) {
    NQORTQR20::fdrGetInstance(output, kMessageLogClass);
    NQORTQR20::fdrAddProperty(output, "CreationClassName", kMessageLogClass);
    NQORTQR20::fdrAddProperty(output, "Name", kLogName);
    NQORTQR20::fdrAddInstance(output);
    return 0;
}

int ExportReferences(TCPluginCallbacks* /*context*/, fdriIOHandle* output) {
    const Reference log(output, kMessageLogClass, "Name", kLogName);
    // Compatibility: the records 1 and 2 whatever the log holds
    // (MessageLog.TwoReferencesWhateverTheLogHolds).
    for (const char* recordId : {"1", "2"}) {
        NQORTQR20::fdrGetInstance(output, ipmisel::kRecordInLogClass);
        {
            const Reference record(output, ipmisel::kLogRecordClass, "RecordID", recordId);
            NQORTQR20::fdrAddReferenceProperty(output, "MessageLog", log.get());
            NQORTQR20::fdrAddReferenceProperty(output, "LogRecord", record.get());
        }
        NQORTQR20::fdrAddInstance(output);
    }
    return 0;
}
