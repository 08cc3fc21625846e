#include "host/spdriver/freeipmi_context.h"

#include <algorithm>
#include <array>
#include <cstddef>
#include <cstdint>
#include <iterator>
#include <vector>

#include "base/text.h"
#include "tqr/log.h"

namespace tqrhost {
namespace {

struct Advice {
    int error;
    const char* text;
};

constexpr Advice kAdvice[] = {
    {IPMI_ERR_PERMISSION, "access is not allowed; run as root or ask for access to the device"},
    {IPMI_ERR_USERNAME_INVALID, "the BMC does not know the user name; check --user"},
    {IPMI_ERR_PASSWORD_INVALID, "wrong password, or wrong user name; check both"},
    {IPMI_ERR_PASSWORD_VERIFICATION_TIMEOUT,
     "the BMC fell silent when the password was checked, so it is probably wrong; check user "
     "name and password"},
    {IPMI_ERR_K_G_INVALID,
     "the BMC has another key of its own (Kg) than was given, or than none; check --kg-file"},
    {IPMI_ERR_PRIVILEGE_LEVEL_INSUFFICIENT,
     "the user's privilege does not suffice; ask for more with --privilege, or use another user"},
    {IPMI_ERR_PRIVILEGE_LEVEL_CANNOT_BE_OBTAINED,
     "the user may not have the privilege asked for; try --privilege operator, or --workaround "
     "opensesspriv"},
    {IPMI_ERR_AUTHENTICATION_TYPE_UNAVAILABLE,
     "the BMC refuses this way to log in; try --workaround authcap"},
    {IPMI_ERR_CIPHER_SUITE_ID_UNAVAILABLE,
     "the BMC does not offer the cipher suite; choose one that it has with --cipher-suite"},
    {IPMI_ERR_IPMI_2_0_UNAVAILABLE,
     "the BMC does not speak IPMI 2.0; enable it there, or try --workaround authcap"},
    {IPMI_ERR_CONNECTION_TIMEOUT,
     "no answer; check the address and the port, and that IPMI over LAN is enabled"},
    {IPMI_ERR_SESSION_TIMEOUT,
     "no answer; check the address and the port, and that IPMI over LAN is enabled"},
    {IPMI_ERR_DEVICE_NOT_SUPPORTED, "the driver is not supported on this machine"},
    {IPMI_ERR_DEVICE_NOT_FOUND,
     "there is no IPMI device; load the kernel modules ipmi_si and ipmi_devintf"},
    {IPMI_ERR_DRIVER_BUSY, "the IPMI driver is busy; try again"},
    {IPMI_ERR_DRIVER_TIMEOUT, "the IPMI driver does not answer; reset the BMC or try again"},
    {IPMI_ERR_MESSAGE_TIMEOUT, "the BMC does not answer in time; try again"},
    {IPMI_ERR_BAD_RMCPPLUS_STATUS_CODE,
     "the BMC refuses the session; try another --cipher-suite or a --workaround"},
    {IPMI_ERR_BMC_BUSY, "the BMC is busy or has no free session; try again"},
    {IPMI_ERR_OUT_OF_MEMORY, "out of memory"},
    {IPMI_ERR_HOSTNAME_INVALID, "the host name does not resolve; check it"},
    {IPMI_ERR_IPMI_ERROR, "the BMC breaks the protocol; try a --workaround such as opensesspriv"},
    {IPMI_ERR_SYSTEM_ERROR, "the system reports an error; check the network or the device"},
};

/// Longer than any answer of IPMI; FreeIPMI cuts what does not fit.
constexpr std::size_t kMostResponse = 4096;

}  // namespace

FreeIpmiContext MakeContext() {
    FreeIpmiContext context(ipmi_ctx_create());
    if (!context) throw SourceError("out of memory");
    return context;
}

std::string ErrorAdvice(const std::string& place, int error) {
    const auto advice = std::find_if(std::begin(kAdvice), std::end(kAdvice),
                                     [&](const Advice& a) { return a.error == error; });
    if (advice != std::end(kAdvice)) return place + ": " + advice->text;
    return place + ": the BMC cannot be reached (FreeIPMI error " + std::to_string(error) + ", " +
           ipmi_ctx_strerror(error) + "); check how it is reached";
}

void LogNoResponse(const RequestFrame& request, const char* why) {
    using NQORTQR20::ILogger;
    if (!NQORTQR20::fdrLogEnabled(ILogger::kNotice)) return;
    NQORTQR20::fdrWriteLog(ILogger::kNotice,
                           ipmisel::Format("No response to NetFn 0x%02x command 0x%02x: %s.",
                                           request.netFn(), request.command(), why)
                               .c_str());
}

std::optional<Response> FreeIpmiTransport::Exchange(const RequestFrame& request) {
    // FreeIPMI's raw form: command and data there; command, completion code and data back.
    std::vector<std::uint8_t> out{request.command()};
    out.insert(out.end(), request.data().begin(), request.data().end());
    std::array<std::uint8_t, kMostResponse> in{};
    const int length = ipmi_cmd_raw(context_.get(), request.lun(), request.netFn(), out.data(),
                                    static_cast<unsigned>(out.size()), in.data(),
                                    static_cast<unsigned>(in.size()));
    if (length < 2) {
        LogNoResponse(request,
                      length < 0 ? ipmi_ctx_errormsg(context_.get()) : "the answer is too short");
        return std::nullopt;
    }
    return Response(in.begin() + 1, in.begin() + length);
}

}  // namespace tqrhost
