#include "tqr/status.h"

namespace NQORTQR20 {

// The texts stand in the middle of log lines, hence no full stop.
const char* TTQRStatusCode::TranslateStatusCode() const {
    switch (code) {
        case kStatusOk:
            return "Success";
        case kStatusFailed:
            return "The operation failed or its arguments were refused";
        case kStatusNoMemory:
            return "Out of memory";
        case kStatusBadTime:
            return "The time is no calendar time";
        default:
            return "Unknown status code";
    }
}

const char* TTQRException::what() const noexcept { return status_.TranslateStatusCode(); }

}  // namespace NQORTQR20
