#include "program/commands/ack.h"

#include <pwd.h>
#include <unistd.h>

#include <CLI/CLI.hpp>
#include <algorithm>
#include <chrono>
#include <cstdlib>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "program/commands/arguments.h"
#include "program/commands/failure.h"
#include "program/reports/output_file.h"
#include "program/reports/severity.h"
#include "program/reports/terminal_text.h"
#include "program/reports/wording.h"
#include "program/store/store.h"

namespace ipmisel {
namespace {

constexpr std::size_t kKeyLength = 32;

struct AckOptions {
    std::vector<std::string> keys;
    std::string store;
    std::string note;
    std::vector<std::string> systems;  ///< none: all
};

/// Whoever runs the program, by name where it has one; not root, where sudo says who that is.
std::string UserName() {
    const char* const before = std::getenv("SUDO_USER");
    if (geteuid() == 0 && before != nullptr && *before != '\0') return before;
    const passwd* const user = getpwuid(geteuid());
    return user != nullptr ? user->pw_name : std::to_string(geteuid());
}

/// What is open, the worst first: key, severity, system, problem.
int List(const AckOptions& options) {
    auto findings = Store(options.store, IfMissing::kRefuse).OpenFindings(options.systems);
    std::stable_sort(findings.begin(), findings.end(),
                     [](const StoredFinding& a, const StoredFinding& b) {
                         return ParseSeverity(a.severity) > ParseSeverity(b.severity);
                     });
    OutputFile out(std::nullopt);
    for (const StoredFinding& finding : findings) {
        std::string problem =
            Listed({finding.title, OrderText(finding.partNumber, finding.serial)});
        if (finding.acknowledged) {
            problem += " (" + Listed({"acknowledged", finding.note}, ": ") + ")";
        }
        out.Write(TerminalText(finding.key) + "  " +
                  (finding.severity.empty() ? "-" : finding.severity) + "  " +
                  TerminalText(finding.system) + "  " + TerminalText(problem) + "\n");
    }
    out.Commit();
    return kExitCollected;
}

int Acknowledge(const AckOptions& options) {
    RequireStore(!options.store.empty(), "ipmisel ack");
    if (options.keys.empty()) {
        if (options.note.empty()) return List(options);
        throw Failure(kExitUsage,
                      "--note goes with a key; name one of those that ipmisel ack "
                      "--store URI lists");
    }
    Store store(options.store, IfMissing::kRefuse);
    const auto now = std::chrono::duration_cast<std::chrono::seconds>(
        std::chrono::system_clock::now().time_since_epoch());
    for (const std::string& key : options.keys) {
        if (store.Acknowledge(key, options.systems, UserName(), options.note, now.count()) == 0) {
            throw Failure(kExitUsage, "no open finding of the store has the key " + key +
                                          "; take one that ipmisel ack --store URI lists");
        }
    }
    return kExitCollected;
}

}  // namespace

Command AddAckCommand(CLI::App* program) {
    CLI::App* const command =
        program->add_subcommand("ack", "Acknowledge findings, until they come anew, or list them");
    const auto options = std::make_shared<AckOptions>();
    const CLI::Validator isKey(
        [](const std::string& text) {
            const bool good = text.size() == kKeyLength &&
                              text.find_first_not_of("0123456789abcdef") == std::string::npos;
            return good ? std::string()
                        : "\"" + text + "\" is no key; a key has 32 hexadecimal digits";
        },
        "", "KEY");
    command
        ->add_option("KEY", options->keys,
                     "Key of a finding, or of any of its events; none lists what is "
                     "open, the worst first")
        ->check(isKey);
    command->add_option("--store", options->store, "The store that has them")->type_name("URI");
    command->add_option("--note", options->note, "Why, or what is done about it")
        ->type_name("TEXT");
    command->add_option("--system", options->systems, "System that is meant; all when left out")
        ->type_name("NAME")
        ->allow_extra_args(false);
    command->footer(
        "Exit status:\n"
        "  0  acknowledged, or listed\n"
        "  2  wrong usage, no such finding, or the store cannot be used\n");
    return {command, [options] { return Acknowledge(*options); }};
}

}  // namespace ipmisel
