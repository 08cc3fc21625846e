#include "program/commands/configuration.h"

#include <sys/stat.h>

#include <CLI/CLI.hpp>
#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <set>
#include <sstream>
#include <string_view>

#include "program/commands/failure.h"
#include "program/commands/text_file.h"

namespace ipmisel {
namespace {

constexpr std::size_t kMaxFile = 1 << 20;
constexpr std::string_view kGroupSection = "group";
/// What a group may give its hosts, beside the list of them.
constexpr std::array<std::string_view, 10> kGroupOptions = {
    "user",       "password-file", "kg-file", "cipher-suite", "privilege",
    "workaround", "window",        "timeout", "deadline",     "hosts"};
/// Options that are for the command line alone.
constexpr std::array<std::string_view, 3> kNotConfigured = {"help", "version", "no-config"};

std::string EnvironmentName(const std::string& option) {
    std::string name = "IPMISEL_" + option;
    for (char& c : name) {
        if (c >= 'a' && c <= 'z') c = static_cast<char>(c - 'a' + 'A');
        if (c == '-') c = '_';
    }
    return name;
}

std::string Joined(const std::vector<std::string>& parts, std::string_view separator) {
    std::string text;
    for (const std::string& part : parts) {
        if (!text.empty()) text += separator;
        text += part;
    }
    return text;
}

/// As it stands in a file: quoted where a blank or a comma would part it.
std::string Written(const std::vector<std::string>& values) {
    std::string text;
    for (const std::string& value : values) {
        const bool plain = !value.empty() && value.find_first_of(" ,#\"'[]") == value.npos;
        if (!text.empty()) text += ", ";
        text += plain ? value : "\"" + value + "\"";
    }
    return values.size() == 1 ? text : "[" + text + "]";
}

std::string WithOrigin(std::string line, const std::string& origin) {
    constexpr std::size_t kColumn = 40;
    if (line.size() < kColumn) line.resize(kColumn, ' ');
    return line.append("  # ").append(origin).append("\n");
}

/// The long names of a command's options that a file may have.
std::vector<std::string> OptionsOf(const CLI::App& command) {
    std::vector<std::string> names;
    for (const CLI::Option* const option : command.get_options()) {
        for (const std::string& name : option->get_lnames()) {
            if (std::find(kNotConfigured.begin(), kNotConfigured.end(), name) ==
                kNotConfigured.end()) {
                names.push_back(name);
            }
        }
    }
    return names;
}

bool IsSecret(std::string_view name) { return name == "password" || name == "kg"; }

[[noreturn]] void RefuseSecret(const std::string& file, const std::string& name) {
    throw Failure(kExitUsage, file + ": a " + (name == "kg" ? "key" : name) +
                                  " does not belong into a configuration; write it into a file of "
                                  "its own, for you alone, and name that with " +
                                  name + "-file");
}

[[noreturn]] void RefuseSection(const std::string& file, const std::string& name) {
    throw Failure(kExitUsage, file + ": there is no command \"" + name +
                                  "\"; a section is [COMMAND] or [group.NAME]");
}

std::optional<Configuration>& InUse() {
    static std::optional<Configuration> configuration;
    return configuration;
}

std::vector<ConfiguredOption>& Applied() {
    static std::vector<ConfiguredOption> options;
    return options;
}

}  // namespace

Configuration::Configuration(const std::vector<std::string>& files,
                             const std::vector<Command>& commands) {
    std::set<std::string> names;
    for (const Command& command : commands) {
        for (const std::string& name : OptionsOf(*command.arguments)) {
            known_.emplace_back(command.arguments->get_name(), name);
            names.insert(name);
        }
    }
    for (const std::string& name : names) {
        const std::string variable = EnvironmentName(name);
        const char* const value = IsSecret(name) ? nullptr : std::getenv(variable.c_str());
        if (value != nullptr && *value != '\0') options_.push_back({variable, "", name, {value}});
    }
    for (const std::string& file : files) Read(file, commands);
}

void Configuration::Read(const std::string& file, const std::vector<Command>& commands) {
    struct stat status {};
    if (stat(file.c_str(), &status) != 0 && (errno == ENOENT || errno == ENOTDIR)) return;
    std::istringstream text(ReadTextFile(file, "the configuration", kMaxFile));
    std::vector<CLI::ConfigItem> items;
    try {
        items = CLI::ConfigTOML().from_config(text);
    } catch (const CLI::ParseError& error) {
        throw Failure(kExitUsage, file + ": " + error.what() + "; correct it there");
    }
    read_.push_back(file);
    for (const CLI::ConfigItem& item : items) {
        if (item.name == "++" || item.name == "--") continue;  // a section begins or ends
        if (IsSecret(item.name)) RefuseSecret(file, item.name);
        if (!item.parents.empty() && item.parents.front() == kGroupSection) {
            const std::vector<std::string> rest(item.parents.begin() + 1, item.parents.end());
            AddToGroup(file, Joined(rest, "."), item.name, item.inputs);
            continue;
        }
        const std::string command = Joined(item.parents, ".");
        const bool isCommand =
            command.empty() || std::any_of(commands.begin(), commands.end(), [&](const auto& one) {
                return one.arguments->get_name() == command;
            });
        if (!isCommand) {
            RefuseSection(file, command);
        }
        const bool isOption = std::any_of(known_.begin(), known_.end(), [&](const auto& one) {
            return (command.empty() || one.first == command) && one.second == item.name;
        });
        if (!isOption) {
            throw Failure(kExitUsage,
                          file + ": " + (command.empty() ? "no command" : command) +
                              (command.empty() ? " has an option \"" : " has no option \"") +
                              item.name + "\"; see ipmisel " +
                              (command.empty() ? "collect" : command) + " --help");
        }
        for (const ConfiguredOption& before : options_) {
            if (before.origin == file && before.command == command && before.name == item.name) {
                throw Failure(kExitUsage, file + ": " + item.fullname() +
                                              " stands there twice; give it one line");
            }
        }
        options_.push_back({file, command, item.name, item.inputs});
    }
}

void Configuration::AddToGroup(const std::string& file, const std::string& group,
                               const std::string& name, const std::vector<std::string>& values) {
    const std::string where = file + ": group " + group;
    if (group.empty()) {
        throw Failure(kExitUsage, file + ": a group has a name; begin it with [group.NAME]");
    }
    if (std::find(kGroupOptions.begin(), kGroupOptions.end(), name) == kGroupOptions.end()) {
        std::string known;
        for (const std::string_view option : kGroupOptions) {
            known.append(known.empty() ? "" : ", ").append(option);
        }
        throw Failure(kExitUsage, where + " has no option \"" + name + "\"; it may have " + known);
    }
    auto place = std::find_if(groups_.begin(), groups_.end(),
                              [&](const NamedGroup& one) { return one.name == group; });
    if (place != groups_.end() && place->origin != file) return;  // a file before has this group
    if (place == groups_.end()) place = groups_.insert(groups_.end(), {file, group, {}});
    HostGroup& into = place->group;
    if (name == "hosts") {
        into.hosts += (into.hosts.empty() ? "" : ",") + Joined(values, ",");
        return;
    }
    for (const std::string& value : values) into.options.emplace_back(name, value);
}

const ConfiguredOption* Configuration::Find(const std::string& command,
                                            const std::string& name) const {
    const ConfiguredOption* found = nullptr;
    for (const ConfiguredOption& option : options_) {
        if (option.name != name || (!option.command.empty() && option.command != command)) continue;
        if (found != nullptr && found->origin != option.origin) break;
        // Within a file the command's own section goes before what is for all.
        if (found == nullptr || !option.command.empty()) found = &option;
    }
    return found;
}

std::vector<ConfiguredOption> Configuration::ApplyTo(CLI::App* command) const {
    std::vector<ConfiguredOption> applied;
    for (CLI::Option* const option : command->get_options()) {
        if (option->count() > 0 || option->get_lnames().empty()) continue;
        // What stands on the command line may be instead of this.
        const auto others = option->get_excludes();
        const auto isGiven = [](const CLI::Option* other) { return other->count() > 0; };
        if (!option->get_configurable() || std::any_of(others.begin(), others.end(), isGiven)) {
            continue;
        }
        const std::string name = option->get_lnames().front();
        const ConfiguredOption* const configured = Find(command->get_name(), name);
        if (configured == nullptr) continue;
        try {
            for (const std::string& value : configured->values) {
                const bool isFlag = option->get_expected_max() == 0;
                option->add_result(isFlag ? option->get_flag_value(name, value) : value);
            }
            option->run_callback();
            applied.push_back(*configured);
        } catch (const CLI::ParseError& error) {
            throw Failure(kExitUsage,
                          configured->origin + ": " + error.what() + "; correct it there");
        }
    }
    return applied;
}

std::optional<HostGroup> Configuration::Group(const std::string& name) const {
    const auto place = std::find_if(groups_.begin(), groups_.end(),
                                    [&](const NamedGroup& one) { return one.name == name; });
    if (place == groups_.end()) return std::nullopt;
    return place->group;
}

std::string Configuration::Text() const {
    std::string text;
    for (const std::string& file : read_) text += "# read: " + file + "\n";
    if (read_.empty()) text += "# read: no file\n";
    std::set<const ConfiguredOption*> holding;
    for (const auto& [command, name] : known_) holding.insert(Find(command, name));
    for (const ConfiguredOption& option : options_) {
        if (!holding.contains(&option)) continue;
        const std::string line = (option.command.empty() ? "" : option.command + ".") +
                                 option.name + " = " + Written(option.values);
        text += WithOrigin(line, option.origin);
    }
    for (const NamedGroup& named : groups_) {
        text += "\n" + WithOrigin("[group." + named.name + "]", named.origin);
        text += "hosts = " + Written({named.group.hosts}) + "\n";
        for (const auto& [name, value] : named.group.options) {
            text += name + " = " + Written({value}) + "\n";
        }
    }
    return text;
}

std::string Configuration::HostsText() const {
    std::string text;
    std::vector<std::string> lists;
    for (const NamedGroup& named : groups_) {
        lists.push_back("%" + named.name);
        text += lists.back() + "\n";
    }
    const auto find = [this](const std::string& name) { return Group(name); };
    for (const HostEntry& host : ParseHostLists(lists, find)) {
        text += host.source.substr(host.source.find(':') + 1) + "\n";
    }
    return text;
}

std::vector<std::string> ConfigurationFiles() {
    std::vector<std::string> files;
    const char* const folder = std::getenv("XDG_CONFIG_HOME");
    const char* const home = std::getenv("HOME");
    if (folder != nullptr && *folder == '/') {  // a relative one is to be ignored
        files.push_back(std::string(folder) + "/ipmisel.conf");
    } else if (home != nullptr && *home == '/') {
        files.push_back(std::string(home) + "/.config/ipmisel.conf");
    }
    files.emplace_back("/etc/ipmisel.conf");
    return files;
}

void UseConfiguration(const Configuration& configuration, CLI::App* command) {
    Applied() = configuration.ApplyTo(command);
    InUse() = configuration;
}

std::string OptionWithOrigin(const std::string& name) {
    const auto found = std::find_if(Applied().begin(), Applied().end(),
                                    [&](const ConfiguredOption& one) { return one.name == name; });
    return "--" + name + (found == Applied().end() ? "" : " (of " + found->origin + ")");
}

std::optional<HostGroup> FindConfiguredGroup(const std::string& name) {
    return InUse() ? InUse()->Group(name) : std::nullopt;
}

Command AddConfigCommand(CLI::App* program, std::function<Configuration()> configuration) {
    CLI::App* const command = program->add_subcommand(
        "config", "Print the options that files and environment give, and where each is from");
    const auto hosts = std::make_shared<bool>(false);
    command->add_flag("--hosts", *hosts, "Print the groups and their hosts alone, a line each");
    return {command, [configuration = std::move(configuration), hosts] {
                const std::string text =
                    *hosts ? configuration().HostsText() : configuration().Text();
                if (std::fwrite(text.data(), 1, text.size(), stdout) != text.size() ||
                    std::fflush(stdout) != 0) {
                    throw Failure(kExitUsage, std::string("cannot write the output: ") +
                                                  std::strerror(errno) + "; make room there");
                }
                return kExitCollected;
            }};
}

}  // namespace ipmisel
