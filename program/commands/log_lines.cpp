#include "program/commands/log_lines.h"

#include <fcntl.h>

#include <CLI/CLI.hpp>
#include <algorithm>
#include <cerrno>
#include <iterator>
#include <utility>

#include "host/spdriver/source.h"
#include "program/commands/arguments.h"
#include "program/commands/failure.h"
#include "program/commands/stop_signals.h"
#include "program/reports/json_text.h"
#include "program/reports/report_sink.h"
#include "program/reports/terminal_text.h"

namespace ipmisel {
namespace {

using NQORTQR20::ILogger;

// In the order of the host's severities.
constexpr const char* kSeverityNames[] = {"error", "warning", "notice", "info", "trace"};

void WriteToTerminal(ILogger::ETQRLogSeverity severity, std::string_view text) {
    const int known = std::clamp<int>(severity, ILogger::kError, ILogger::kTrace);
    Say(std::string(kSeverityNames[known]) + ": " + std::string(text));
}

/// Which severity a line has for whoever reads along. Notices are what a plug-in warns of
/// - after a BMC did not know an optional command: a line and the status line after it;
/// - while a file that it needs cannot be read, as for every text of every record: all but the
/// first;
/// - once the collection is over and every instance that it still makes is refused.
class TerminalRule {
public:
    explicit TerminalRule(const std::function<bool()>& filesMissing)
        : filesMissing_(filesMissing) {}

    ILogger::ETQRLogSeverity SeverityOf(ILogger::ETQRLogSeverity severity) {
        if (severity > ILogger::kWarning) return severity;
        if (severity == ILogger::kWarning && (IsOfRefusal() || OutputIsOver())) {
            return ILogger::kNotice;
        }
        if (!filesMissing_ || !filesMissing_()) return severity;
        return std::exchange(missingReported_, true) ? ILogger::kNotice : severity;
    }

private:
    bool IsOfRefusal() {
        const unsigned refused = NQORTQR20::RefusedOptionalCommand();
        if (std::exchange(command_, refused) != refused) lines_ = 0;
        return refused != 0 && lines_++ < kLines;
    }

    static constexpr int kLines = 2;
    unsigned command_ = 0;  ///< that was refused
    int lines_ = 0;         ///< of it
    const std::function<bool()>& filesMissing_;
    bool missingReported_ = false;
};

[[noreturn]] void Fail(const std::string& name, int error) {
    throw Failure(kExitUsage, "cannot write the log to " + name + ": " + ProblemText(error) +
                                  "; name another file with --log-file");
}

}  // namespace

void AddLogLevelOption(CLI::App* command, LogOptions* options) {
    command
        ->add_option_function<std::string>(
            "--log-level",
            [options](const std::string& name) {
                const auto* const place =
                    std::find(std::begin(kSeverityNames), std::end(kSeverityNames), name);
                options->level = static_cast<ILogger::ETQRLogSeverity>(
                    std::distance(std::begin(kSeverityNames), place));
            },
            "What goes to standard error")
        ->type_name("LEVEL")
        ->default_str(kSeverityNames[options->level])
        ->check(OneOf({std::begin(kSeverityNames), std::end(kSeverityNames)}));
}

void AddLogOptions(CLI::App* command, LogOptions* options) {
    AddLogLevelOption(command, options);
    command->add_option("--log-file", options->file, "Every log line as a JSON object a line")
        ->type_name("FILE")
        ->check(FileName());
}

LogLines::LogLines(const LogOptions& options) : name_(options.file.value_or("")) {
    if (options.file) {
        // For the user alone when it is new.
        const int file = open(name_.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0600);
        if (file >= 0) file_.reset(fdopen(file, "w"));
        if (!file_) Fail(name_, errno);
        toFile_ = NQORTQR20::AddLogConsumer(
            ILogger::kTrace, [this](ILogger::ETQRLogSeverity severity, std::string_view text) {
                WriteToFile(severity, text);
            });
    }
    toTerminal_ = NQORTQR20::AddLogConsumer(
        options.level, [level = options.level, shown = TerminalRule(filesMissing_)](
                           ILogger::ETQRLogSeverity severity, std::string_view text) mutable {
            if (shown.SeverityOf(severity) <= level) WriteToTerminal(severity, text);
        });
}

LogLines::~LogLines() {
    NQORTQR20::RemoveLogConsumer(toTerminal_);
    if (toFile_) NQORTQR20::RemoveLogConsumer(*toFile_);
}

void LogLines::WriteToFile(ILogger::ETQRLogSeverity severity, std::string_view text) {
    const std::string line = "{\"severity\": " + std::to_string(static_cast<int>(severity)) +
                             ", \"text\": " + JsonText(text) + "}\n";
    if (writeError_ == 0 && std::fwrite(line.data(), 1, line.size(), file_.get()) != line.size()) {
        writeError_ = errno;
    }
}

void LogLines::Finish() {
    if (!file_) return;
    if (writeError_ == 0 && std::fflush(file_.get()) != 0) writeError_ = errno;
    if (writeError_ != 0) Fail(name_, writeError_);
}

}  // namespace ipmisel
