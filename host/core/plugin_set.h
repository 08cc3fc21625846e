#pragma once

#include <filesystem>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "host/core/host.h"

namespace NQORTQR20 {

/// How a plug-in's part of a collection ended.
struct PluginStatus {
    PluginInfo plugin;
    TTQRStatusCode status{};
};

/// The plug-ins of a process, loaded and initialised, and the classes that they have. Operations
/// throw PluginError.
class PluginSet {
public:
    /// Loads every *.pi of the folder in the order of their names, libipmisel.pi first, then the
    /// further files; one that is loaded already is passed over. Refuses a folder without a plug-in
    /// and a class that two plug-ins have.
    explicit PluginSet(const std::filesystem::path& folder,
                       const std::vector<std::filesystem::path>& further = {});
    ~PluginSet();
    PluginSet(const PluginSet&) = delete;
    PluginSet& operator=(const PluginSet&) = delete;

    const std::vector<std::unique_ptr<Plugin>>& Plugins() const { return plugins_; }
    /// The classes of all, plug-in by plug-in in the order of their tables.
    std::vector<ClassInfo> Classes() const;
    /// Null for a class that no plug-in has. Lives as long as the set.
    const ClassInfo* FindClass(std::string_view name) const;
    /// Those that are marked so, in the order of Classes().
    std::vector<std::string> DefaultClasses() const;
    /// The files that the plug-ins of these classes need.
    void CheckNeededFiles(const std::vector<std::string>& classNames) const;

private:
    std::size_t OwnerOf(std::string_view className) const;
    friend class CollectionPlan;
    std::vector<std::unique_ptr<Plugin>> plugins_;
};

/// The calls that collect some classes, in their order: a pass of a plug-in for each run of classes
/// of one plug-in (a class that is written at the end of its pass ends the run), the exporters
/// after all passes. A class that no plug-in has is passed over.
class CollectionPlan {
public:
    CollectionPlan(PluginSet& plugins, const std::vector<std::string>& classNames);

    /// Runs the passes for as long as `goesOn` answers true.
    void RunPasses(InstanceSink& sink, bool (*goesOn)());
    void RunExporters(InstanceSink& sink);
    /// One for each plug-in of the set; the status is that of its first call that did not end well.
    const std::vector<PluginStatus>& Statuses() const { return statuses_; }
    /// The first of them that is not 0.
    TTQRStatusCode Status() const;

private:
    struct Pass {
        std::size_t plugin;
        std::vector<std::string> classNames;
    };
    struct Exporter {
        std::size_t plugin;
        std::string function;
    };
    void Note(std::size_t plugin, TTQRStatusCode status);

    PluginSet& plugins_;
    std::vector<Pass> passes_;
    std::vector<Exporter> exporters_;
    std::vector<PluginStatus> statuses_;
};

}  // namespace NQORTQR20
