#pragma once

#include <optional>
#include <string>
#include <vector>

#include "host/spdriver/transport.h"

namespace ipmisel {

/// Exit statuses of the program.
constexpr int kExitCollected = 0;
constexpr int kExitPassFailed = 1;  ///< the plug-in ended the pass with another status than 0
constexpr int kExitUsage = 2;       ///< wrong usage, or an output that cannot be written
constexpr int kExitNoSource = 3;    ///< the source could not be opened, or there is no BMC
constexpr int kExitPart = 4;        ///< collected in part

/// What the user asked for.
struct Options {
    enum class Command { kCollect, kClasses };
    Command command = Command::kCollect;
    std::vector<std::string> sources;  ///< never empty
    std::vector<std::string> classes;  ///< empty: the default ones
    std::string format = "table";
    std::optional<std::string> output;  ///< empty: standard output
    std::optional<std::string> record;
    int logLevel = 1;
    std::optional<std::string> logFile;
    std::optional<std::string> plugin;
    std::optional<std::string> passwordFile;
    tqrhost::SourceOptions source;
    std::optional<double> deadlineSeconds;
};

/// Parses the command line. When it is wrong, or only help was wanted, says so and gives the exit
/// status in *exitStatus.
std::optional<Options> ParseOptions(int argc, char** argv, int* exitStatus);

}  // namespace ipmisel
