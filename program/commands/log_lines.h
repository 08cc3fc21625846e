#pragma once

#include <cstdio>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "host/core/host.h"
#include "tqr/log.h"

namespace ipmisel {

/// Where the log goes while it lives: lines up to a severity to standard error, every line to a
/// file if one is named. Throws Failure when the file cannot be written.
class LogLines {
public:
    LogLines(NQORTQR20::ILogger::ETQRLogSeverity upTo, const std::optional<std::string>& file);
    ~LogLines();
    LogLines(const LogLines&) = delete;
    LogLines& operator=(const LogLines&) = delete;

    /// Everything is in the file. Throws Failure.
    void Finish();

private:
    struct Close {
        void operator()(std::FILE* file) const { std::fclose(file); }
    };

    void WriteToFile(NQORTQR20::ILogger::ETQRLogSeverity severity, std::string_view text);

    std::string name_;
    std::unique_ptr<std::FILE, Close> file_;
    int toTerminal_ = 0;
    std::optional<int> toFile_;
};

}  // namespace ipmisel
