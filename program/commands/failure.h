#pragma once

#include <stdexcept>
#include <string>

namespace ipmisel {

/// Exit statuses of the program.
constexpr int kExitCollected = 0;
constexpr int kExitPassFailed = 1;  ///< the plug-in ended the pass with another status than 0
constexpr int kExitUsage = 2;       ///< wrong usage, or a file that it names cannot be used
constexpr int kExitNoSource = 3;    ///< the source could not be opened, or there is no BMC
constexpr int kExitPart = 4;        ///< collected in part

/// Ends the program; what() is one line for the user: what failed and what to do about it.
struct Failure : std::runtime_error {
    Failure(int status, const std::string& line) : std::runtime_error(line), exitStatus(status) {}
    int exitStatus;
};

}  // namespace ipmisel
