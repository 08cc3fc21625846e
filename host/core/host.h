#pragma once

#include <cstdint>
#include <filesystem>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include "host/core/sink.h"
#include "tqr/classes.h"
#include "tqr/datetime.h"
#include "tqr/log.h"
#include "tqr/plugin.h"

// What the collector sees of the host: the facts of the machine, the log, the plug-in. The state
// behind it is the process's own; nothing here is for more than one thread.

namespace NQORTQR20 {

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

using LogConsumer = std::function<void(ILogger::ETQRLogSeverity, std::string_view)>;

void SetMachineFacts(MachineFacts facts);
/// Now by this machine's clock, whatever the facts of the collection say.
TCIMDateTime SystemTime();
/// The local time of those facts, from now on.
void SetLocalTime(std::string localTime);
const MachineFacts& GetMachineFacts();

/// What the user has set for the plug-ins: fdrGetOption and fdrGetSystemName answer from it.
struct PluginSettings {
    std::map<std::string, std::string, std::less<>> options;
    std::vector<std::string> systemNames;  ///< by node
};
void SetPluginSettings(PluginSettings settings);

/// Everybody who reads the log, each with the highest severity number that it wants.
/// Returns an identity for RemoveLogConsumer.
int AddLogConsumer(ILogger::ETQRLogSeverity upTo, LogConsumer consumer);
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

/// A class as its plug-in declares it (tqr/classes.h).
struct PropertyInfo {
    std::string name;
    fdrPropertyType type;
    std::string description;
};
struct ClassInfo {
    std::string name;
    std::string description;
    std::uint32_t marks;
    std::string nodeProperty;  ///< empty: instances belong to no node
    std::string exporter;      ///< empty: getData collects the class
    std::vector<PropertyInfo> properties;

    bool Is(fdrClassMark mark) const { return (marks & mark) != 0; }
};

/// A loaded and initialised plug-in; de-initialised and unloaded with the object.
class Plugin {
public:
    /// Throws PluginError when the file cannot be loaded, does not register, fails to initialise,
    /// needs another host interface, or declares its classes wrongly.
    explicit Plugin(const std::filesystem::path& file);
    ~Plugin();
    Plugin(const Plugin&) = delete;
    Plugin& operator=(const Plugin&) = delete;

    PluginInfo Info() const;
    /// In the order of its table; none when it exports no table.
    const std::vector<ClassInfo>& Classes() const;
    /// Throws PluginError when a file that the plug-in needs is missing, unreadable or too large.
    void CheckNeededFiles() const;
    /// Why the plug-in refuses a value of an option (fdrCheckOption); empty when it does not.
    std::string ProblemOfOption(const std::string& name, const std::string& value) const;
    /// One collection of the named classes; blocks until the pass is over.
    TTQRStatusCode Collect(const std::vector<std::string>& classNames, InstanceSink& sink);
    /// An exported function of the plug-in by name, null when it has none.
    void* Symbol(const char* name) const;
    /// Runs an exported function `int name(TCPluginCallbacks*, fdriIOHandle*)` with an output of
    /// its own; empty when the plug-in exports none of that name.
    std::optional<int> RunExporter(const char* name, InstanceSink& sink);
    /// Its file stays in memory when the object is gone, and is loaded again at no cost.
    void KeepLoaded() const;

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
    fdriIOHandle* get() const { return handle_.get(); }

private:
    std::unique_ptr<fdriIOHandle> handle_;
};

class PluginContext {
public:
    explicit PluginContext(const std::filesystem::path& pluginFolder);
    ~PluginContext();
    PluginContext(const PluginContext&) = delete;
    PluginContext& operator=(const PluginContext&) = delete;
    TCPluginCallbacks* get() const { return context_.get(); }

private:
    std::unique_ptr<TCPluginCallbacks> context_;
};

}  // namespace NQORTQR20
