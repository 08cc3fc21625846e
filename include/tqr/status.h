#pragma once

#include <cstdint>
#include <exception>

namespace NQORTQR20 {

/// The status value that every entry point and every host operation returns: one 32-bit code.
struct TTQRStatusCode {
    std::int32_t code;

    /// The code in words. Never null; the text is static. Unknown codes get a common text.
    const char* TranslateStatusCode() const;
};
static_assert(sizeof(TTQRStatusCode) == 4);

constexpr std::int32_t kStatusOk = 0;
/// A host operation refused its arguments or could not do its work; a plug-in section failed;
/// a plug-in that is not started.
constexpr std::int32_t kStatusFailed = 3;
constexpr std::int32_t kStatusNoMemory = 4;  ///< an object of a pass could not be created
constexpr std::int32_t kStatusBadTime = 21;  ///< a time that is no calendar time

/// The host's exception: a status code; what() is its text.
class TTQRException : public std::exception {
public:
    explicit TTQRException(TTQRStatusCode status) : status_(status) {}
    const char* what() const noexcept override;
    TTQRStatusCode Status() const { return status_; }

private:
    TTQRStatusCode status_;
};

}  // namespace NQORTQR20
