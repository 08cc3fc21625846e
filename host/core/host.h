#pragma once

#include <cstdint>
#include <filesystem>
#include <functional>
#include <memory>
#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include "host/core/sink.h"
#include "tqr/log.h"
#include "tqr/plugin.h"

// What the collector sees of the host: the facts of the machine, the log, the plug-in. The state
// behind it is the process's own; nothing here is for more than one thread.

namespace tqrhost {

/// What is known of the machine that is collected from, beside its BMCs. A capture keeps it, so
/// that a replay finds the same machine.
struct MachineFacts {
    std::string machineType;
    bool integratedBmc = false;
    bool ipmiDriver = true;
    bool ipmiLan = false;
    std::optional<std::string> localTime;           ///< CIM text form, held still; else the clock
    std::vector<std::vector<std::uint8_t>> smbios;  ///< raw structures, string set included
};

struct Notice {
    std::string plainText;
    std::string markupText;  ///< empty when there is none
};

using LogConsumer = std::function<void(NQORTQR20::ILogger::ETQRLogSeverity, std::string_view)>;

void SetMachineFacts(MachineFacts facts);
const MachineFacts& GetMachineFacts();

/// Everybody who reads the log, each with the highest severity number that it wants.
/// Returns an identity for RemoveLogConsumer.
int AddLogConsumer(NQORTQR20::ILogger::ETQRLogSeverity upTo, LogConsumer consumer);
void RemoveLogConsumer(int identity);

/// The notices handed over since the last call.
std::vector<Notice> TakeNotices();

/// Why a plug-in could not be loaded; what() is one line for the user.
struct PluginError : std::runtime_error {
    using std::runtime_error::runtime_error;
};

struct PluginInfo {
    std::string name;
    std::string version;
    std::string interfaceVersion;
};

/// A loaded and initialised plug-in; de-initialised and unloaded with the object.
class Plugin {
public:
    /// Throws PluginError when the file cannot be loaded, does not register, or fails to
    /// initialise.
    explicit Plugin(const std::filesystem::path& file);
    ~Plugin();
    Plugin(const Plugin&) = delete;
    Plugin& operator=(const Plugin&) = delete;

    PluginInfo Info() const;
    /// One collection of the named classes; blocks until the pass is over.
    NQORTQR20::TTQRStatusCode Collect(const std::vector<std::string>& classNames,
                                      InstanceSink& sink);
    /// An exported function of the plug-in by name, null when it has none.
    void* Symbol(const char* name) const;
    /// Runs an exported function `int name(TCPluginCallbacks*, fdriIOHandle*)` with an output of
    /// its own; empty when the plug-in exports none of that name.
    std::optional<int> RunExporter(const char* name, InstanceSink& sink);

private:
    struct Impl;
    std::unique_ptr<Impl> impl_;
};

/// An output handle over a sink, and a context over a plug-in folder, for callers that use the
/// plug-in's operations without loading it (tests, tools). Both are released with the object.
class OutputHandle {
public:
    explicit OutputHandle(InstanceSink& sink);
    ~OutputHandle();
    OutputHandle(const OutputHandle&) = delete;
    OutputHandle& operator=(const OutputHandle&) = delete;
    NQORTQR20::fdriIOHandle* get() const { return handle_.get(); }

private:
    std::unique_ptr<NQORTQR20::fdriIOHandle> handle_;
};

class PluginContext {
public:
    explicit PluginContext(const std::filesystem::path& pluginFolder);
    ~PluginContext();
    PluginContext(const PluginContext&) = delete;
    PluginContext& operator=(const PluginContext&) = delete;
    NQORTQR20::TCPluginCallbacks* get() const { return context_.get(); }

private:
    std::unique_ptr<NQORTQR20::TCPluginCallbacks> context_;
};

}  // namespace tqrhost
