#include "program/commands/unknown_words.h"

#include <algorithm>
#include <numeric>
#include <string_view>
#include <utility>

#include "program/commands/failure.h"

namespace ipmisel {
namespace {

constexpr std::size_t kMaxShown = 64;

/// Letters to put in, take out or change to make one word the other.
std::size_t Distance(std::string_view a, std::string_view b) {
    std::vector<std::size_t> row(b.size() + 1);
    std::iota(row.begin(), row.end(), 0U);
    for (std::size_t i = 1; i <= a.size(); ++i) {
        std::size_t diagonal = std::exchange(row[0], i);
        for (std::size_t j = 1; j <= b.size(); ++j) {
            const std::size_t changed = diagonal + (a[i - 1] == b[j - 1] ? 0 : 1);
            diagonal = row[j];
            row[j] = std::min({row[j] + 1, row[j - 1] + 1, changed});
        }
    }
    return row.back();
}

bool IsOption(std::string_view word) { return word.size() > 1 && word.front() == '-'; }

/// An option as it was given, without a value behind "=".
std::string OptionOf(std::string_view word) {
    return std::string(word.substr(0, std::min(word.find('='), kMaxShown)));
}

/// "did you mean --output? ", from the options that begin so or are spelt nearly so; nothing when
/// there is none, or too many for a hint.
std::string DidYouMean(const CLI::App& command, std::string_view given) {
    constexpr std::size_t kMaxNamed = 3, kShort = 4;
    const std::string_view name =
        given.substr(std::min(given.find_first_not_of('-'), given.size()));
    if (name.empty()) return "";
    const std::size_t near = name.size() < kShort ? 1 : 2;
    std::vector<std::string> meant;
    for (const CLI::Option* const option : command.get_options()) {
        for (const std::string& known : option->get_lnames()) {
            const bool isNear = name.size() > 1 && Distance(name, known) <= near;
            if (isNear || known.starts_with(name)) meant.push_back("--" + known);
        }
    }
    if (meant.empty() || meant.size() > kMaxNamed) return "";
    return "did you mean " + CLI::detail::join(meant, " or ") + "? ";
}

}  // namespace

void RefuseUnknownCommand(const std::vector<Command>& commands, const CLI::App& program, int argc,
                          char** argv) {
    if (argc < 2) return;
    const std::string word = std::string(argv[1]).substr(0, kMaxShown);
    if (IsOption(word)) {
        const std::string option = OptionOf(word);
        if (program.get_option_no_throw(option) != nullptr) return;
        for (const Command& command : commands) {
            if (command.arguments->get_option_no_throw(option) == nullptr) continue;
            std::string line = option;
            line.append(" belongs behind a command, such as ipmisel ");
            line.append(command.arguments->get_name()).append(" ").append(option);
            throw Failure(kExitUsage, line + "; see ipmisel --help");
        }
        throw Failure(kExitUsage, "there is no option \"" + option + "\"; " +
                                      DidYouMean(program, option) + "see ipmisel --help");
    }
    std::string known;
    std::string near;
    for (const Command& command : commands) {
        const std::string name = command.arguments->get_name();
        if (name == argv[1]) return;
        known += (known.empty() ? "" : ", ") + name;
        if (near.empty() && Distance(word, name) <= 2) near = name;
    }
    throw Failure(kExitUsage, "there is no command \"" + word + "\"; " +
                                  (near.empty() ? "" : "did you mean " + near + "? ") +
                                  "use one of " + known);
}

std::string AboutUnexpected(const CLI::App& command, const std::vector<std::string>& words) {
    const std::string& name = command.get_name();
    const std::string see = "see ipmisel " + name + " --help";
    if (const auto option = std::find_if(words.begin(), words.end(), IsOption);
        option != words.end()) {
        const std::string given = OptionOf(*option);
        return name + " has no option \"" + given + "\"; " + DidYouMean(command, given) + see;
    }
    const std::string word = words.empty() ? "" : words.front().substr(0, kMaxShown);
    const bool isSource = command.get_option_no_throw("--from") != nullptr &&
                          (word == "inband" || word.find(':') != std::string::npos);
    return name + " does not expect \"" + word + "\"; " +
           (isSource ? "did you mean --from " + word + "? " : "") + see;
}

}  // namespace ipmisel
