#include "plugins/ipmisel/log.h"

#include <exception>
#include <new>

namespace ipmisel {

namespace {

/// Without an exception: scopes end, and some begin, in destructors. A line for which there is no
/// memory is lost, and the pass goes on.
void WriteLine(Severity severity, const char* name, const char* what) noexcept {
    if (!LogEnabled(severity)) return;
    try {
        WriteLog(severity, std::string(name) + what);
    } catch (const std::bad_alloc&) {
    }
}

}  // namespace

TraceScope::TraceScope(const char* name, const Words& words)
    : name_(name), words_(words), exceptions_(std::uncaught_exceptions()) {
    WriteLine(words_.severity, name_, words_.entered);
}

TraceScope::~TraceScope() {
    if (ended_ || std::uncaught_exceptions() > exceptions_) return;
    WriteLine(words_.severity, name_, words_.completed);
}

}  // namespace ipmisel
