#include "program/commands/options.h"

#include <CLI/CLI.hpp>
#include <algorithm>
#include <iterator>
#include <string_view>

#include "base/text.h"
#include "program/commands/failure.h"
#include "program/reports/report.h"

namespace ipmisel {
namespace {

// In the order of the host's severities.
constexpr const char* kLevels[] = {"error", "warning", "notice", "info", "trace"};
constexpr double kDay = 24 * 60 * 60;

/// What a text must be one of; CLI11 puts the message behind the option's name.
CLI::Validator OneOf(std::vector<std::string> names, bool listInHelp = true) {
    const std::string list = CLI::detail::join(names, ", ");
    return CLI::Validator(
        [names = std::move(names), list](const std::string& text) {
            if (std::find(names.begin(), names.end(), text) != names.end()) return std::string();
            return "\"" + text + "\" is not known; use one of " + list;
        },
        listInHelp ? list : "");
}

/// Seconds, more than none and at most so many.
CLI::Validator Seconds(double most) {
    return CLI::Validator(
        [most](const std::string& text) {
            double seconds = 0;
            // Written so that "nan" fails too.
            if (CLI::detail::lexical_cast(text, seconds) && seconds > 0 && seconds <= most) {
                return std::string();
            }
            return Format("\"%s\" is no time; give seconds above 0, at most %.0f", text.c_str(),
                          most);
        },
        "");
}

CLI::Validator Number(int least, int most) {
    return CLI::Validator(
        [least, most](const std::string& text) {
            int number = 0;
            if (CLI::detail::lexical_cast(text, number) && number >= least && number <= most) {
                return std::string();
            }
            return Format("\"%s\" is no number from %d to %d", text.c_str(), least, most);
        },
        "");
}

CLI::Validator FileName() {
    return CLI::Validator(
        [](const std::string& text) {
            return std::string(text.empty() ? "the name is empty; name a file" : "");
        },
        "");
}

std::string WorkaroundHelp() {
    std::string text = "Known deviations of a BMC to put up with (--workaround):\n";
    for (const tqrhost::WorkaroundInfo& info : tqrhost::KnownWorkarounds()) {
        text += "  " + std::string(info.name) +
                std::string(22 - std::min<std::size_t>(20, info.name.size()), ' ') +
                std::string(info.description) + "\n";
    }
    return text;
}

constexpr const char* kExitStatusHelp =
    "Exit status:\n"
    "  0  collected\n"
    "  1  the plug-in ended the pass with another status than 0\n"
    "  2  wrong usage, or a file that it names cannot be used\n"
    "  3  the source could not be opened, or the machine has no BMC\n"
    "  4  collected in part; the report's completeness says what is missing\n";

template <typename Table>
std::vector<std::string> Names(const Table& table) {
    std::vector<std::string> names;
    for (const auto& row : table) names.emplace_back(row.name);
    return names;
}

}  // namespace

std::optional<Options> ParseOptions(int argc, char** argv, int* exitStatus) {
    Options options;
    std::string level = "warning";
    double timeout = options.source.timeoutSeconds;

    CLI::App app("Reads what a server's management controller (BMC) knows.", "ipmisel");
    app.set_version_flag("--version", "ipmisel " IPMISEL_VERSION);
    app.require_subcommand(1);
    CLI::App* collect = app.add_subcommand("collect", "Collect and write a report");
    CLI::App* classes = app.add_subcommand("classes", "List the classes that can be collected");

    collect
        ->add_option("--from", options.sources,
                     "inband (this machine's BMC, the default), lan:HOST[:PORT], sim:FILE, "
                     "replay:FILE; several lan: sources are several nodes")
        ->type_name("SOURCE")
        ->allow_extra_args(false);
    collect->add_option("--class", options.classes, "Class to collect; see \"ipmisel classes\"")
        ->type_name("CLASS")
        ->allow_extra_args(false);
    collect->add_option("--format", options.format, "Form of the report")
        ->type_name("FORMAT")
        ->capture_default_str()
        ->check(OneOf(Names(KnownFormats())));
    collect->add_option("--output", options.output, "Write the report here, whole or not at all")
        ->type_name("FILE")
        ->check(FileName());
    collect->add_option("--record", options.record, "Write a capture of every exchange here")
        ->type_name("FILE")
        ->check(FileName());
    collect->add_option("--log-level", level, "What goes to standard error")
        ->type_name("LEVEL")
        ->capture_default_str()
        ->check(OneOf({std::begin(kLevels), std::end(kLevels)}));
    collect->add_option("--log-file", options.logFile, "Every log line as a JSON object a line")
        ->type_name("FILE")
        ->check(FileName());
    for (CLI::App* command : {collect, classes}) {
        command->add_option("--plugin", options.plugins, "A plug-in file in addition")
            ->type_name("FILE")
            ->allow_extra_args(false)
            ->check(FileName());
    }
    collect->add_option("--user", options.source.user, "User name at the BMC")->type_name("NAME");
    collect
        ->add_option("--password-file", options.passwordFile,
                     "File with the password in its first line; else the environment variable "
                     "IPMISEL_PASSWORD, else a prompt")
        ->type_name("FILE")
        ->check(FileName());
    collect
        ->add_option("--kg-file", options.kgFile,
                     "File with the BMC's own key (Kg) in its first line, as text or 0x and "
                     "hexadecimal digits; else IPMISEL_KG, else none")
        ->type_name("FILE")
        ->check(FileName());
    collect
        ->add_option("--cipher-suite", options.source.cipherSuite,
                     "Cipher suite by number; 17, else 3 when left out")
        ->type_name("N")
        ->check(Number(0, 255));
    collect->add_option("--privilege", options.source.privilege, "Privilege of the session")
        ->type_name("LEVEL")
        ->capture_default_str()
        ->check(OneOf({"user", "operator", "admin"}));
    collect
        ->add_option("--workaround", options.source.workarounds,
                     "Deviation of the BMC to put up with; see below")
        ->type_name("NAME")
        ->allow_extra_args(false)
        ->check(OneOf(Names(tqrhost::KnownWorkarounds()), false));
    collect
        ->add_option("--window", options.source.window,
                     "Most requests outstanding; adaptive when left out")
        ->type_name("N")
        ->check(Number(1, 15));
    collect->add_option("--timeout", timeout, "Seconds that one request may go unanswered")
        ->type_name("SECONDS")
        ->capture_default_str()
        ->check(Seconds(kDay));
    collect
        ->add_option("--deadline", options.deadlineSeconds,
                     "Seconds that the whole collection may take")
        ->type_name("SECONDS")
        ->check(Seconds(365 * kDay));
    collect->footer(WorkaroundHelp() + kExitStatusHelp);

    try {
        app.parse(argc, argv);
    } catch (const CLI::Success& wanted) {  // help or version
        *exitStatus = app.exit(wanted);
        return std::nullopt;
    } catch (const CLI::ParseError& error) {
        throw Failure(kExitUsage, std::string(error.what()) + "; see ipmisel " +
                                      (collect->parsed() ? "collect " : "") + "--help");
    }
    if (classes->parsed()) options.command = Options::Command::kClasses;
    if (options.sources.empty()) options.sources = {"inband"};
    options.source.timeoutSeconds = timeout;
    const auto* const place = std::find(std::begin(kLevels), std::end(kLevels), level);
    options.logLevel =
        static_cast<NQORTQR20::ILogger::ETQRLogSeverity>(place - std::begin(kLevels));
    return options;
}

}  // namespace ipmisel
