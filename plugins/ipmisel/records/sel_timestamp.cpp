#include <string>

#include "base/text.h"
#include "plugins/ipmisel/log.h"
#include "plugins/ipmisel/records/calendar_time.h"
#include "plugins/ipmisel/records/sel_entry.h"
#include "plugins/ipmisel/records/sel_texts.h"
#include "tqr/datetime.h"
#include "tqr/status.h"

using NQORTQR20::TCIMDateTime;
using NQORTQR20::TCPluginCallbacks;

namespace ipmisel {
namespace {

/// Time stamps up to here are traced as counted from the initialisation of the BMC. Compatibility:
/// the standard counts 0x20000000 among them (IPMI 2.0, 37.1), the trace line does not
/// (Timestamp.IsTheCalendarTimeWithTheLocalOffset).
constexpr std::int64_t kLastBeforeInitialisation = 0x1FFFFFFF;

}  // namespace

std::string TimestampText(std::int64_t seconds, short utcOffset) {
    try {
        std::string text =
            CalendarTime(seconds, utcOffset, "Could not convert CurrentTimeStamp.").ToString();
        if (LogEnabled(kTrace)) {
            // Compatibility: nothing is added to a time before initialisation either
            // (Timestamp.IsTheCalendarTimeWithTheLocalOffset).
            WriteLog(kTrace, seconds <= kLastBeforeInitialisation ? "Adding 0 hours to Timestamp."
                                                                  : "No addition to Timestamp.");
            WriteLog(kTrace, "RawTimeStamp = " + std::to_string(seconds) +
                                 "\n         PreTimeStamp = " + text);
            WriteLog(kTrace, "Timestamp = " + text);
        }
        return text;
    } catch (const NQORTQR20::TTQRException& error) {
        if (error.Status().code != NQORTQR20::kStatusBadTime) throw;
        WriteLog(kNotice, std::string("Unable to obtain Timestamp due to caught exception ") +
                              error.what() + ". Using default Timestamp (1/2/1970).");
        return kNoTime;
    }
}

}  // namespace ipmisel

unsigned IPMISELEntry::CopyTimestamp(TCPluginCallbacks* /*context*/, char* out, unsigned int len,
                                     IPMIMapping* /*mapping*/, TCIMDateTime /*difference*/,
                                     bool /*bmcNotBehind*/, bool /*synchronise*/) const {
    const ipmisel::TraceScope trace("IPMISELEntry::GetTimestamp()", ipmisel::TraceScope::kFunction);
    const short utcOffset = NQORTQR20::TOSSpecific::GetLocalTime().GetUTCOffset();
    const std::uint32_t raw = bytes_[3] | std::uint32_t{bytes_[4]} << 8 |
                              std::uint32_t{bytes_[5]} << 16 | std::uint32_t{bytes_[6]} << 24;
    // Signed: the standard's time runs out of 31 bits in 2038.
    ipmisel::CopyOut(out, len, ipmisel::TimestampText(static_cast<std::int32_t>(raw), utcOffset));
    return ipmisel::kOk;
}

unsigned IPMISELEntry::CopyOSBootTimestamp(TCPluginCallbacks* context, char* out, unsigned int len,
                                           IPMIMapping* mapping, TCIMDateTime difference,
                                           bool bmcNotBehind, bool synchronise) const {
    return CopyTimestamp(context, out, len, mapping, difference, bmcNotBehind, synchronise);
}
