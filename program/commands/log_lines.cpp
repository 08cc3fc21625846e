#include "program/commands/log_lines.h"

#include <algorithm>
#include <cerrno>
#include <cstring>

#include "program/commands/failure.h"
#include "program/reports/json_text.h"
#include "program/reports/terminal_text.h"

namespace ipmisel {
namespace {

using NQORTQR20::ILogger;

constexpr const char* kSeverityNames[] = {"error", "warning", "notice", "info", "trace"};

void WriteToTerminal(ILogger::ETQRLogSeverity severity, std::string_view text) {
    const int known = std::clamp<int>(severity, ILogger::kError, ILogger::kTrace);
    Say(std::string(kSeverityNames[known]) + ": " + std::string(text));
}

[[noreturn]] void Fail(const std::string& name, int error) {
    throw Failure(kExitUsage, "cannot write the log to " + name + ": " + std::strerror(error) +
                                  "; name another file with --log-file");
}

}  // namespace

LogLines::LogLines(ILogger::ETQRLogSeverity upTo, const std::optional<std::string>& file)
    : name_(file.value_or("")) {
    if (file) {
        file_.reset(std::fopen(name_.c_str(), "we"));
        if (!file_) Fail(name_, errno);
        toFile_ = tqrhost::AddLogConsumer(
            ILogger::kTrace, [this](ILogger::ETQRLogSeverity severity, std::string_view text) {
                WriteToFile(severity, text);
            });
    }
    toTerminal_ = tqrhost::AddLogConsumer(upTo, WriteToTerminal);
}

LogLines::~LogLines() {
    tqrhost::RemoveLogConsumer(toTerminal_);
    if (toFile_) tqrhost::RemoveLogConsumer(*toFile_);
}

void LogLines::WriteToFile(ILogger::ETQRLogSeverity severity, std::string_view text) {
    const std::string line = "{\"severity\": " + std::to_string(static_cast<int>(severity)) +
                             ", \"text\": " + JsonText(text) + "}\n";
    std::fwrite(line.data(), 1, line.size(), file_.get());
}

void LogLines::Finish() {
    if (!file_) return;
    errno = 0;
    if (std::fflush(file_.get()) != 0 || std::ferror(file_.get()) != 0) {
        Fail(name_, errno != 0 ? errno : EIO);
    }
}

}  // namespace ipmisel
