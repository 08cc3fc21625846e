#pragma once

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <optional>
#include <span>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include "host/core/internal.h"

namespace NQORTQR20 {

/// What a BMC took exception to when a session was to be opened.
enum class Refusal { kOther, kUser, kPassword, kKey, kPrivilege, kSessionNumbers };

/// Why a source could not be opened; what() is one line for the user that says what to do.
struct SourceError : std::runtime_error {
    explicit SourceError(const std::string& line, Refusal what = Refusal::kOther)
        : std::runtime_error(line), refusal(what) {}
    Refusal refusal;  ///< of the first source
};
/// The sources are named wrongly: a kind that is not known, kinds that do not go together, or
/// options that no BMC could be opened with.
struct SourceUsageError : SourceError {
    using SourceError::SourceError;
};

/// Longest HOST or HOST:PORT of a `lan:` source: a name of the DNS (RFC 1035, 2.3.4) and more.
constexpr std::size_t kMaxPlace = 300;

/// What the user said about access, as it was said.
struct SourceOptions {
    std::optional<std::string> user;
    std::function<std::string()> password;          ///< asked for only where a password is needed
    std::function<std::vector<std::uint8_t>()> kg;  ///< the BMC's own key; empty: it has none
    std::optional<int> cipherSuite;                 ///< by number; else the best that the BMC has
    std::string privilege = "admin";                ///< user, operator, admin
    std::vector<std::string> workarounds;           ///< names of KnownWorkarounds()
    std::optional<int> window;                      ///< requests outstanding
    double timeoutSeconds = 20;  ///< how long one request may go unanswered in all
};

struct WorkaroundInfo {
    std::string_view name;
    std::string_view description;
};
/// The known deviations of BMCs that a user may ask to put up with.
std::span<const WorkaroundInfo> KnownWorkarounds();

/// What a BMC does otherwise than the standard has it, and is put up with.
struct Deviations {
    /// The user name padded to 16 bytes; but for the code of RAKP 3, which leaves out the bit for
    /// the lookup by name too. The code of RAKP 4 by the integrity algorithm.
    bool paddedUserName = false;
    /// The code of RAKP 2 is a byte longer than its algorithm makes it, and the payload's length
    /// with it or alone.
    bool longRakp2Code = false;
    /// Open Session does not say which privilege it grants.
    bool openSessionPrivilege = false;
    /// Checksums of answers are wrong.
    bool checksums = false;
    /// The channel's authentication capabilities are answered wrongly.
    bool capabilities = false;
    /// Session sequence numbers of answers mean nothing.
    bool sessionNumbers = false;
};

/// The same, checked and in the terms of the standard.
struct Access {
    std::string user;                       ///< at most 16 bytes
    std::function<std::string()> password;  ///< null: none is to be had
    std::function<std::vector<std::uint8_t>()> kg;
    std::vector<int> cipherSuites;  ///< to be tried, the best first; nothing else is ever used
    std::uint8_t privilege = 4;     ///< IPMI 2.0, table 22-19: 2 user, 3 operator, 4 administrator
    Deviations deviations{};
    std::optional<unsigned> window;            ///< fixed; adaptive when left out
    std::chrono::milliseconds timeout{20000};  ///< how long one request may go unanswered in all
};

/// Throws SourceUsageError, one line for the user, for what no BMC could be opened with. The
/// password and the key are not asked for.
Access ParseAccess(const SourceOptions& options);

}  // namespace NQORTQR20
