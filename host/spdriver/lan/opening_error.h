#pragma once

#include <string>

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

/// User, password or key are not what the BMC has.
constexpr bool IsOfCredentials(OpeningError error) {
    return error == OpeningError::kUserUnknown || error == OpeningError::kPasswordWrong ||
           error == OpeningError::kSilentAtPassword || error == OpeningError::kKgWrong;
}

/// One line for the user: what failed at `place` and what to do.
std::string Advice(const std::string& place, OpeningError error);

}  // namespace tqrhost
