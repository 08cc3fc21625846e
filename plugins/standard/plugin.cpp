#include "plugins/standard/plugin.h"

#include <algorithm>
#include <memory>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "plugins/standard/classes.h"
#include "plugins/standard/node_pass.h"
#include "plugins/standard/output.h"
#include "tqr/log.h"
#include "tqr/splibrary.h"

namespace standard {

namespace {

using NQORTQR20::kStatusFailed;
using NQORTQR20::kStatusOk;
using NQORTQR20::TCPluginCallbacks;
using NQORTQR20::TTQRStatusCode;

constexpr const char* kSeverities = "severities";

std::string Line(const SeverityRules::Problem& problem) {
    return "line " + std::to_string(problem.line) + ": " + problem.text;
}

// The user's own severities, as the host hands them on.
bool ReadRules(TCPluginCallbacks* context, SeverityRules* rules) {
    const char* text = nullptr;
    NQORTQR20::fdrGetOption(context, kSeverities, &text);
    if (text == nullptr) return true;
    const auto problem = SeverityRules::Parse(text, rules);
    if (!problem) return true;
    const std::string line = std::string(kSeverities) + ", " + Line(*problem);
    NQORTQR20::fdrWriteLog(NQORTQR20::ILogger::kError, line.c_str());
    return false;
}

std::vector<std::unique_ptr<NodePass>> Nodes(TCPluginCallbacks* context,
                                             const SeverityRules& rules) {
    std::vector<std::unique_ptr<NodePass>> nodes;
    const int count = NQORTQR20::SPLibrary::GetNumberBMCNode();
    const NQORTQR20::TPluginManagerProvider* provider = nullptr;
    NQORTQR20::fdrGetHandle(context, &provider);
    // The tables of the machine do not say which of several nodes a part belongs to.
    const SmbiosFacts smbios = count == 1 ? ReadSmbios(provider) : SmbiosFacts();
    for (int i = 0; i < count; ++i) {
        NQORTQR20::SPLibrary* const library = NQORTQR20::SPLibrary::GetSplibraryInstance(i);
        if (library == nullptr) continue;
        const char* name = nullptr;
        NQORTQR20::fdrGetSystemName(context, i, &name);
        nodes.push_back(std::make_unique<NodePass>(
            static_cast<unsigned>(i) + 1, name == nullptr ? "" : name, *library, rules, smbios));
    }
    return nodes;
}

TTQRStatusCode Collect(TCPluginCallbacks* context, Output output,
                       std::span<const char* const> classNames) {
    SeverityRules rules;
    if (!ReadRules(context, &rules)) return {kStatusFailed};
    const std::vector<std::unique_ptr<NodePass>> nodes = Nodes(context, rules);
    std::vector<const ClassEntry*> entries;
    for (const std::string_view name : classNames) {
        if (const ClassEntry* const entry = FindClass(name)) entries.push_back(entry);
    }
    for (const ClassEntry* const entry : entries) {
        if (entry->announce == nullptr) continue;
        for (const std::unique_ptr<NodePass>& node : nodes) entry->announce(*node);
    }
    for (const ClassEntry* const entry : entries) {
        for (const std::unique_ptr<NodePass>& node : nodes) entry->write(*node, output);
    }
    return {output.failed() ? kStatusFailed : kStatusOk};
}

}  // namespace

TTQRStatusCode Initialise(TCPluginCallbacks* /*context*/) { return {kStatusOk}; }

TTQRStatusCode Deinitialise(TCPluginCallbacks* /*context*/) { return {kStatusOk}; }

TTQRStatusCode GetData(TCPluginCallbacks* context, NQORTQR20::fdriIOHandle* output,
                       const char** classNames, int classCount) {
    try {
        const std::size_t count =
            classNames == nullptr || classCount <= 0 ? 0 : static_cast<std::size_t>(classCount);
        return Collect(context, Output(output), std::span<const char* const>(classNames, count));
    } catch (...) {
        return {kStatusFailed};
    }
}

TTQRStatusCode CheckOption(const char* name, const char* value, std::span<char> problem) {
    try {
        SeverityRules rules;
        if (std::string_view(name) != kSeverities) return {kStatusOk};
        const auto found = SeverityRules::Parse(value, &rules);
        if (!found) return {kStatusOk};
        const std::string line = Line(*found).substr(0, problem.size() - 1);
        std::copy(line.begin(), line.end(), problem.begin());
        problem[line.size()] = '\0';
    } catch (...) {
    }
    return {kStatusFailed};
}

NQORTQR20::fdrPluginInfo GetInfo(TCPluginCallbacks* /*context*/) {
    return {.name = "IPMISTANDARD",
            .version = "1.0",
            .interfaceVersion = "1.1",  // typed properties, options, names of systems
            .reserved1 = 0,
            .reserved2 = 0};
}

}  // namespace standard
