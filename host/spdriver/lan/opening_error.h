#pragma once

#include <string>

#include "host/spdriver/access.h"

namespace tqrhost {

/// Why a session with a BMC cannot be opened.
enum class OpeningError {
    kNameUnknown,
    kNameServerSilent,
    kOutOfDescriptors,
    kNetwork,
    kPortClosed,
    kNoAnswer,
    kNoIpmi20,
    kNoCipherSuite,
    kUserUnknown,
    kPasswordWrong,
    kSilentAtPassword,
    kKgWrong,
    kPrivilegeRefused,
    kBusy,
    kRefused,
    kProtocolBroken,
    kSessionNumbers,
    kStopped,
};

/// What of the credentials is not what the BMC has, if it is that.
NQORTQR20::Refusal RefusalOf(OpeningError error);

/// One line for the user: what failed at `place` and what to do.
std::string Advice(const std::string& place, OpeningError error);

}  // namespace tqrhost
