#include "program/commands/diff.h"

#include <CLI/CLI.hpp>
#include <algorithm>
#include <iterator>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "program/commands/failure.h"
#include "program/reports/output_file.h"
#include "program/reports/saved_report.h"
#include "program/reports/systems.h"
#include "program/reports/terminal_text.h"
#include "program/reports/wording.h"

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

int Diff(const std::vector<std::string>& files) {
    const State before = StateOf(SavedReport(files.at(0)));
    const State after = StateOf(SavedReport(files.at(1)));
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
    CLI::App* const command =
        program->add_subcommand("diff", "Tell what changed between two saved reports");
    const auto files = std::make_shared<std::vector<std::string>>();
    command->add_option("FILE", *files, "The earlier report of --format json, and the later one")
        ->required()
        ->expected(2);
    command->footer(
        "Exit status:\n"
        "  0  nothing changed\n"
        "  1  something did\n"
        "  2  wrong usage, or a report cannot be read\n");
    return {command, [files] { return Diff(*files); }};
}

}  // namespace ipmisel
