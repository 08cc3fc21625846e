#include "program/fleet/host_options.h"

#include <CLI/CLI.hpp>
#include <algorithm>
#include <set>
#include <utility>

#include "program/commands/arguments.h"
#include "program/commands/failure.h"
#include "program/commands/password.h"

namespace ipmisel {
namespace {

constexpr double kDefaultDeadline = 120;

/// The options of a line of a list, checked as those of the command line are.
void ApplyOwn(const HostEntry& host, CollectOptions* options) {
    CLI::App line;
    line.set_help_flag();
    AddAccessOptions(&line, &options->access);
    line.remove_option(line.get_option("--from"));
    line.add_option("--password", options->access.password);
    line.add_option("--deadline", options->deadlineSeconds)->check(Seconds(365 * kSecondsPerDay));
    line.add_option("--name", options->names)
        ->check(NotEmpty("the name is empty; name the system"));
    std::vector<std::string> arguments;
    for (const auto& [key, value] : host.options) {
        std::string argument = "--";
        arguments.push_back(argument.append(key).append("=").append(value));
    }
    std::reverse(arguments.begin(), arguments.end());  // as the parser takes them
    try {
        line.parse(std::move(arguments));
    } catch (const CLI::ExtrasError&) {
        throw Failure(kExitUsage, host.origin +
                                      ": an option that a host cannot have; it may have "
                                      "user, password-file, kg-file, cipher-suite, privilege, "
                                      "workaround, window, timeout, deadline, name and password");
    } catch (const CLI::ParseError& error) {
        throw Failure(kExitUsage, host.origin + ": " + error.what());
    }
}

}  // namespace

HostOptions::HostOptions(CollectOptions common, const std::vector<HostEntry>& all)
    : common_(std::move(common)) {
    if (!common_.deadlineSeconds) common_.deadlineSeconds = kDefaultDeadline;
    for (const HostEntry& host : all) ++timesNamed_[HostOf(host.source)];
    std::set<std::string> names;
    for (const HostEntry& host : all) {
        const std::string name = NameOf(host);
        if (names.insert(name).second) continue;
        throw Failure(kExitUsage, host.origin + (host.origin.empty() ? "" : ": ") +
                                      "two controllers have the name " + name +
                                      "; give each a name of its own");
    }
}

std::string HostOptions::NameOf(const HostEntry& host) const {
    for (const auto& [key, value] : host.options) {
        if (key == "name") return value;
    }
    return NameOfSource(host.source, timesNamed_.at(HostOf(host.source)));
}

CollectOptions HostOptions::Of(const HostEntry& host) {
    CollectOptions options = common_;
    ApplyOwn(host, &options);
    options.access.sources = {host.source};
    options.names = {NameOf(host)};
    AccessOptions& access = options.access;
    if (!host.source.starts_with("lan:")) return options;
    if (access.password) {
        // It stands in the list.
    } else if (access.passwordFile != common_.access.passwordFile) {
        std::string& password = passwords_[*access.passwordFile];
        if (password.empty()) password = ReadPassword(access.passwordFile);
        access.password = password;
    } else {
        if (!password_) password_ = ReadPassword(access.passwordFile);
        access.password = password_;
    }
    access.kg = ReadKg(access.kgFile);
    return options;
}

}  // namespace ipmisel
