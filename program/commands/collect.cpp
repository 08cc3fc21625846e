#include "program/commands/collect.h"

#include <unistd.h>

#include <algorithm>
#include <charconv>
#include <chrono>
#include <csignal>
#include <cstdint>
#include <filesystem>
#include <limits>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <variant>
#include <vector>

#include "host/core/host.h"
#include "host/core/plugin_set.h"
#include "host/spdriver/capture.h"
#include "host/spdriver/completeness.h"
#include "host/spdriver/source.h"
#include "host/spdriver/stop.h"
#include "program/commands/failure.h"
#include "program/commands/log_lines.h"
#include "program/commands/password.h"
#include "program/commands/stop_signals.h"
#include "program/reports/output_file.h"
#include "program/reports/report.h"
#include "program/reports/terminal_text.h"
#include "tqr/classes.h"
#include "tqr/datetime.h"
#include "tqr/splibrary.h"

namespace ipmisel {
namespace {

constexpr std::int64_t kMicrosecondsPerSecond = 1000000;
constexpr std::uint8_t kIpmiDeviceStructure = 38;  // SMBIOS, IPMI device information

/// The node of an instance, from 0; empty when it belongs to none.
std::optional<std::size_t> NodeOf(const tqrhost::Instance& instance, std::string_view property) {
    for (const auto& [name, value] : instance.properties) {
        if (property.empty() || name != property) continue;
        std::int64_t node = 0;
        if (const auto* const text = std::get_if<std::string>(&value)) {
            std::from_chars(text->data(), text->data() + text->size(), node);
        } else if (const auto* const number = std::get_if<std::int64_t>(&value)) {
            node = *number;
        }
        if (node >= 1) return static_cast<std::size_t>(node - 1);
    }
    return std::nullopt;
}

/// Counts log records by node on their way to the report. Once the report cannot be written, it
/// takes nothing any more.
class ReportSink : public tqrhost::WholeInstanceSink {
public:
    ReportSink(ReportWriter& report, const tqrhost::PluginSet& plugins,
               const std::vector<std::string>& wanted, std::size_t nodes)
        : report_(report), nodes_(nodes) {
        for (const std::string& name : wanted) {
            const tqrhost::ClassInfo* const info = plugins.FindClass(name);
            if (info == nullptr || !info->Is(NQORTQR20::kPerLogRecord)) continue;
            Counted& counted = counted_[name];
            counted.nodeProperty = info->nodeProperty;
            counted.byNode.resize(nodes);
            ++counted.times;
        }
    }

    /// As ReportEnd::exported.
    std::vector<unsigned> Exported() const {
        if (counted_.empty()) return {};
        std::vector<unsigned> fewest(nodes_, std::numeric_limits<unsigned>::max());
        for (const auto& [name, counted] : counted_) {
            for (std::size_t node = 0; node < nodes_; ++node) {
                fewest[node] = std::min(fewest[node], counted.byNode[node] / counted.times);
            }
        }
        return fewest;
    }
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
        if (const auto counted = counted_.find(instance.className); counted != counted_.end()) {
            const auto node = NodeOf(instance, counted->second.nodeProperty);
            if (node && *node < nodes_) ++counted->second.byNode[*node];
        }
        return true;
    }

private:
    /// A class with one instance for each log record.
    struct Counted {
        std::string nodeProperty;
        std::vector<unsigned> byNode;
        unsigned times = 0;  ///< that the user named it: it is collected so often
    };

    ReportWriter& report_;
    std::size_t nodes_;
    std::map<std::string, Counted, std::less<>> counted_;
    std::optional<Failure> failure_;
};

std::filesystem::path PluginFolder() {
    std::error_code error;
    const auto program = std::filesystem::read_symlink("/proc/self/exe", error);
    return program.parent_path().parent_path() / "lib/ipmisel";
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

bool GoesOn() { return tqrhost::Stopped() == tqrhost::StopReason::kNone; }

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

/// Does something with plug-ins; what they are refused for is wrong usage.
template <typename Work>
auto WithPlugins(Work work) {
    try {
        return work();
    } catch (const tqrhost::PluginError& error) {
        throw Failure(kExitUsage, error.what());
    }
}

std::unique_ptr<tqrhost::PluginSet> LoadPlugins(const Options& options) {
    return WithPlugins([&] {
        return std::make_unique<tqrhost::PluginSet>(
            PluginFolder(),
            std::vector<std::filesystem::path>(options.plugins.begin(), options.plugins.end()));
    });
}

/// The classes that are to be collected.
std::vector<std::string> WantedClasses(const Options& options, const tqrhost::PluginSet& plugins) {
    for (const std::string& name : options.classes) {
        if (plugins.FindClass(name) != nullptr) continue;
        std::string known;
        for (const tqrhost::ClassInfo& info : plugins.Classes()) {
            known += (known.empty() ? "" : ", ") + info.name;
        }
        throw Failure(kExitUsage, "there is no class \"" + name + "\"; use one of " + known);
    }
    return options.classes.empty() ? plugins.DefaultClasses() : options.classes;
}

/// One for each node. The nodes of lan: sources follow each other as they were named.
std::vector<SystemInfo> SystemsOf(const Options& options, std::size_t nodes) {
    std::vector<SystemInfo> systems(nodes);
    for (std::size_t node = 0; node < nodes; ++node) {
        const bool oneEach = options.sources.size() == nodes;
        SystemInfo& system = systems[node];
        system.source = options.sources[oneEach ? node : 0];
        const auto colon = system.source.find(':');
        system.name = colon == std::string::npos ? system.source : system.source.substr(colon + 1);
    }
    return systems;
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
    // The plug-ins first: without them nobody is asked for a password.
    const std::unique_ptr<tqrhost::PluginSet> plugins = LoadPlugins(options);
    const std::vector<std::string> wanted = WantedClasses(options, *plugins);
    WithPlugins([&] { plugins->CheckNeededFiles(wanted); });
    tqrhost::Source source = OpenSource(options);
    const std::shared_ptr<tqrhost::CaptureWriter> capture = Record(options, source);
    const Machine machine(std::move(source));

    const auto formats = KnownFormats();
    const auto format = std::find_if(formats.begin(), formats.end(),
                                     [&](const FormatInfo& f) { return f.name == options.format; });
    const auto nodes = static_cast<std::size_t>(NQORTQR20::SPLibrary::GetNumberBMCNode());
    const ReportHead head{.source = Joined(options.sources),
                          .plugin = plugins->Plugins().front()->Info(),
                          .machineType = tqrhost::GetMachineFacts().machineType,
                          .nodes = nodes,
                          .systems = SystemsOf(options, nodes),
                          .collected = {NQORTQR20::TOSSpecific::GetLocalTime().TotalMicroseconds() /
                                        kMicrosecondsPerSecond},
                          .classes = plugins->Classes(),
                          .wanted = wanted,
                          .named = !options.classes.empty()};
    tqrhost::PluginSettings settings;
    for (const SystemInfo& system : head.systems) settings.systemNames.push_back(system.name);
    tqrhost::SetPluginSettings(std::move(settings));
    const std::unique_ptr<ReportWriter> report = format->make(output, head);
    ReportSink sink(*report, *plugins, wanted, nodes);
    tqrhost::CollectionPlan plan(*plugins, wanted);
    ReportEnd end;
    StopSignals::BeginCollecting();
    plan.RunPasses(sink, GoesOn);
    if (HasBmc()) plan.RunExporters(sink);
    StopSignals::EndCollecting();
    sink.Check();
    end.stopped = tqrhost::Stopped();
    end.hasBmc = HasBmc();
    end.notices = TellNotices();
    end.completeness = tqrhost::GetCompleteness();
    end.exported = sink.Exported();
    end.plugins = plan.Statuses();
    end.status = plan.Status();
    end.systems = head.systems;
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

int ListClasses(const Options& options) {
    const std::vector<tqrhost::ClassInfo> classes = LoadPlugins(options)->Classes();
    std::size_t width = 0;
    for (const tqrhost::ClassInfo& info : classes) width = std::max(width, info.name.size());
    OutputFile output(std::nullopt);
    for (const tqrhost::ClassInfo& info : classes) {
        output.Write(Fit(info.name, width) + "  " + info.description + "\n");
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
        return options->command == Options::Command::kClasses ? ListClasses(*options)
                                                              : Collect(*options);
    } catch (const Failure& failure) {
        Say(failure.what());
        return failure.exitStatus;
    } catch (const std::exception& error) {
        Say(std::string("ended by an error of its own: ") + error.what());
        return kExitPassFailed;
    }
}

}  // namespace ipmisel
