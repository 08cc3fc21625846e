#include "plugins/ipmisel/requests/diff_time.h"

#include <cstdint>
#include <optional>
#include <string>

#include "ipmi/command.h"
#include "plugins/ipmisel/records/calendar_time.h"
#include "plugins/ipmisel/requests/ipmi_message.h"
#include "tqr/status.h"

using namespace ipmisel;
using NQORTQR20::TCIMDateTime;

namespace {

constexpr IPMICommand kGetSelTime{
    .command = ipmi::kGetSelTime.number,
    .sendFailure = "Failure in sending command to obtain system event log device time.",
    .errorPrefix = "IPMI error in obtaining system event log device time: "};

/// Get SEL Time (IPMI 2.0, 31.10).
class RequestSELTime : public IPMIMessage {
public:
    using IPMIMessage::IPMIMessage;
    /// Seconds since 1970-01-01; empty when it has logged why there are none.
    std::optional<std::int32_t> Read() {
        if (Exchange(kGetSelTime) != kOk) return std::nullopt;
        return static_cast<std::int32_t>(Reply().U32());
    }
};

}  // namespace

unsigned GetDiffTime(NQORTQR20::TCPluginCallbacks*, TCIMDateTime* difference, bool* bmcNotBehind,
                     NQORTQR20::SPLibrary* library) {
    TraceScope trace("GetDiffTime");
    if (library == nullptr) {
        return trace.Fail("Could not allocate memory for SPLibrary in DiffTime.");
    }
    const auto raw = RequestSELTime(library).Read();
    if (!raw) return trace.Fail();
    try {
        const TCIMDateTime osTime = NQORTQR20::TOSSpecific::GetLocalTime();
        WriteLog(kTrace, "OSTime  = " + osTime.ToString());
        WriteLog(kTrace, "BMCTime raw = " + std::to_string(*raw));
        const TCIMDateTime bmcTime =
            CalendarTime(*raw, osTime.GetUTCOffset(), "Could not convert RawBMCTime.");
        WriteLog(kTrace, "BMCTime = " + bmcTime.ToString());
        *difference = bmcTime - osTime;
        *bmcNotBehind = !(bmcTime < osTime);
        WriteLog(kTrace, "DiffTime = " + difference->ToString());
    } catch (const NQORTQR20::TTQRException& error) {
        WriteLog(kNotice, std::string("Unable to obtain set DiffTime due to caught exception ") +
                              error.what());
        return kFailed;
    }
    return kOk;
}
