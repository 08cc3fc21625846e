#include "program/commands/collect.h"

#include <CLI/CLI.hpp>
#include <algorithm>
#include <chrono>
#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "host/core/host.h"
#include "host/core/plugin_set.h"
#include "host/spdriver/capture.h"
#include "host/spdriver/completeness.h"
#include "host/spdriver/reading.h"
#include "host/spdriver/source.h"
#include "host/spdriver/stop.h"
#include "ipmi/smbios.h"
#include "program/commands/access.h"
#include "program/commands/arguments.h"
#include "program/commands/failure.h"
#include "program/commands/log_lines.h"
#include "program/commands/named_files.h"
#include "program/commands/out_of_memory.h"
#include "program/commands/plugins.h"
#include "program/commands/stop_signals.h"
#include "program/commands/text_file.h"
#include "program/fleet/collect_hosts.h"
#include "program/reports/progress.h"
#include "program/reports/report.h"
#include "program/reports/report_sink.h"
#include "program/reports/terminal_text.h"
#include "program/store/visit_recorder.h"
#include "tqr/datetime.h"
#include "tqr/splibrary.h"

namespace ipmisel {
namespace {

constexpr std::size_t kMaxSeverities = 1 << 20;
constexpr std::int64_t kMicrosecondsPerSecond = 1000000;

std::string Joined(const std::vector<std::string>& parts) {
    std::string text;
    for (const std::string& part : parts) text += (text.empty() ? "" : ",") + part;
    return text;
}

/// The plug-in decides by the same signs and says nothing: a machine without them is told here.
bool HasBmc() {
    const NQORTQR20::MachineFacts& facts = NQORTQR20::GetMachineFacts();
    const bool known = facts.ipmiLan || ipmi::HasIpmiDevice(facts.smbios);
    return known && NQORTQR20::SPLibrary::GetNumberBMCNode() > 0;
}

/// A controller that answered is one, whatever the machine's tables say of it.
bool HasAnswered(const std::vector<NQORTQR20::NodeCompleteness>& nodes) {
    return std::ranges::any_of(nodes, [](const NQORTQR20::NodeCompleteness& node) {
        return node.controller.read + node.log.read + node.sensors.read > 0 || node.log.announced ||
               node.sensors.announced;
    });
}

struct Machine {
    explicit Machine(NQORTQR20::Source source) { NQORTQR20::OpenMachine(std::move(source)); }
    ~Machine() { NQORTQR20::CloseMachine(); }
    Machine(const Machine&) = delete;
    Machine& operator=(const Machine&) = delete;
};

std::shared_ptr<NQORTQR20::CaptureWriter> Record(const CollectOptions& options,
                                                 NQORTQR20::Source& source,
                                                 const std::vector<std::string>& classes) {
    if (!options.record) return nullptr;
    try {
        return NQORTQR20::RecordTo(*options.record, source, classes);
    } catch (const NQORTQR20::SourceError& error) {
        throw Failure(kExitUsage, error.what());
    }
}

/// What the host has to read of every node for the classes.
NQORTQR20::ReadingNeeds NeedsOf(const std::vector<std::string>& wanted,
                                const NQORTQR20::PluginSet& plugins) {
    NQORTQR20::ReadingNeeds needs{false, false};
    for (const std::string& name : wanted) {
        const NQORTQR20::ClassInfo* const info = plugins.FindClass(name);
        if (info == nullptr) continue;
        needs.log |= info->Is(NQORTQR20::kReadsLog);
        needs.sensors |= info->Is(NQORTQR20::kReadsSensors);
    }
    return needs;
}

/// What a system is called: as the user says, else by its source.
std::string NameOf(const std::string& source, const CollectOptions& options) {
    const std::vector<std::string> sources = options.access.Sources();
    const auto place = std::find(sources.begin(), sources.end(), source);
    const auto index = static_cast<std::size_t>(place - sources.begin());
    if (options.names.size() == sources.size() && index < sources.size()) {
        return options.names[index];
    }
    const auto sameHost = std::count_if(sources.begin(), sources.end(), [&](const auto& each) {
        return HostOf(each) == HostOf(source);
    });
    return NameOfSource(source, static_cast<std::size_t>(sameHost));
}

/// One for each node.
std::vector<SystemInfo> SystemsOf(const NQORTQR20::Source& source, const CollectOptions& options) {
    const std::vector<std::string> sources = options.access.Sources();
    const std::vector<std::string>& names = options.names;
    // One source may be a machine of several nodes.
    const bool byNode = sources.size() == 1 && names.size() == source.nodes.size();
    if (!names.empty() && names.size() != sources.size() && !byNode) {
        throw Failure(kExitUsage, std::to_string(names.size()) + " names for " +
                                      std::to_string(sources.size()) +
                                      " sources; give --name once for each --from");
    }
    std::vector<SystemInfo> systems;
    for (const NQORTQR20::SourceNode& node : source.nodes) {
        SystemInfo& system = systems.emplace_back();
        system.source = node.name.empty() ? sources.front() : node.name;
        system.name = byNode ? names[systems.size() - 1] : NameOf(system.source, options);
    }
    return systems;
}

/// What the plug-ins may ask for, which none of them refuses.
NQORTQR20::PluginSettings SettingsOf(const CollectOptions& options,
                                     const NQORTQR20::PluginSet& plugins) {
    NQORTQR20::PluginSettings settings;
    if (options.severities) {
        settings.options["severities"] =
            ReadTextFile(*options.severities, "--severities", kMaxSeverities);
    }
    for (const auto& [name, value] : settings.options) {
        for (const auto& plugin : plugins.Plugins()) {
            const std::string problem = plugin->ProblemOfOption(name, value);
            if (problem.empty()) continue;
            std::string line = "cannot use --" + name;
            line.append(": ").append(problem).append("; correct it there");
            throw Failure(kExitUsage, line);
        }
    }
    return settings;
}

/// Whether a file that the classes' plug-ins need cannot be read any more.
std::function<bool()> MissingFiles(const std::shared_ptr<NQORTQR20::PluginSet>& plugins,
                                   const std::vector<std::string>& wanted) {
    return [plugins = std::weak_ptr(plugins), wanted] {
        try {
            if (const auto held = plugins.lock()) held->CheckNeededFiles(wanted);
            return false;
        } catch (const NQORTQR20::PluginError&) {
            return true;
        }
    };
}

/// Notices that the plug-in had for whoever runs the collection, said and kept.
std::vector<std::string> TellNotices() {
    std::vector<std::string> texts;
    for (NQORTQR20::Notice& notice : NQORTQR20::TakeNotices()) {
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

/// Says on the terminal how far the reading is, until it is ended.
class ReadingProgressLine {
public:
    explicit ReadingProgressLine(bool wanted) {
        if (wanted) line_.emplace();
    }
    ~ReadingProgressLine() { End(); }
    ReadingProgressLine(const ReadingProgressLine&) = delete;
    ReadingProgressLine& operator=(const ReadingProgressLine&) = delete;

    /// Empty where nothing would be seen. Must not be called when the object is gone.
    NQORTQR20::ReadingProgress Observer() {
        if (!line_ || !line_->Enabled()) return {};
        return [this](const NQORTQR20::ReadingState& state) {
            if (!line_) return;
            line_->Show({.what = state.what,
                         .done = state.read,
                         .total = state.announced,
                         .unit = state.unit});
        };
    }
    void End() {
        NQORTQR20::ObserveReading({});
        line_.reset();
    }

private:
    std::optional<ProgressLine> line_;
};

/// The names of the systems behind these sources, which could not be opened.
std::vector<std::string> NamesOf(const std::vector<std::string>& unopened,
                                 const CollectOptions& options) {
    std::vector<std::string> names;
    names.reserve(unopened.size());
    for (const std::string& source : unopened) names.push_back(NameOf(source, options));
    return names;
}

/// Opens the sources; those that cannot be opened are stored as visits that failed.
NQORTQR20::Source OpenFor(StoredCollection* store, const CollectOptions& options) {
    try {
        NQORTQR20::Source source = OpenSource(options.access);
        if (store != nullptr) {
            for (const NQORTQR20::UnreachableNode& node : source.unreachable) {
                store->Fail(NamesOf({node.name}, options), node.reason);
            }
        }
        return source;
    } catch (const Failure& failure) {
        if (store != nullptr && failure.exitStatus == kExitNoSource) {
            store->Fail(NamesOf(options.access.Sources(), options), failure.what());
        }
        throw;
    }
}

/// These, and those that are not among them.
std::vector<std::string> With(std::vector<std::string> classes,
                              const std::vector<std::string>& more) {
    for (const std::string& name : more) {
        if (std::find(classes.begin(), classes.end(), name) == classes.end()) {
            classes.push_back(name);
        }
    }
    return classes;
}

/// A report of the state of all would say of what is known that nothing is wrong.
void RefuseNewOfAll(const CollectOptions& options) {
    const std::string& format = options.report.format;
    const bool isOfAll =
        FindFormat(format)->forPeople || format == "prometheus" || format == "redfish";
    if (!options.onlyNew || !isOfAll) return;
    throw Failure(kExitUsage, "--format " + format +
                                  " tells the state of all; leave out --new, or give another "
                                  "format such as events");
}

/// The head of a report on the machine that is open.
ReportHead HeadOf(const CollectOptions& options, const NQORTQR20::PluginSet& plugins,
                  const std::vector<SystemInfo>& systems, const std::vector<std::string>& wanted) {
    return {.source = Joined(options.access.Sources()),
            .plugin = plugins.Plugins().front()->Info(),
            .machineType = NQORTQR20::GetMachineFacts().machineType,
            .nodes = static_cast<std::size_t>(NQORTQR20::SPLibrary::GetNumberBMCNode()),
            .systems = systems,
            .collected = {NQORTQR20::TOSSpecific::GetLocalTime().TotalMicroseconds() /
                          kMicrosecondsPerSecond},
            .classes = plugins.Classes(),
            .wanted = wanted,
            .named = !options.report.classes.empty()};
}

/// How the collection ended; says the plug-ins' notices.
ReportEnd EndOf(const ReportHead& head, const ReportSink& sink,
                const NQORTQR20::CollectionPlan& plan) {
    ReportEnd end;
    end.stopped = NQORTQR20::Stopped();
    end.notices = TellNotices();
    end.completeness = NQORTQR20::GetCompleteness();
    end.hasBmc = HasBmc() || HasAnswered(end.completeness);
    end.exported = sink.Exported();
    for (std::size_t node = 0; node < end.exported.size(); ++node) {
        end.completeness[node].log.exported = end.exported[node];
    }
    end.unreachable = NQORTQR20::GetUnreachable();
    end.plugins = plan.Statuses();
    end.status = plan.Status();
    end.systems = head.systems;
    return end;
}

Outcome CollectTo(const CollectOptions& options, LogLines& log, ReportOutput& output) {
    const auto begin = std::chrono::steady_clock::now();
    // The plug-ins first: without them nobody is asked for a password.
    const std::shared_ptr<NQORTQR20::PluginSet> plugins = LoadPlugins(options.plugins);
    const auto ofFormat = FindFormat(options.report.format)->classes;
    std::vector<std::string> wanted = ClassesToCollect(options.report.classes, ofFormat, *plugins);
    NQORTQR20::PluginSettings settings = SettingsOf(options, *plugins);
    std::optional<StoredCollection> store;
    if (options.store) store.emplace(*options.store, options.onlyNew);
    log.SetFileCheck(MissingFiles(plugins, wanted));
    NQORTQR20::Source source = OpenFor(store ? &*store : nullptr, options);
    // A capture answers what was asked for when it was made, if the format can be made of that.
    const bool suffices = std::all_of(ofFormat.begin(), ofFormat.end(), [&](std::string_view name) {
        return std::find(source.classes.begin(), source.classes.end(), name) !=
               source.classes.end();
    });
    if (options.report.classes.empty() && !source.classes.empty() && suffices) {
        wanted = ClassesToCollect(source.classes, {}, *plugins);
    }
    for (const NQORTQR20::UnreachableNode& node : source.unreachable) Say(node.reason);
    if (options.alone && source.facts.ipmiLan) TellInbandOnly(options.report.classes, *plugins);
    const std::vector<SystemInfo> systems = SystemsOf(source, options);
    for (const SystemInfo& system : systems) settings.systemNames.push_back(system.name);
    NQORTQR20::SetPluginSettings(std::move(settings));
    const std::vector<std::string> reported = wanted;
    NQORTQR20::ReadingNeeds needs = NeedsOf(wanted, *plugins);
    if (store) {
        wanted = With(std::move(wanted), ClassesToCollect(StoredClasses(), {}, *plugins));
        needs = NeedsOf(wanted, *plugins);
        needs.guid = true;
        needs.every = options.access.Sources().front().starts_with("sim:");
        store->Begin(systems);
    }
    StopSignals::BeginCollecting();
    ReadingProgressLine progress(options.progress);
    std::vector<NQORTQR20::NodeReading> readings = NQORTQR20::ReadLiveNodes(
        source, needs, progress.Observer(), store ? store->Known() : decltype(store->Known())());
    const std::shared_ptr<NQORTQR20::CaptureWriter> capture = Record(options, source, wanted);
    const Machine machine(std::move(source));

    const ReportHead head = HeadOf(options, *plugins, systems, reported);
    const std::unique_ptr<ReportWriter> report = output.Make(head);
    const bool unchanged = store && StoredCollection::Unchanged(readings);
    if (unchanged) wanted.clear();
    ReportWriter& taken = store && !unchanged ? store->Record(*report, reported) : *report;
    ReportSink sink(taken, *plugins, wanted, head.nodes);
    NQORTQR20::CollectionPlan plan(*plugins, wanted);
    if (output.StreamsToTerminal()) progress.End();
    NQORTQR20::ObserveReading(progress.Observer());
    plan.RunPasses(sink, [] { return !OutputIsOver(); });
    if (HasBmc()) plan.RunExporters(sink);
    if (!unchanged) NQORTQR20::EndPass();
    progress.End();
    StopSignals::EndCollecting();
    sink.Check();
    ReportEnd end = EndOf(head, sink, plan);
    if (unchanged) end.notices = store->NoticesOfUnchanged();
    end.seconds = std::chrono::duration<double>(std::chrono::steady_clock::now() - begin).count();
    report->Finish(end);
    output.Commit();
    if (capture && !capture->Finish()) {
        throw Failure(kExitUsage, "the capture " + *options.record +
                                      " is cut short; make room there, or name another --record");
    }
    try {
        if (store) store->Finish(end, std::move(readings));
    } catch (const Failure& failure) {
        return {failure.exitStatus, failure.what(),
                ""};  // the report is what was read all the same
    }
    return OutcomeOf(end);
}

constexpr const char* kExitStatusHelp =
    "Exit status:\n"
    "  0  collected\n"
    "  1  the plug-in ended the pass with another status than 0\n"
    "  2  wrong usage, or a file that it names cannot be used\n"
    "  3  the source could not be opened, or the machine has no BMC\n"
    "  4  collected in part; the report's completeness says what is missing\n";

/// Every file that the options name.
std::vector<NamedFile> FilesOf(const CollectOptions& options) {
    std::vector<NamedFile> files;
    const auto add = [&](const char* option, const std::optional<std::string>& name, bool written) {
        if (name && *name != "-") files.push_back({option, *name, written});
    };
    add("--output", options.report.output, true);
    add("--record", options.record, true);
    add("--log-file", options.log.file, true);
    add("--password-file", options.access.passwordFile, false);
    add("--kg-file", options.access.kgFile, false);
    add("--severities", options.severities, false);
    for (const std::string& plugin : options.plugins) add("--plugin", plugin, false);
    for (const std::string& source : options.access.Sources()) {
        for (const std::string_view kind : {"sim:", "replay:"}) {
            if (source.starts_with(kind)) add("--from", source.substr(kind.size()), false);
        }
    }
    return files;
}

void AddDeadlineOption(CLI::App* command, std::optional<double>* seconds) {
    command
        ->add_option("--deadline", *seconds,
                     "Seconds that the whole collection may take; that of each controller with "
                     "--hosts")
        ->type_name("SECONDS")
        ->check(Seconds(365 * kSecondsPerDay));
}

void AddSeveritiesOption(CLI::App* command, std::optional<std::string>* file) {
    command->add_option("--severities", *file, "File with severities of your own")
        ->type_name("FILE")
        ->check(FileName());
}

}  // namespace

Outcome CollectOutcome(const CollectOptions& options) {
    RefuseSameFile(FilesOf(options));
    const StopSignals signals;
    if (options.deadlineSeconds) {
        using Clock = std::chrono::steady_clock;
        StopSignals::StopAt(Clock::now() +
                            std::chrono::duration_cast<Clock::duration>(
                                std::chrono::duration<double>(*options.deadlineSeconds)));
    }
    LogLines log(options.log);
    ReportOutput output(options.report);
    Outcome outcome = CollectTo(options, log, output);
    log.Finish();
    if (HasRunOutOfMemory()) {
        outcome.problem = std::string(kOutOfMemory) + ": " + outcome.problem;
        outcome.advice = kOutOfMemoryAdvice;
    }
    return outcome;
}

int Collect(const CollectOptions& options) {
    const Outcome outcome = CollectOutcome(options);
    if (outcome.exitStatus != kExitCollected) Say(LineOf(outcome));
    return outcome.exitStatus;
}

void AddPassOptions(CLI::App* command, CollectOptions* options) {
    options->log.level = NQORTQR20::ILogger::kError;
    options->progress = false;
    AddDeadlineOption(command, &options->deadlineSeconds);
    AddSeveritiesOption(command, &options->severities);
    AddPluginOption(command, &options->plugins);
    AddLogLevelOption(command, &options->log);
}

void AddStoreOptions(CLI::App* command, CollectOptions* options) {
    command
        ->add_option("--store", options->store,
                     "Keep what is collected: sqlite:FILE or postgresql://HOST/DATABASE")
        ->type_name("URI")
        ->check(NotEmpty("the store is empty; give sqlite:FILE or postgresql://..."));
    command->add_flag("--new", options->onlyNew,
                      "Read and report only events that the store does not have");
}

Command AddCollectCommand(CLI::App* program) {
    CLI::App* const command = program->add_subcommand("collect", "Collect and write a report");
    const auto options = std::make_shared<CollectOptions>();
    AddReportOptions(command, &options->report);
    command->add_option("--record", options->record, "Write a capture of every exchange here")
        ->type_name("FILE")
        ->check(FileName());
    AddLogOptions(command, &options->log);
    AddPluginOption(command, &options->plugins);
    AddAccessOptions(command, &options->access);
    AddDeadlineOption(command, &options->deadlineSeconds);
    command
        ->add_option("--name", options->names,
                     "Name of the system in reports; the host of the source when left out")
        ->type_name("NAME")
        ->allow_extra_args(false)
        ->check(NotEmpty("the name is empty; name the system"));
    AddSeveritiesOption(command, &options->severities);
    const auto hosts = std::make_shared<HostsOptions>();
    AddHostsOptions(command, hosts.get());
    AddStoreOptions(command, options.get());
    command->footer(FormatHelp() + WorkaroundHelp() + kExitStatusHelp);
    return {command, [options, hosts] {
                RequireStore(options->store || !options->onlyNew, "--new");
                RefuseNewOfAll(*options);
                return hosts->lists.empty() ? Collect(*options) : CollectHosts(*options, *hosts);
            }};
}

}  // namespace ipmisel
