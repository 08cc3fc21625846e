#include "collector/collect.h"

#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <csignal>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <memory>
#include <nlohmann/json.hpp>
#include <string>

#include "base/text.h"
#include "collector/classes.h"
#include "collector/output_file.h"
#include "collector/password.h"
#include "collector/report.h"
#include "collector/terminal_text.h"
#include "host/core/host.h"
#include "host/spdriver/stop.h"
#include "host/spdriver/transport.h"
#include "tqr/log.h"
#include "tqr/splibrary.h"

namespace ipmisel {
namespace {

using NQORTQR20::ILogger;

constexpr std::uint8_t kIpmiDeviceStructure = 38;  // SMBIOS, IPMI device information

void Say(const std::string& text) {
    std::fprintf(stderr, "ipmisel: %s\n", TerminalText(text).c_str());
}

/// A log consumer for as long as it lives.
class LogTo {
public:
    LogTo(ILogger::ETQRLogSeverity upTo, tqrhost::LogConsumer consumer)
        : identity_(tqrhost::AddLogConsumer(upTo, std::move(consumer))) {}
    ~LogTo() { tqrhost::RemoveLogConsumer(identity_); }
    LogTo(const LogTo&) = delete;
    LogTo& operator=(const LogTo&) = delete;

private:
    int identity_;
};

constexpr const char* kSeverityNames[] = {"error", "warning", "notice", "info", "trace"};

void LogToTerminal(ILogger::ETQRLogSeverity severity, std::string_view text) {
    std::fprintf(stderr, "ipmisel: %s: %s\n", kSeverityNames[severity], TerminalText(text).c_str());
}

class LogFile {
public:
    explicit LogFile(const std::string& name) : name_(name), file_(std::fopen(name.c_str(), "we")) {
        if (file_ == nullptr) {
            throw OutputError("cannot write " + name + ": " + std::strerror(errno) +
                              "; choose another --log-file");
        }
    }
    ~LogFile() { std::fclose(file_); }
    LogFile(const LogFile&) = delete;
    LogFile& operator=(const LogFile&) = delete;

    void Write(ILogger::ETQRLogSeverity severity, std::string_view text) {
        const nlohmann::ordered_json line = {{"severity", static_cast<int>(severity)},
                                             {"text", text}};
        const std::string json =
            line.dump(-1, ' ', false, nlohmann::ordered_json::error_handler_t::replace) + "\n";
        std::fwrite(json.data(), 1, json.size(), file_);
    }
    void Finish() {
        if (std::fflush(file_) != 0 || std::ferror(file_) != 0) {
            throw OutputError("cannot write " + name_ + ": the log file is cut short");
        }
    }

private:
    std::string name_;
    std::FILE* file_;
};

/// Counts log records by node on their way to the report.
class CountingSink : public tqrhost::WholeInstanceSink {
public:
    CountingSink(ReportWriter* report, std::size_t nodes) : report_(report), exported(nodes) {}

private:
    ReportWriter* report_;

public:
    std::vector<unsigned> exported;

protected:
    bool Take(const tqrhost::Instance& instance) override {
        bool good = report_->OpenInstance(instance.className);
        for (const auto& [name, value] : instance.properties) {
            good = good && report_->AddProperty(name, value);
            const auto* text = std::get_if<std::string>(&value);
            if (instance.className != "QORSG_IPMILogRecord" || name != "SourceNode" ||
                text == nullptr) {
                continue;
            }
            const std::size_t node = std::strtoul(text->c_str(), nullptr, 10);
            if (node >= 1 && node <= exported.size()) ++exported[node - 1];
        }
        return good && report_->CloseInstance();
    }
};

/// The first signal ends the collection in good order, the second at once.
void Interrupted(int signal) {
    if (tqrhost::Stopped() == tqrhost::StopReason::kInterrupted) {
        OutputFile::RemoveUnfinished();
        std::signal(signal, SIG_DFL);
        std::raise(signal);
    }
    tqrhost::StopNow();
}

void HandleSignals() {
    struct sigaction action {};
    action.sa_handler = Interrupted;
    for (const int signal : {SIGINT, SIGTERM, SIGHUP}) sigaction(signal, &action, nullptr);
    std::signal(SIGPIPE, SIG_IGN);  // a reader that leaves shows as a write error
}

std::filesystem::path PluginFile(const Options& options) {
    if (options.plugin) return *options.plugin;
    std::error_code error;
    const auto program = std::filesystem::read_symlink("/proc/self/exe", error);
    return program.parent_path().parent_path() / "lib/ipmisel/libipmisel.pi";
}

std::string Joined(const std::vector<std::string>& parts) {
    std::string text;
    for (const std::string& part : parts) text += (text.empty() ? "" : ",") + part;
    return text;
}

/// The plug-in decides by the same signs and says nothing: a machine without them is told here.
bool HasBmc() {
    const tqrhost::MachineFacts& facts = tqrhost::GetMachineFacts();
    const bool known =
        facts.ipmiLan || std::any_of(facts.smbios.begin(), facts.smbios.end(), [](const auto& s) {
            return !s.empty() && s[0] == kIpmiDeviceStructure;
        });
    return known && NQORTQR20::SPLibrary::GetNumberBMCNode() > 0;
}

struct Machine {
    explicit Machine(tqrhost::Source source) { tqrhost::OpenMachine(std::move(source)); }
    ~Machine() { tqrhost::CloseMachine(); }
    Machine(const Machine&) = delete;
    Machine& operator=(const Machine&) = delete;
};

NQORTQR20::TTQRStatusCode RunClasses(tqrhost::Plugin* plugin,
                                     const std::vector<std::string>& wanted,
                                     tqrhost::InstanceSink* sink) {
    std::vector<std::string> collected;
    std::vector<const char*> exported;
    for (const std::string& name : wanted) {
        const auto known = KnownClasses();
        const auto info = std::find_if(known.begin(), known.end(),
                                       [&name](const ClassInfo& c) { return c.name == name; });
        if (info != known.end() && info->exporter != nullptr) {
            exported.push_back(info->exporter);
        } else {
            collected.push_back(name);
        }
    }
    NQORTQR20::TTQRStatusCode status{NQORTQR20::kStatusOk};
    if (!collected.empty()) status = plugin->Collect(collected, *sink);
    for (const char* exporter : exported) {
        if (plugin->RunExporter(exporter, *sink).value_or(1) != 0) {
            status.code = NQORTQR20::kStatusFailed;
        }
    }
    return status;
}

int ExitStatus(const ReportEnd& end, bool hasBmc) {
    if (end.status.code != NQORTQR20::kStatusOk) {
        Say("the collection failed: " + std::string(end.status.TranslateStatusCode()) +
            " (status " + std::to_string(end.status.code) +
            "); see the lines above, or --log-level info");
        return kExitPassFailed;
    }
    if (!hasBmc) {
        Say("no BMC was found on this machine; name one over the network with --from lan:HOST");
        return kExitNoSource;
    }
    if (const std::string missing = MissingText(end);
        !missing.empty() || tqrhost::Stopped() != tqrhost::StopReason::kNone) {
        const bool late = tqrhost::Stopped() == tqrhost::StopReason::kDeadline;
        Say("collected in part: " +
            (!missing.empty() ? missing
             : late           ? std::string("the deadline has passed")
                              : std::string("interrupted")) +
            "; the report's completeness has the details");
        return kExitPart;
    }
    return kExitCollected;
}

int CollectTo(const Options& options, OutputFile* output) {
    tqrhost::SourceOptions access = options.source;
    access.password = [&options] { return ReadPassword(options.passwordFile); };
    tqrhost::Source source = tqrhost::OpenSources(options.sources, access);
    std::shared_ptr<tqrhost::CaptureWriter> capture;
    if (options.record) capture = tqrhost::RecordTo(*options.record, source);
    const Machine machine(std::move(source));

    tqrhost::Plugin plugin(PluginFile(options));
    const auto& formats = KnownFormats();
    const auto format = std::find_if(formats.begin(), formats.end(),
                                     [&](const FormatInfo& f) { return f.name == options.format; });
    const auto report = format->make(output->stream(), {Joined(options.sources), plugin.Info()});
    CountingSink sink(report.get(),
                      static_cast<std::size_t>(NQORTQR20::SPLibrary::GetNumberBMCNode()));
    ReportEnd end;
    end.status =
        RunClasses(&plugin, options.classes.empty() ? DefaultClasses() : options.classes, &sink);
    for (const tqrhost::Notice& notice : tqrhost::TakeNotices()) {
        end.notices.push_back(notice.plainText);
        std::fprintf(stderr, "%s\n", notice.plainText.c_str());
    }
    end.completeness = tqrhost::GetCompleteness();
    end.exported = sink.exported;
    report->Finish(end);
    output->Commit();
    if (capture && !capture->Finish()) {
        throw OutputError("the capture " + *options.record +
                          " is cut short; see that there is room");
    }
    return ExitStatus(end, HasBmc());
}

}  // namespace

int ListClasses() {
    for (const ClassInfo& info : KnownClasses()) {
        std::printf("%-26s  %s\n", std::string(info.name).c_str(),
                    std::string(info.description).c_str());
    }
    return std::fflush(stdout) == 0 ? kExitCollected : kExitUsage;
}

int Collect(const Options& options) {
    HandleSignals();
    if (options.deadlineSeconds) {
        using Clock = std::chrono::steady_clock;
        tqrhost::StopAt(Clock::now() +
                        std::chrono::duration_cast<Clock::duration>(
                            std::chrono::duration<double>(*options.deadlineSeconds)));
    }
    try {
        std::unique_ptr<LogFile> logFile;
        std::unique_ptr<LogTo> toFile;
        if (options.logFile) {
            logFile = std::make_unique<LogFile>(*options.logFile);
            toFile = std::make_unique<LogTo>(
                ILogger::kTrace,
                [&logFile](ILogger::ETQRLogSeverity severity, std::string_view text) {
                    logFile->Write(severity, text);
                });
        }
        const LogTo toTerminal(static_cast<ILogger::ETQRLogSeverity>(options.logLevel),
                               LogToTerminal);
        OutputFile output(options.output);
        const int status = CollectTo(options, &output);
        if (logFile) logFile->Finish();
        return status;
    } catch (const tqrhost::SourceError& error) {
        Say(error.what());
        return kExitNoSource;
    } catch (const tqrhost::PluginError& error) {
        Say(error.what());
        return kExitUsage;
    } catch (const OutputError& error) {
        if (errno == EPIPE) return kExitCollected;  // the reader has had enough
        Say(error.what());
        return kExitUsage;
    } catch (const std::exception& error) {
        Say(error.what());
        return kExitPassFailed;
    }
}

}  // namespace ipmisel
