#include "program/commands/collect.h"

#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <csignal>
#include <cstdint>
#include <cstdlib>
#include <filesystem>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <variant>
#include <vector>

#include "host/core/host.h"
#include "host/spdriver/capture.h"
#include "host/spdriver/completeness.h"
#include "host/spdriver/source.h"
#include "host/spdriver/stop.h"
#include "program/commands/classes.h"
#include "program/commands/failure.h"
#include "program/commands/log_lines.h"
#include "program/commands/password.h"
#include "program/commands/stop_signals.h"
#include "program/reports/output_file.h"
#include "program/reports/report.h"
#include "program/reports/terminal_text.h"
#include "tqr/splibrary.h"

namespace ipmisel {
namespace {

constexpr std::string_view kInventory = "QORSG_IPMIFRU";
constexpr std::uint8_t kIpmiDeviceStructure = 38;  // SMBIOS, IPMI device information

/// Counts log records by node on their way to the report. Once the report cannot be written, it
/// takes nothing any more.
class ReportSink : public tqrhost::WholeInstanceSink {
public:
    ReportSink(ReportWriter& report, std::size_t nodes) : report_(report), exported_(nodes) {}

    const std::vector<unsigned>& Exported() const { return exported_; }
    /// Throws what has kept the report from being written. No exception goes through the plug-in.
    void Check() const {
        if (failure_) throw Failure(*failure_);
    }

protected:
    bool Take(const tqrhost::Instance& instance) override {
        if (failure_) return false;
        try {
            report_.Add(instance);
        } catch (const Failure& failure) {
            failure_ = failure;
            return false;
        }
        if (instance.className == "QORSG_IPMILogRecord") Count(instance);
        return true;
    }

private:
    void Count(const tqrhost::Instance& instance) {
        for (const auto& [name, value] : instance.properties) {
            const auto* const text = std::get_if<std::string>(&value);
            if (name != "SourceNode" || text == nullptr) continue;
            const std::size_t node = std::strtoul(text->c_str(), nullptr, 10);
            if (node >= 1 && node <= exported_.size()) ++exported_[node - 1];
        }
    }

    ReportWriter& report_;
    std::vector<unsigned> exported_;
    std::optional<Failure> failure_;
};

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

/// What is asked for, as the plug-in is called for it.
struct Calls {
    std::vector<std::vector<std::string>> passes;
    std::vector<const char*> exporters;  ///< of the classes that no pass yields
};

/// The plug-in writes the inventory when a pass is over: what is to follow it takes another pass.
Calls CallsFor(const std::vector<std::string>& wanted) {
    Calls calls;
    bool begun = false;
    for (const std::string& name : wanted) {
        const auto known = KnownClasses();
        const auto info = std::find_if(known.begin(), known.end(),
                                       [&name](const ClassInfo& c) { return c.name == name; });
        if (info != known.end() && info->exporter != nullptr) {
            calls.exporters.push_back(info->exporter);
            continue;
        }
        if (!begun) calls.passes.emplace_back();
        calls.passes.back().push_back(name);
        begun = name != kInventory;
    }
    return calls;
}

/// The status is that of the first call that did not end well.
NQORTQR20::TTQRStatusCode RunClasses(tqrhost::Plugin& plugin,
                                     const std::vector<std::string>& wanted,
                                     tqrhost::InstanceSink& sink) {
    const Calls calls = CallsFor(wanted);
    NQORTQR20::TTQRStatusCode status{NQORTQR20::kStatusOk};
    const auto note = [&status](NQORTQR20::TTQRStatusCode ended) {
        if (status.code == NQORTQR20::kStatusOk) status = ended;
    };
    for (const std::vector<std::string>& pass : calls.passes) {
        if (tqrhost::Stopped() == tqrhost::StopReason::kNone) note(plugin.Collect(pass, sink));
    }
    if (!HasBmc()) return status;
    for (const char* exporter : calls.exporters) {
        note({plugin.RunExporter(exporter, sink).value_or(NQORTQR20::kStatusFailed)});
    }
    return status;
}

tqrhost::Source OpenSource(const Options& options) {
    tqrhost::SourceOptions access = options.source;
    access.password = [&options] { return ReadPassword(options.passwordFile); };
    access.kg = [&options] { return ReadKg(options.kgFile); };
    try {
        return tqrhost::OpenSources(options.sources, access);
    } catch (const tqrhost::SourceUsageError& error) {
        throw Failure(kExitUsage, error.what());
    } catch (const tqrhost::SourceError& error) {
        throw Failure(kExitNoSource, error.what());
    }
}

std::shared_ptr<tqrhost::CaptureWriter> Record(const Options& options, tqrhost::Source& source) {
    if (!options.record) return nullptr;
    try {
        return tqrhost::RecordTo(*options.record, source);
    } catch (const tqrhost::SourceError& error) {
        throw Failure(kExitUsage, error.what());
    }
}

std::unique_ptr<tqrhost::Plugin> LoadPlugin(const Options& options) {
    try {
        return std::make_unique<tqrhost::Plugin>(PluginFile(options));
    } catch (const tqrhost::PluginError& error) {
        throw Failure(kExitUsage, error.what());
    }
}

/// Notices that the plug-in had for whoever runs the collection, said and kept.
std::vector<std::string> TellNotices() {
    std::vector<std::string> texts;
    for (tqrhost::Notice& notice : tqrhost::TakeNotices()) {
        std::string_view rest = notice.plainText;
        while (!rest.empty()) {
            const auto end = std::min(rest.find('\n'), rest.size());
            Say(rest.substr(0, end));
            rest.remove_prefix(std::min(end + 1, rest.size()));
        }
        texts.push_back(std::move(notice.plainText));
    }
    return texts;
}

int CollectTo(const Options& options, OutputFile& output) {
    // The plug-in first: without it nobody is asked for a password.
    const std::unique_ptr<tqrhost::Plugin> plugin = LoadPlugin(options);
    tqrhost::Source source = OpenSource(options);
    const std::shared_ptr<tqrhost::CaptureWriter> capture = Record(options, source);
    const Machine machine(std::move(source));

    const auto formats = KnownFormats();
    const auto format = std::find_if(formats.begin(), formats.end(),
                                     [&](const FormatInfo& f) { return f.name == options.format; });
    const auto nodes = static_cast<std::size_t>(NQORTQR20::SPLibrary::GetNumberBMCNode());
    const std::unique_ptr<ReportWriter> report = format->make(
        output,
        {Joined(options.sources), plugin->Info(), tqrhost::GetMachineFacts().machineType, nodes});
    ReportSink sink(*report, nodes);
    ReportEnd end;
    StopSignals::BeginCollecting();
    end.status =
        RunClasses(*plugin, options.classes.empty() ? DefaultClasses() : options.classes, sink);
    StopSignals::EndCollecting();
    sink.Check();
    end.stopped = tqrhost::Stopped();
    end.hasBmc = HasBmc();
    end.notices = TellNotices();
    end.completeness = tqrhost::GetCompleteness();
    end.exported = sink.Exported();
    report->Finish(end);
    output.Commit();
    if (capture && !capture->Finish()) {
        throw Failure(kExitUsage, "the capture " + *options.record +
                                      " is cut short; make room there, or name another --record");
    }
    const Outcome outcome = OutcomeOf(end);
    if (outcome.exitStatus != kExitCollected) Say(outcome.problem + "; " + outcome.advice);
    return outcome.exitStatus;
}

}  // namespace

int ListClasses() {
    OutputFile output(std::nullopt);
    for (const ClassInfo& info : KnownClasses()) {
        output.Write(Fit(info.name, 26) + "  " + std::string(info.description) + "\n");
    }
    output.Commit();
    return kExitCollected;
}

int Collect(const Options& options) {
    const StopSignals signals;
    if (options.deadlineSeconds) {
        using Clock = std::chrono::steady_clock;
        tqrhost::StopAt(Clock::now() +
                        std::chrono::duration_cast<Clock::duration>(
                            std::chrono::duration<double>(*options.deadlineSeconds)));
    }
    LogLines log(options.logLevel, options.logFile);
    OutputFile output(options.output);
    const int status = CollectTo(options, output);
    log.Finish();
    return status;
}

int RunProgram(int argc, char** argv) {
    std::signal(SIGPIPE, SIG_IGN);  // a reader that leaves shows as a write error
    try {
        int exitStatus = kExitCollected;
        const auto options = ParseOptions(argc, argv, &exitStatus);
        if (!options) return exitStatus;
        return options->command == Options::Command::kClasses ? ListClasses() : Collect(*options);
    } catch (const Failure& failure) {
        Say(failure.what());
        return failure.exitStatus;
    } catch (const std::exception& error) {
        Say(std::string("ended by an error of its own: ") + error.what());
        return kExitPassFailed;
    }
}

}  // namespace ipmisel
