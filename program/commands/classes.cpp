#include "program/commands/classes.h"

#include <CLI/CLI.hpp>
#include <algorithm>
#include <memory>
#include <string>
#include <vector>

#include "program/commands/failure.h"
#include "program/commands/plugins.h"
#include "program/reports/class_schema.h"
#include "program/reports/output_file.h"
#include "program/reports/terminal_text.h"

namespace ipmisel {
namespace {

struct ClassesOptions {
    std::vector<std::string> plugins;
    bool schema = false;
};

std::string ClassList(const std::vector<NQORTQR20::ClassInfo>& classes) {
    std::size_t width = 0;
    for (const NQORTQR20::ClassInfo& info : classes) width = std::max(width, info.name.size());
    std::string list;
    for (const NQORTQR20::ClassInfo& info : classes) {
        list += Fit(info.name, width) + "  " + info.description + "\n";
    }
    return list;
}

void Print(const std::string& text) {
    OutputFile output(std::nullopt);
    output.Write(text);
    output.Commit();
}

}  // namespace

Command AddClassesCommand(CLI::App* program) {
    CLI::App* const command =
        program->add_subcommand("classes", "List the classes that can be collected");
    const auto options = std::make_shared<ClassesOptions>();
    AddPluginOption(command, &options->plugins);
    command->add_flag("--schema", options->schema, "The JSON Schema of their instances instead");
    return {command, [options] {
                const auto classes = LoadPlugins(options->plugins)->Classes();
                Print(options->schema ? ClassSchema(classes) : ClassList(classes));
                return kExitCollected;
            }};
}

}  // namespace ipmisel
