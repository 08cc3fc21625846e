#pragma once

#include <span>
#include <string>

#include "host/spdriver/lan/lan_session.h"
#include "host/spdriver/source.h"

namespace tqrhost {

/// One BMC over the network and how it is opened.
struct LanAccess {
    std::string host;  ///< without brackets
    std::string port;  ///< a number from 1 to 65535
    LanSessionOptions session;
};

/// `place` is HOST, HOST:PORT, [ADDRESS] or [ADDRESS]:PORT. Throws SourceUsageError, with one line
/// for the user, for what no BMC could be opened with; the password is asked for only after that.
LanAccess ParseLanAccess(const std::string& place, const SourceOptions& options);

/// The deviations that ParseLanAccess knows by name.
std::span<const WorkaroundInfo> LanWorkarounds();

}  // namespace tqrhost
