#pragma once

#include <string>
#include <string_view>

#include "plugins/ipmisel/result.h"
#include "tqr/log.h"

namespace ipmisel {

using Severity = NQORTQR20::ILogger::ETQRLogSeverity;
constexpr Severity kError = NQORTQR20::ILogger::kError;
constexpr Severity kWarning = NQORTQR20::ILogger::kWarning;
constexpr Severity kNotice = NQORTQR20::ILogger::kNotice;
constexpr Severity kInfo = NQORTQR20::ILogger::kInfo;
constexpr Severity kTrace = NQORTQR20::ILogger::kTrace;

inline void WriteLog(Severity severity, const char* text) {
    NQORTQR20::fdrWriteLog(severity, text);
}
inline void WriteLog(Severity severity, const std::string& text) {
    NQORTQR20::fdrWriteLog(severity, text.c_str());
}
/// Ask before building a costly line; a line that nobody reads need not be built.
inline bool LogEnabled(Severity severity) { return NQORTQR20::fdrLogEnabled(severity); }

/// The entered and completed lines of one operation. Writes `name` + `words.entered` now and
/// `name` + `words.completed` when the scope ends well: not after Fail or Silence, and not while an
/// exception unwinds.
class TraceScope {
public:
    struct Words {
        const char* entered = " entered.";
        const char* completed = " completed.";
        Severity severity = kTrace;
    };
    /// " function entered." and " function completed.", as the record and mapping operations say.
    static constexpr Words kFunction{" function entered.", " function completed.", kTrace};

    explicit TraceScope(const char* name) : TraceScope(name, Words{}) {}
    TraceScope(const char* name, const Words& words);
    ~TraceScope();
    TraceScope(const TraceScope&) = delete;
    TraceScope& operator=(const TraceScope&) = delete;

    /// Ends the scope without its completed line; kFailed, to be returned.
    unsigned Fail() {
        ended_ = true;
        return kFailed;
    }
    /// As Fail, after an error line.
    unsigned Fail(const char* line, Severity severity = kError) {
        WriteLog(severity, line);
        return Fail();
    }
    /// Ends the scope without its completed line although all is well; kOk, to be returned.
    unsigned Silence() {
        ended_ = true;
        return kOk;
    }

private:
    const char* name_;
    Words words_;
    int exceptions_;
    bool ended_ = false;
};

}  // namespace ipmisel
