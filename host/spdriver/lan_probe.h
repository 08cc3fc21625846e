#pragma once

#include <chrono>
#include <optional>
#include <string>
#include <vector>

namespace NQORTQR20 {

/// What is to be learnt of a BMC on the network without a session.
struct LanProbe {
    std::vector<std::string> addresses;  ///< in numbers, in the order in which they are tried
    std::string problem;                 ///< one line for the user: why nothing could be asked
    bool refused = false;                ///< nobody listens on the port
    /// How long the answer to a presence ping took (ASF 2.0, 3.2.4); empty when none came.
    std::optional<std::chrono::microseconds> pong;
    struct Capabilities {
        bool ipmi20 = false;
        bool hasKey = false;  ///< the BMC has a key of its own (Kg)
        std::chrono::microseconds took{};
    };
    std::optional<Capabilities> capabilities;  ///< empty when no answer came
    std::vector<int> cipherSuites;  ///< as the BMC lists them; none when it does not tell
};

/// Asks HOST, HOST:PORT, [ADDRESS] or [ADDRESS]:PORT, at most `patience` for each answer. Throws
/// SourceUsageError for a place that is none, SourceError without cryptography.
LanProbe ProbeLan(const std::string& place, std::chrono::milliseconds patience);

}  // namespace NQORTQR20
