#include "program/commands/classes.h"

#include <CLI/CLI.hpp>
#include <algorithm>
#include <memory>
#include <string>
#include <vector>

#include "program/commands/failure.h"
#include "program/commands/plugins.h"
#include "program/reports/output_file.h"
#include "program/reports/terminal_text.h"

namespace ipmisel {
namespace {

int ListClasses(const std::vector<tqrhost::ClassInfo>& classes) {
    std::size_t width = 0;
    for (const tqrhost::ClassInfo& info : classes) width = std::max(width, info.name.size());
    OutputFile output(std::nullopt);
    for (const tqrhost::ClassInfo& info : classes) {
        output.Write(Fit(info.name, width) + "  " + info.description + "\n");
    }
    output.Commit();
    return kExitCollected;
}

}  // namespace

Command AddClassesCommand(CLI::App* program) {
    CLI::App* const command =
        program->add_subcommand("classes", "List the classes that can be collected");
    const auto plugins = std::make_shared<std::vector<std::string>>();
    AddPluginOption(command, plugins.get());
    return {command, [plugins] { return ListClasses(LoadPlugins(*plugins)->Classes()); }};
}

}  // namespace ipmisel
