#pragma once

#include <optional>
#include <string>
#include <vector>

#include "host/spdriver/source.h"
#include "tqr/log.h"

namespace ipmisel {

/// What the user asked for.
struct Options {
    enum class Command { kCollect, kClasses };
    Command command = Command::kCollect;
    std::vector<std::string> sources;  ///< never empty
    std::vector<std::string> classes;  ///< empty: the default ones
    std::string format = "table";
    std::optional<std::string> output;  ///< empty: standard output
    std::optional<std::string> record;
    NQORTQR20::ILogger::ETQRLogSeverity logLevel = NQORTQR20::ILogger::kWarning;
    std::optional<std::string> logFile;
    std::vector<std::string> plugins;  ///< further plug-in files
    std::optional<std::string> passwordFile;
    std::optional<std::string> kgFile;
    tqrhost::SourceOptions source;
    std::optional<double> deadlineSeconds;
};

/// Parses the command line. Empty when only help or the version was wanted and is printed; the exit
/// status is then in *exitStatus. Throws Failure when the command line is wrong.
std::optional<Options> ParseOptions(int argc, char** argv, int* exitStatus);

}  // namespace ipmisel
