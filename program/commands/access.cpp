#include "program/commands/access.h"

#include <unistd.h>

#include <CLI/CLI.hpp>
#include <algorithm>
#include <array>
#include <climits>
#include <filesystem>
#include <new>

#include "program/commands/arguments.h"
#include "program/commands/failure.h"
#include "program/commands/password.h"

namespace ipmisel {

std::vector<std::string> AccessOptions::Sources() const {
    return sources.empty() ? std::vector<std::string>{"inband"} : sources;
}

std::string WorkaroundHelp() {
    std::string text = "Known deviations of a BMC to put up with (--workaround):\n";
    for (const NQORTQR20::WorkaroundInfo& info : NQORTQR20::KnownWorkarounds()) {
        text += "  " + std::string(info.name) +
                std::string(22 - std::min<std::size_t>(20, info.name.size()), ' ') +
                std::string(info.description) + "\n";
    }
    return text;
}

void AddAccessOptions(CLI::App* command, AccessOptions* options) {
    command
        ->add_option("--from", options->sources,
                     "inband (this machine's BMC, the default), lan:HOST[:PORT], sim:FILE, "
                     "replay:FILE; several lan: sources are several nodes")
        ->type_name("SOURCE")
        ->allow_extra_args(false);
    command->add_option("--user", options->source.user, "User name at the BMC")->type_name("NAME");
    command
        ->add_option("--password-file", options->passwordFile,
                     "File with the password in its first line; else the environment variable "
                     "IPMISEL_PASSWORD, else a prompt")
        ->type_name("FILE")
        ->check(FileName());
    command
        ->add_option("--kg-file", options->kgFile,
                     "File with the BMC's own key (Kg) in its first line, as text or 0x and "
                     "hexadecimal digits; else IPMISEL_KG, else none")
        ->type_name("FILE")
        ->check(FileName());
    command
        ->add_option("--cipher-suite", options->source.cipherSuite,
                     "Cipher suite by number; 17, else 3 when left out")
        ->type_name("N")
        ->check(Number());
    command->add_option("--privilege", options->source.privilege, "Privilege of the session")
        ->type_name("LEVEL:user, operator, admin")
        ->capture_default_str();
    command
        ->add_option("--workaround", options->source.workarounds,
                     "Deviation of the BMC to put up with; see below")
        ->type_name("NAME")
        ->allow_extra_args(false);
    command
        ->add_option("--window", options->source.window,
                     "Most requests outstanding; adaptive when left out")
        ->type_name("N")
        ->check(Number());
    command
        ->add_option("--timeout", options->source.timeoutSeconds,
                     "Seconds that one request may go unanswered")
        ->type_name("SECONDS")
        ->capture_default_str();
    // What is wrong is refused before anything else is done.
    command->final_callback([options] {
        try {
            NQORTQR20::ParseAccess(options->source);
        } catch (const NQORTQR20::SourceUsageError& error) {
            throw CLI::ValidationError(error.what());
        }
    });
}

std::string HostOf(const std::string& source) {
    const auto colon = source.find(':');
    if (colon == std::string::npos) {
        std::array<char, HOST_NAME_MAX + 1> name{};
        return gethostname(name.data(), name.size() - 1) == 0 ? name.data() : source;
    }
    const std::string place = source.substr(colon + 1);
    if (!source.starts_with("lan:")) return std::filesystem::path(place).stem().string();
    if (place.starts_with('[')) return place.substr(1, place.find(']') - 1);
    const auto port = place.find(':');
    return port == place.rfind(':') ? place.substr(0, port) : place;  // several: an IPv6 address
}

std::string NameOfSource(const std::string& source, std::size_t sourcesOfHost) {
    return sourcesOfHost < 2 ? HostOf(source) : source.substr(source.find(':') + 1);
}

NQORTQR20::Source OpenSource(const AccessOptions& options) {
    NQORTQR20::SourceOptions access = options.source;
    access.password = [&options] {
        return options.password ? *options.password : ReadPassword(options.passwordFile);
    };
    access.kg = [&options] { return options.kg ? *options.kg : ReadKg(options.kgFile); };
    try {
        return NQORTQR20::OpenSources(options.Sources(), access);
    } catch (const NQORTQR20::SourceUsageError& error) {
        throw Failure(kExitUsage, error.what());
    } catch (const NQORTQR20::SourceError& error) {
        throw Failure(kExitNoSource, error.what());
    } catch (const std::bad_alloc&) {
        throw Failure(kExitNoSource,
                      "out of memory while the source was opened; give the program more");
    }
}

}  // namespace ipmisel
