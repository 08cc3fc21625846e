#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "host/spdriver/source.h"

namespace CLI {
class App;
}

namespace ipmisel {

/// Where the BMCs are and how they are accessed.
struct AccessOptions {
    std::vector<std::string> sources;  ///< empty: this machine's BMC
    std::optional<std::string> passwordFile;
    std::optional<std::string> kgFile;
    NQORTQR20::SourceOptions source;
    // What is known already, so that it is read from nowhere.
    std::optional<std::string> password;
    std::optional<std::vector<std::uint8_t>> kg;

    /// As the user named them, or the default one.
    std::vector<std::string> Sources() const;
};

/// Adds the options to a command, and what there is to say of them at the end of its help.
void AddAccessOptions(CLI::App* command, AccessOptions* options);
std::string WorkaroundHelp();

/// The host that a source names, as the user calls it: of a network source without its port, of a
/// file without its folder and ending; else this machine.
std::string HostOf(const std::string& source);
/// What a system is called that the user gave no name: its host; where several sources have that
/// host, with its port.
std::string NameOfSource(const std::string& source, std::size_t sourcesOfHost);

/// Opens the sources; asks for a password where one is needed and not given. Throws Failure.
NQORTQR20::Source OpenSource(const AccessOptions& options);

}  // namespace ipmisel
