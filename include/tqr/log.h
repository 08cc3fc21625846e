#pragma once

namespace NQORTQR20 {

/// The host's logger. One call is one line; the text goes out as it stands, a trailing line feed
/// of its own included.
class ILogger {
public:
    enum ETQRLogSeverity : int {
        kError = 0,    ///< a command that was not sent, a file that was not opened, unreadable data
        kWarning = 1,  ///< a version mismatch, a small buffer, a completion-code text
        kNotice = 2,   ///< unusual but tolerated
        kInfo = 3,     ///< progress and parse findings
        kTrace = 4,    ///< entry and exit of operations, dumps
    };

    virtual ~ILogger() = default;
    virtual void Write(ETQRLogSeverity severity, const char* text) = 0;
    /// Whether anybody reads lines of this severity; a caller may leave out the work of a line that
    /// nobody reads.
    virtual bool Enabled(ETQRLogSeverity severity) const = 0;
};

/// Writes one line through the core logger. A null text is written as an empty line.
void fdrWriteLog(ILogger::ETQRLogSeverity severity, const char* text);

/// Whether anybody reads lines of this severity.
bool fdrLogEnabled(ILogger::ETQRLogSeverity severity);

/// How the host reaches the BMC, where it is not in-band.
class IIPMILan {
public:
    virtual ~IIPMILan() = default;
    /// True when the BMC is reached over the network.
    virtual bool getipmiLanStatus() const = 0;
};

/// Access to the host's process-wide objects. Both are owned by the host and never null.
class TRootObject {
public:
    static ILogger* GetCoreLogger();
    static IIPMILan* GetipmiLanIns();
};

}  // namespace NQORTQR20
