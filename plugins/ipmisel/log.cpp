#include "plugins/ipmisel/log.h"

#include <exception>

namespace ipmisel {

TraceScope::TraceScope(const char* name, const Words& words)
    : name_(name), words_(words), exceptions_(std::uncaught_exceptions()) {
    if (LogEnabled(words_.severity)) WriteLog(words_.severity, std::string(name_) + words_.entered);
}

TraceScope::~TraceScope() {
    if (ended_ || std::uncaught_exceptions() > exceptions_) return;
    if (LogEnabled(words_.severity)) {
        WriteLog(words_.severity, std::string(name_) + words_.completed);
    }
}

}  // namespace ipmisel
