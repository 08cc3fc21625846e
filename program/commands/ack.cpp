#include "program/commands/ack.h"

#include <pwd.h>
#include <unistd.h>

#include <CLI/CLI.hpp>
#include <algorithm>
#include <chrono>
#include <memory>
#include <string>
#include <vector>

#include "program/commands/arguments.h"
#include "program/commands/failure.h"
#include "program/store/store.h"

namespace ipmisel {
namespace {

constexpr std::size_t kKeyLength = 32;

struct AckOptions {
    std::vector<std::string> keys;
    std::string store;
    std::string note;
};

/// Whoever runs the program, by name where it has one.
std::string UserName() {
    const passwd* const user = getpwuid(geteuid());
    return user != nullptr ? user->pw_name : std::to_string(geteuid());
}

int Acknowledge(const AckOptions& options) {
    Store store(options.store, IfMissing::kRefuse);
    const auto now = std::chrono::duration_cast<std::chrono::seconds>(
        std::chrono::system_clock::now().time_since_epoch());
    for (const std::string& key : options.keys) {
        if (store.Acknowledge(key, UserName(), options.note, now.count()) == 0) {
            throw Failure(kExitUsage, "no open finding of the store has the key " + key +
                                          "; take it from the events of a finding in a report, or "
                                          "from the store");
        }
    }
    return kExitCollected;
}

}  // namespace

Command AddAckCommand(CLI::App* program) {
    CLI::App* const command =
        program->add_subcommand("ack", "Acknowledge findings, until they come anew");
    const auto options = std::make_shared<AckOptions>();
    const CLI::Validator isKey(
        [](const std::string& text) {
            const bool good = text.size() == kKeyLength &&
                              text.find_first_not_of("0123456789abcdef") == std::string::npos;
            return good ? std::string()
                        : "\"" + text + "\" is no key; a key has 32 hexadecimal digits";
        },
        "", "KEY");
    command->add_option("KEY", options->keys, "Key of a finding, or of any of its events")
        ->required()
        ->check(isKey);
    command->add_option("--store", options->store, "The store that has them")
        ->type_name("URI")
        ->required();
    command->add_option("--note", options->note, "Why, or what is done about it")
        ->type_name("TEXT");
    command->footer(
        "Exit status:\n"
        "  0  acknowledged\n"
        "  2  wrong usage, no such finding, or the store cannot be used\n");
    return {command, [options] { return Acknowledge(*options); }};
}

}  // namespace ipmisel
