#include "host/core/plugin_set.h"

#include <algorithm>
#include <map>
#include <system_error>

namespace NQORTQR20 {
namespace {

namespace fs = std::filesystem;

/// Its classes stand before all others, as they always have.
constexpr std::string_view kFirstPlugin = "libipmisel.pi";

std::vector<fs::path> FilesOf(const fs::path& folder) {
    std::vector<fs::path> files;
    std::error_code error;
    for (fs::directory_iterator entry(folder, error), end; !error && entry != end;
         entry.increment(error)) {
        if (entry->path().extension() == ".pi") files.push_back(entry->path());
    }
    if (error) {
        throw PluginError("cannot read the plug-in folder " + folder.string() + ": " +
                          error.message() + "; reinstall the program");
    }
    if (files.empty()) {
        throw PluginError("there is no plug-in in " + folder.string() + "; reinstall the program");
    }
    std::sort(files.begin(), files.end(), [](const fs::path& a, const fs::path& b) {
        const bool aFirst = a.filename() == kFirstPlugin;
        const bool bFirst = b.filename() == kFirstPlugin;
        return aFirst != bFirst ? aFirst : a.filename() < b.filename();
    });
    return files;
}

}  // namespace

PluginSet::PluginSet(const fs::path& folder, const std::vector<fs::path>& further) {
    std::vector<fs::path> files = FilesOf(folder);
    files.insert(files.end(), further.begin(), further.end());
    std::vector<fs::path> loaded;
    std::map<std::string, fs::path, std::less<>> owners;
    for (const fs::path& file : files) {
        std::error_code error;
        const fs::path real = fs::canonical(file, error);
        if (!error && std::find(loaded.begin(), loaded.end(), real) != loaded.end()) continue;
        plugins_.push_back(std::make_unique<Plugin>(file));
        loaded.push_back(real);
        for (const ClassInfo& info : plugins_.back()->Classes()) {
            const auto [owner, isNew] = owners.emplace(info.name, file);
            if (isNew) continue;
            throw PluginError("the class " + info.name + " is in two plug-ins, " +
                              owner->second.string() + " and " + file.string() +
                              "; take one of them away");
        }
    }
}

PluginSet::~PluginSet() {
    while (!plugins_.empty()) plugins_.pop_back();
}

std::vector<ClassInfo> PluginSet::Classes() const {
    std::vector<ClassInfo> classes;
    for (const auto& plugin : plugins_) {
        classes.insert(classes.end(), plugin->Classes().begin(), plugin->Classes().end());
    }
    return classes;
}

std::size_t PluginSet::OwnerOf(std::string_view className) const {
    const auto owner = std::find_if(plugins_.begin(), plugins_.end(), [&](const auto& plugin) {
        const auto& classes = plugin->Classes();
        return std::any_of(classes.begin(), classes.end(),
                           [&](const ClassInfo& info) { return info.name == className; });
    });
    return static_cast<std::size_t>(owner - plugins_.begin());
}

const ClassInfo* PluginSet::FindClass(std::string_view name) const {
    const std::size_t owner = OwnerOf(name);
    if (owner == plugins_.size()) return nullptr;
    const auto& classes = plugins_[owner]->Classes();
    return &*std::find_if(classes.begin(), classes.end(),
                          [&](const ClassInfo& info) { return info.name == name; });
}

std::vector<std::string> PluginSet::DefaultClasses() const {
    std::vector<std::string> names;
    for (const ClassInfo& info : Classes()) {
        if (info.Is(kByDefault)) names.push_back(info.name);
    }
    return names;
}

void PluginSet::CheckNeededFiles(const std::vector<std::string>& classNames) const {
    for (std::size_t i = 0; i < plugins_.size(); ++i) {
        const bool wanted =
            std::any_of(classNames.begin(), classNames.end(),
                        [&](const std::string& name) { return OwnerOf(name) == i; });
        if (wanted) plugins_[i]->CheckNeededFiles();
    }
}

CollectionPlan::CollectionPlan(PluginSet& plugins, const std::vector<std::string>& classNames)
    : plugins_(plugins) {
    for (const auto& plugin : plugins.Plugins()) {
        statuses_.push_back({plugin->Info(), {kStatusOk}});
    }
    bool passEnds = true;
    for (const std::string& name : classNames) {
        const ClassInfo* const info = plugins.FindClass(name);
        if (info == nullptr) continue;
        const std::size_t owner = plugins.OwnerOf(name);
        if (!info->exporter.empty()) {
            exporters_.push_back({owner, info->exporter});
            continue;
        }
        if (passEnds || passes_.back().plugin != owner) passes_.push_back({owner, {}});
        passes_.back().classNames.push_back(name);
        passEnds = info->Is(kWrittenAtEnd);
    }
}

void CollectionPlan::RunPasses(InstanceSink& sink, bool (*goesOn)()) {
    for (const Pass& pass : passes_) {
        if (!goesOn()) return;
        Note(pass.plugin, plugins_.Plugins()[pass.plugin]->Collect(pass.classNames, sink));
    }
}

void CollectionPlan::RunExporters(InstanceSink& sink) {
    for (const Exporter& exporter : exporters_) {
        Plugin& plugin = *plugins_.Plugins()[exporter.plugin];
        Note(exporter.plugin,
             {plugin.RunExporter(exporter.function.c_str(), sink).value_or(kStatusFailed)});
    }
}

TTQRStatusCode CollectionPlan::Status() const {
    const auto failed = std::find_if(statuses_.begin(), statuses_.end(), [](const auto& each) {
        return each.status.code != kStatusOk;
    });
    return failed == statuses_.end() ? TTQRStatusCode{kStatusOk} : failed->status;
}

void CollectionPlan::Note(std::size_t plugin, TTQRStatusCode status) {
    TTQRStatusCode& kept = statuses_[plugin].status;
    if (kept.code == kStatusOk) kept = status;
}

}  // namespace NQORTQR20
