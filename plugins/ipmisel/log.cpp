#include "plugins/ipmisel/log.h"

#include <exception>
#include <new>

namespace ipmisel {

TraceScope::TraceScope(const char* name, const Words& words)
    : name_(name), words_(words), exceptions_(std::uncaught_exceptions()) {
    if (LogEnabled(words_.severity)) WriteLog(words_.severity, std::string(name_) + words_.entered);
}

TraceScope::~TraceScope() {
    if (ended_ || std::uncaught_exceptions() > exceptions_) return;
    if (!LogEnabled(words_.severity)) return;
    try {
        WriteLog(words_.severity, std::string(name_) + words_.completed);
    } catch (const std::bad_alloc&) {
        // No exception may leave a destructor: the line is lost, and the pass goes on.
    }
}

}  // namespace ipmisel
