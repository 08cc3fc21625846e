#pragma once

#include <string>

namespace tqrhost {

/// Where a BMC is on the network.
struct LanPlace {
    std::string host;  ///< without brackets
    std::string port;  ///< a number from 1 to 65535
};

/// `place` is HOST, HOST:PORT, [ADDRESS] or [ADDRESS]:PORT. Throws SourceUsageError, with one line
/// for the user, for another.
LanPlace ParseLanPlace(const std::string& place);

}  // namespace tqrhost
