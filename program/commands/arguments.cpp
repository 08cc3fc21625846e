#include "program/commands/arguments.h"

#include <algorithm>
#include <utility>

#include "base/text.h"
#include "program/commands/failure.h"

namespace ipmisel {

CLI::Validator OneOf(std::vector<std::string> names, bool listInHelp) {
    const std::string list = CLI::detail::join(names, ", ");
    return CLI::Validator(
        [names = std::move(names), list](const std::string& text) {
            if (std::find(names.begin(), names.end(), text) != names.end()) return std::string();
            return "\"" + text + "\" is not known; use one of " + list;
        },
        listInHelp ? list : "");
}

CLI::Validator Seconds(double max) {
    return CLI::Validator(
        [max](const std::string& text) {
            double seconds = 0;
            // Written so that "nan" fails too.
            if (CLI::detail::lexical_cast(text, seconds) && seconds > 0 && seconds <= max) {
                return std::string();
            }
            return Format("\"%s\" is no time; give seconds above 0, at most %.0f", text.c_str(),
                          max);
        },
        "");
}

CLI::Validator Number(int min, int max) {
    return CLI::Validator(
        [min, max](const std::string& text) {
            int number = 0;
            if (CLI::detail::lexical_cast(text, number) && number >= min && number <= max) {
                return std::string();
            }
            return Format("\"%s\" is no number from %d to %d", text.c_str(), min, max);
        },
        "");
}

CLI::Validator Number() {
    return CLI::Validator(
        [](const std::string& text) {
            int number = 0;
            if (CLI::detail::lexical_cast(text, number)) return std::string();
            return "\"" + text + "\" is no number";
        },
        "");
}

CLI::Validator NotEmpty(const std::string& message) {
    return CLI::Validator(
        [message](const std::string& text) { return text.empty() ? message : std::string(); }, "");
}

CLI::Validator FileName() { return NotEmpty("the name is empty; name a file"); }

void RequireStore(bool hasStore, const char* option) {
    if (hasStore) return;
    throw Failure(kExitUsage, std::string(option) +
                                  " goes with a store; name it with --store, or in the "
                                  "configuration");
}

}  // namespace ipmisel
