#pragma once

#include <cstdio>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

#include "host/core/host.h"
#include "tqr/log.h"

namespace CLI {
class App;
}

namespace ipmisel {

struct LogOptions {
    NQORTQR20::ILogger::ETQRLogSeverity level =
        NQORTQR20::ILogger::kWarning;  ///< on standard error
    std::optional<std::string> file;
};
/// Adds --log-level to a command.
void AddLogLevelOption(CLI::App* command, LogOptions* options);
/// Adds it and --log-file.
void AddLogOptions(CLI::App* command, LogOptions* options);

/// Where the log goes while it lives: lines up to a severity to standard error, every line to a
/// file if one is named. Throws Failure when the file cannot be written.
class LogLines {
public:
    explicit LogLines(const LogOptions& options);
    ~LogLines();
    LogLines(const LogLines&) = delete;
    LogLines& operator=(const LogLines&) = delete;

    /// How to find out that a file which a plug-in needs cannot be read any more.
    void SetFileCheck(std::function<bool()> filesMissing) {
        filesMissing_ = std::move(filesMissing);
    }
    /// Everything is in the file. Throws Failure.
    void Finish();

private:
    struct Close {
        void operator()(std::FILE* file) const { std::fclose(file); }
    };

    void WriteToFile(NQORTQR20::ILogger::ETQRLogSeverity severity, std::string_view text);

    std::function<bool()> filesMissing_;
    std::string name_;
    std::unique_ptr<std::FILE, Close> file_;
    int writeError_ = 0;  ///< of the file; nothing more is written to it
    int toTerminal_ = 0;
    std::optional<int> toFile_;
};

}  // namespace ipmisel
