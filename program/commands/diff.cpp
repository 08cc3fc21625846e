#include "program/commands/diff.h"

#include <CLI/CLI.hpp>
#include <algorithm>
#include <charconv>
#include <chrono>
#include <iterator>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "program/commands/failure.h"
#include "program/reports/event_filter.h"
#include "program/reports/output_file.h"
#include "program/reports/saved_report.h"
#include "program/reports/systems.h"
#include "program/reports/terminal_text.h"
#include "program/reports/wording.h"
#include "program/store/store.h"

namespace ipmisel {
namespace {

// As those of diff(1); trouble is kExitUsage.
constexpr int kExitSame = 0;
constexpr int kExitDifferent = 1;

/// What is compared, as it is shown, by a name that stays the same. One name may stand for several.
using Values = std::multimap<std::string, std::string>;

struct State {
    Values parts, firmware, problems;
};

State StateOf(const SavedReport& saved) {
    MachineState machine;
    Systems systems(saved.Head());
    saved.ForEach([&](const NQORTQR20::Instance& instance) {
        if (machine.Add(instance) && instance.className == kControllerClass) {
            systems.Add(machine.controllers.back());
        }
    });
    const bool several = systems.All().size() > 1;
    const auto named = [&](Integer node, const std::string& text) {
        return TerminalText(several ? Listed({systems.Of(node).name, text}, ": ") : text);
    };
    State state;
    for (const Fru& f : machine.frus) {
        const std::string name =
            f.name.empty() && f.deviceId ? "FRU " + std::to_string(*f.deviceId) : f.name;
        state.parts.emplace(
            named(f.node, name),
            TerminalText(Listed({f.manufacturer, f.product, OrderText(f.partNumber, f.serialNumber),
                                 f.moduleManufacturer,
                                 OrderText(f.modulePartNumber, f.moduleSerialNumber)})));
    }
    for (const Controller& c : machine.controllers) {
        state.firmware.emplace(named(c.node, "Controller"),
                               TerminalText(Listed({c.firmware, c.auxiliaryRevision})));
    }
    for (const Finding& f : machine.findings) {
        state.problems.emplace(named(f.node, Listed({f.title, f.part}, " - ")),
                               f.severity ? std::string(InfoOf(*f.severity).name) : "");
    }
    return state;
}

struct DiffOptions {
    std::vector<std::string> sides;  ///< files, or visits of the store
    std::optional<std::string> store;
    std::optional<std::string> system;
};

/// A visit by its number, or the last one of the system at a time.
std::int64_t VisitNamed(Store& store, const std::string& text, const DiffOptions& options) {
    std::int64_t number = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
    if (error == std::errc() && end == text.data() + text.size()) return number;
    const auto now = std::chrono::duration_cast<std::chrono::seconds>(
        std::chrono::system_clock::now().time_since_epoch());
    const auto moment = ParseMoment(text, {now.count()});
    if (!moment || !options.system) {
        throw Failure(kExitUsage, "\"" + text +
                                      "\" is no visit of the store; give its number, or a time "
                                      "such as 2026-03-09 or 7d with --system");
    }
    const auto visit = store.VisitAt(*options.system, moment->seconds);
    if (visit) return *visit;
    throw Failure(kExitUsage, "the store has no visit of " + *options.system + " from before " +
                                  text + "; give a later time, or another --system");
}

State StateOf(Store& store, const std::string& text, const DiffOptions& options) {
    const auto stored = store.StateAt(VisitNamed(store, text, options));
    if (!stored) {
        throw Failure(kExitUsage, "the store has no visit " + text + "; take one from its visits");
    }
    State state;
    for (const VisitPart& part : stored->parts) {
        Values& values = part.kind == "firmware" ? state.firmware : state.parts;
        values.emplace(
            TerminalText(part.slot),
            TerminalText(Listed({part.manufacturer, part.product,
                                 OrderText(part.partNumber, part.serial), part.version})));
    }
    for (const StoredFinding& finding : stored->findings) {
        state.problems.emplace(TerminalText(Listed({finding.title, finding.part}, " - ")),
                               finding.severity);
    }
    return state;
}

class Comparison {
public:
    explicit Comparison(OutputFile& out) : out_(out) {}
    bool Different() const { return different_; }

    void Compare(const std::string& heading, const Values& before, const Values& after) {
        headed_ = false;
        heading_ = heading;
        std::vector<std::string> names;
        for (const Values* values : {&before, &after}) {
            for (const auto& [name, value] : *values) names.push_back(name);
        }
        std::sort(names.begin(), names.end());
        names.erase(std::unique(names.begin(), names.end()), names.end());
        for (const std::string& name : names) CompareName(name, Of(before, name), Of(after, name));
    }

private:
    static Texts Of(const Values& values, const std::string& name) {
        Texts found;
        for (auto [at, end] = values.equal_range(name); at != end; ++at)
            found.push_back(at->second);
        std::sort(found.begin(), found.end());
        return found;
    }
    void CompareName(const std::string& name, const Texts& before, const Texts& after) {
        Texts gone, come;
        std::set_difference(before.begin(), before.end(), after.begin(), after.end(),
                            std::back_inserter(gone));
        std::set_difference(after.begin(), after.end(), before.begin(), before.end(),
                            std::back_inserter(come));
        for (const std::string& value : gone) Line("-", name, value);
        for (const std::string& value : come) Line("+", name, value);
    }
    void Line(const char* sign, const std::string& name, const std::string& value) {
        if (!headed_) out_.Write(heading_ + "\n");
        headed_ = different_ = true;
        out_.Write(std::string(sign) + " " + Listed({name, value}, ": ") + "\n");
    }

    OutputFile& out_;
    std::string heading_;
    bool headed_ = false;
    bool different_ = false;
};

int Diff(const DiffOptions& options) {
    State before, after;
    if (options.store) {
        Store store(*options.store, IfMissing::kRefuse);
        before = StateOf(store, options.sides.at(0), options);
        after = StateOf(store, options.sides.at(1), options);
    } else {
        before = StateOf(SavedReport(options.sides.at(0)));
        after = StateOf(SavedReport(options.sides.at(1)));
    }
    OutputFile out(std::nullopt);
    Comparison comparison(out);
    comparison.Compare("Problems", before.problems, after.problems);
    comparison.Compare("Parts", before.parts, after.parts);
    comparison.Compare("Firmware", before.firmware, after.firmware);
    out.Commit();
    return comparison.Different() ? kExitDifferent : kExitSame;
}

}  // namespace

Command AddDiffCommand(CLI::App* program) {
    CLI::App* const command = program->add_subcommand(
        "diff", "Tell what changed between two saved reports, or two visits of a store");
    const auto options = std::make_shared<DiffOptions>();
    command
        ->add_option("FILE", options->sides,
                     "The earlier report of --format json, and the later one; with --store two "
                     "visits by number, or by time")
        ->required()
        ->expected(2);
    // A configured one would turn files into visits.
    CLI::Option* const store =
        command->add_option("--store", options->store, "The store that has the visits")
            ->type_name("URI")
            ->configurable(false);
    command->add_option("--system", options->system, "Whose visits a time means")
        ->type_name("NAME")
        ->needs(store);
    command->footer(
        "Exit status:\n"
        "  0  nothing changed\n"
        "  1  something did\n"
        "  2  wrong usage, or a report or store cannot be read\n");
    return {command, [options] { return Diff(*options); },
            [](const Failure& failure) {
                Say(failure.what());
                return kExitUsage;  // whatever it is: 1 would say that they differ
            }};
}

}  // namespace ipmisel
