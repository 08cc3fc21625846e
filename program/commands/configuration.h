#pragma once

#include <functional>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "program/commands/command.h"
#include "program/fleet/host_list.h"

// Files with options of the command line and groups of hosts; docs/configuration.md has their
// format.

namespace ipmisel {

/// A value that stands in a file or in the environment.
struct ConfiguredOption {
    std::string origin;   ///< the file, or the environment variable
    std::string command;  ///< empty: every command that has the option
    std::string name;     ///< without dashes
    std::vector<std::string> values;
};

class Configuration {
public:
    /// Reads the files that there are, those that come first counting most, and refuses what no
    /// command has. Throws Failure.
    Configuration(const std::vector<std::string>& files, const std::vector<Command>& commands);

    /// Gives a parsed command what its command line left out: what the environment has, else the
    /// files. What was given, an entry each. Throws Failure.
    std::vector<ConfiguredOption> ApplyTo(CLI::App* command) const;

    std::optional<HostGroup> Group(const std::string& name) const;

    /// What holds, as a file of this kind that says where each line comes from.
    std::string Text() const;

    /// What --hosts may name, a line each: the groups as %NAME, then every host of theirs, without
    /// "lan:". Throws Failure.
    std::string HostsText() const;

private:
    struct NamedGroup {
        std::string origin, name;
        HostGroup group;
    };

    void Read(const std::string& file, const std::vector<Command>& commands);
    void AddToGroup(const std::string& file, const std::string& group, const std::string& name,
                    const std::vector<std::string>& values);
    /// The entry that holds for an option of a command; null when there is none.
    const ConfiguredOption* Find(const std::string& command, const std::string& name) const;

    std::vector<std::string> read_;  ///< the files that are there
    std::vector<ConfiguredOption> options_;
    std::vector<NamedGroup> groups_;
    std::vector<std::pair<std::string, std::string>> known_;  ///< command and option
};

/// The user's file, then that of the system.
std::vector<std::string> ConfigurationFiles();

/// Takes the files into account for the command that was named: its options, and the groups that
/// FindConfiguredGroup finds from now on. Throws Failure.
void UseConfiguration(const Configuration& configuration, CLI::App* command);

/// A group of the configuration in use; empty when there is none of this name.
std::optional<HostGroup> FindConfiguredGroup(const std::string& name);

/// An option for a message about it: "--NAME", and where it is from when nobody typed it.
std::string OptionWithOrigin(const std::string& name);

/// `ipmisel config`. `commands` are those whose options can be configured.
Command AddConfigCommand(CLI::App* program, std::function<Configuration()> configuration);

}  // namespace ipmisel
