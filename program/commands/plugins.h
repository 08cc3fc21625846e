#pragma once

#include <memory>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "host/core/plugin_set.h"

namespace CLI {
class App;
}

namespace ipmisel {

/// Adds --plugin to a command.
void AddPluginOption(CLI::App* command, std::vector<std::string>* files);

/// The plug-ins of the program's own folder, and these files. Throws Failure.
std::unique_ptr<NQORTQR20::PluginSet> LoadPlugins(const std::vector<std::string>& files);
/// The same, so that they are loaded faster in processes that are copied from this one.
void KeepPluginsLoaded(const std::vector<std::string>& files);

/// The classes to collect: those that are named, else those of the format that there are, else the
/// default ones; the files that their plug-ins need are there. Throws Failure.
std::vector<std::string> ClassesToCollect(const std::vector<std::string>& named,
                                          std::span<const std::string_view> ofFormat,
                                          const NQORTQR20::PluginSet& plugins);

/// Says which of the classes that are named a controller on the network does not give.
void TellInbandOnly(const std::vector<std::string>& named, const NQORTQR20::PluginSet& plugins);

}  // namespace ipmisel
