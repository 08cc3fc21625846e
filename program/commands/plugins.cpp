#include "program/commands/plugins.h"

#include <CLI/CLI.hpp>
#include <filesystem>
#include <system_error>

#include "program/commands/arguments.h"
#include "program/commands/failure.h"
#include "program/reports/terminal_text.h"

namespace ipmisel {
namespace {

std::filesystem::path PluginFolder() {
    std::error_code error;
    const auto program = std::filesystem::read_symlink("/proc/self/exe", error);
    return program.parent_path().parent_path() / "lib/ipmisel";
}

/// Does something with plug-ins; what they are refused for is wrong usage.
template <typename Work>
auto WithPlugins(Work work) {
    try {
        return work();
    } catch (const NQORTQR20::PluginError& error) {
        throw Failure(kExitUsage, error.what());
    }
}

}  // namespace

void AddPluginOption(CLI::App* command, std::vector<std::string>* files) {
    command->add_option("--plugin", *files, "A plug-in file in addition")
        ->type_name("FILE")
        ->allow_extra_args(false)
        ->check(FileName());
}

std::unique_ptr<NQORTQR20::PluginSet> LoadPlugins(const std::vector<std::string>& files) {
    return WithPlugins([&] {
        return std::make_unique<NQORTQR20::PluginSet>(
            PluginFolder(), std::vector<std::filesystem::path>(files.begin(), files.end()));
    });
}

void KeepPluginsLoaded(const std::vector<std::string>& files) {
    const auto loaded = LoadPlugins(files);
    for (const auto& plugin : loaded->Plugins()) plugin->KeepLoaded();
}

std::vector<std::string> ClassesToCollect(const std::vector<std::string>& named,
                                          std::span<const std::string_view> ofFormat,
                                          const NQORTQR20::PluginSet& plugins) {
    for (const std::string& name : named) {
        if (plugins.FindClass(name) != nullptr) continue;
        std::string known;
        for (const NQORTQR20::ClassInfo& info : plugins.Classes()) {
            known += (known.empty() ? "" : ", ") + info.name;
        }
        std::string line = "there is no class \"" + name;
        line.append("\"; use one of ").append(known);
        throw Failure(kExitUsage, line);
    }
    std::vector<std::string> wanted = named;
    for (const std::string_view name : ofFormat) {
        if (named.empty() && plugins.FindClass(name) != nullptr) wanted.emplace_back(name);
    }
    if (wanted.empty()) wanted = plugins.DefaultClasses();
    WithPlugins([&] { plugins.CheckNeededFiles(wanted); });
    return wanted;
}

void TellInbandOnly(const std::vector<std::string>& named, const NQORTQR20::PluginSet& plugins) {
    std::string names;
    for (const std::string& name : named) {
        if (!plugins.FindClass(name)->Is(NQORTQR20::kInbandOnly)) continue;
        names += (names.empty() ? "" : ", ") + name;
    }
    if (names.empty()) return;
    Say("over the network there is no " + names +
        "; leave that out, or collect it with --from inband on the machine itself");
}

}  // namespace ipmisel
