#include "host/spdriver/lan/opening_error.h"

#include <array>
#include <cstddef>
#include <string_view>

namespace tqrhost {
namespace {

struct Row {
    OpeningError error;
    std::string_view advice;
};

constexpr std::array kAdvice = std::to_array<Row>({
    {OpeningError::kNameUnknown, "the host name does not resolve; check it"},
    {OpeningError::kNameServerSilent,
     "the name server does not answer; give the address in numbers, or check /etc/resolv.conf"},
    {OpeningError::kOutOfDescriptors,
     "no file descriptor is left for it; raise the limit (ulimit -n) or collect from fewer BMCs at "
     "a time"},
    {OpeningError::kNetwork, "the system reports an error; check the network"},
    {OpeningError::kPortClosed,
     "nobody listens there, or a firewall refuses; check the address and the port, and that IPMI "
     "over LAN is enabled"},
    {OpeningError::kNoAnswer,
     "no answer; check the address and the port, the firewalls on the way, and that IPMI over LAN "
     "is enabled"},
    {OpeningError::kNoIpmi20,
     "the BMC does not speak IPMI 2.0; enable it there, or try --workaround authcap"},
    {OpeningError::kNoCipherSuite,
     "the BMC does not offer the cipher suite; choose one that it has with --cipher-suite"},
    {OpeningError::kUserUnknown, "the BMC does not know the user name; check --user"},
    {OpeningError::kPasswordWrong, "wrong password, or wrong user name; check both"},
    {OpeningError::kSilentAtPassword,
     "the BMC fell silent when the password was checked, so it is probably wrong; check user name "
     "and password"},
    {OpeningError::kKgWrong,
     "the BMC has another key of its own (Kg) than was given, or than none; check --kg-file"},
    {OpeningError::kPrivilegeRefused,
     "the user may not have the privilege asked for; try --privilege operator, or --workaround "
     "opensesspriv"},
    {OpeningError::kBusy,
     "the BMC is busy or has no free session; end the sessions of others, or try again in a "
     "minute"},
    {OpeningError::kRefused,
     "the BMC refuses the session; try another --cipher-suite or a --workaround"},
    {OpeningError::kProtocolBroken,
     "the BMC breaks the protocol; try a --workaround such as opensesspriv"},
    {OpeningError::kSessionNumbers,
     "the BMC numbers its answers wrongly; try --workaround sessionnumbers"},
    {OpeningError::kStopped, "the collection was ended before a session was open"},
});

constexpr bool IsInOrder() {
    for (std::size_t i = 0; i < kAdvice.size(); ++i) {
        if (static_cast<std::size_t>(kAdvice[i].error) != i) return false;
    }
    return kAdvice.size() == static_cast<std::size_t>(OpeningError::kStopped) + 1;
}
static_assert(IsInOrder(), "a row for each error, in their order");

}  // namespace

NQORTQR20::Refusal RefusalOf(OpeningError error) {
    using NQORTQR20::Refusal;
    switch (error) {
        case OpeningError::kUserUnknown:
            return Refusal::kUser;
        case OpeningError::kPasswordWrong:
        case OpeningError::kSilentAtPassword:
            return Refusal::kPassword;
        case OpeningError::kKgWrong:
            return Refusal::kKey;
        case OpeningError::kPrivilegeRefused:
            return Refusal::kPrivilege;
        case OpeningError::kSessionNumbers:
            return Refusal::kSessionNumbers;
        default:
            return Refusal::kOther;
    }
}

std::string Advice(const std::string& place, OpeningError error) {
    return place + ": " + std::string(kAdvice[static_cast<std::size_t>(error)].advice);
}

}  // namespace tqrhost
