#include <algorithm>
#include <charconv>
#include <chrono>
#include <cstdint>
#include <iterator>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "host/spdriver/freeipmi_context.h"
#include "host/spdriver/kinds.h"
#include "host/spdriver/lan_session.h"

namespace tqrhost {
namespace {

constexpr WorkaroundInfo kWorkarounds[] = {
    {"authcap", "log in although the BMC misreports which ways to log in it has"},
    {"intel20", "older Intel boards: user names padded, passwords cut for MD5"},
    {"supermicro20", "older Supermicro boards: authentication codes of the wrong length"},
    {"sun20", "older Sun machines: keys of the wrong length or wrongly made"},
    {"opensesspriv", "the BMC does not say in Open Session which privilege it grants"},
    {"integritycheckvalue", "the BMC sends a check value with cipher suite 0, which has none"},
    {"nochecksumcheck", "take answers whose checksum is wrong"},
};
// FreeIPMI's flags, in the order of the names.
constexpr unsigned kWorkaroundFlags[] = {
    IPMI_WORKAROUND_FLAGS_OUTOFBAND_2_0_AUTHENTICATION_CAPABILITIES,
    IPMI_WORKAROUND_FLAGS_OUTOFBAND_2_0_INTEL_2_0_SESSION,
    IPMI_WORKAROUND_FLAGS_OUTOFBAND_2_0_SUPERMICRO_2_0_SESSION,
    IPMI_WORKAROUND_FLAGS_OUTOFBAND_2_0_SUN_2_0_SESSION,
    IPMI_WORKAROUND_FLAGS_OUTOFBAND_2_0_OPEN_SESSION_PRIVILEGE,
    IPMI_WORKAROUND_FLAGS_OUTOFBAND_2_0_NON_EMPTY_INTEGRITY_CHECK_VALUE,
    IPMI_WORKAROUND_FLAGS_OUTOFBAND_2_0_NO_CHECKSUM_CHECK,
};
// What our own session puts up with; for the others FreeIPMI's context is taken, one request at a
// time.
constexpr unsigned kOwnWorkarounds =
    IPMI_WORKAROUND_FLAGS_OUTOFBAND_2_0_AUTHENTICATION_CAPABILITIES |
    IPMI_WORKAROUND_FLAGS_OUTOFBAND_2_0_OPEN_SESSION_PRIVILEGE;
static_assert(std::size(kWorkarounds) == std::size(kWorkaroundFlags));

struct Privilege {
    std::string_view name;
    std::uint8_t level;
};
constexpr Privilege kPrivileges[] = {{"user", IPMI_PRIVILEGE_LEVEL_USER},
                                     {"operator", IPMI_PRIVILEGE_LEVEL_OPERATOR},
                                     {"admin", IPMI_PRIVILEGE_LEVEL_ADMIN}};

constexpr unsigned kRetransmissionMilliseconds = 1000;
// IPMI 2.0, table 22-20: 17 is RAKP-HMAC-SHA256 with AES, 3 RAKP-HMAC-SHA1 with AES.
constexpr int kBestSuite = 17;
constexpr int kCommonSuite = 3;

template <typename Table>
auto FindByName(const Table& table, std::string_view name, const char* what) {
    const auto found = std::find_if(std::begin(table), std::end(table),
                                    [&](const auto& row) { return row.name == name; });
    if (found != std::end(table)) return found;
    std::string names;
    for (const auto& row : table) names += (names.empty() ? "" : ", ") + std::string(row.name);
    throw SourceError("there is no " + std::string(what) + " \"" + std::string(name) +
                      "\"; use one of " + names);
}

unsigned WorkaroundFlags(const std::vector<std::string>& names) {
    unsigned flags = IPMI_WORKAROUND_FLAGS_DEFAULT;
    for (const std::string& name : names) {
        const auto* row = FindByName(kWorkarounds, name, "workaround");
        flags |= kWorkaroundFlags[row - std::begin(kWorkarounds)];
    }
    return flags;
}

[[noreturn]] void RefusePlace(const std::string& place, const char* reason) {
    throw SourceError("lan:" + place + ": " + reason +
                      "; write lan:HOST, lan:HOST:PORT or lan:[ADDRESS]:PORT");
}

struct Address {
    std::string host;  ///< without brackets
    std::string port;
    /// As FreeIPMI takes it: "HOST:PORT" or "[ADDRESS]:PORT".
    std::string Text() const {
        return (host.find(':') == std::string::npos ? host : "[" + host + "]") + ":" + port;
    }
};

Address ParseAddress(const std::string& place) {
    constexpr std::string_view kPort = "623";  // RMCP, IPMI 2.0, clause 13.1.2
    std::string host = place;
    std::string port(kPort);
    const auto bracket = place.rfind(']');
    const auto colon = place.find(':', bracket == std::string::npos ? 0 : bracket);
    if (place.front() == '[' && bracket == std::string::npos) {
        RefusePlace(place, "the address has no closing bracket");
    }
    if (colon != std::string::npos) {
        host = place.substr(0, colon);
        port = place.substr(colon + 1);
        if (port.find(':') != std::string::npos) {
            RefusePlace(place, "an IPv6 address stands in brackets");
        }
    }
    if (host.empty() || host == "[]") RefusePlace(place, "no host is named");
    if (host.back() != ']' && bracket != std::string::npos) {
        RefusePlace(place, "something stands between address and port");
    }
    unsigned number = 0;
    const auto [end, error] = std::from_chars(port.data(), port.data() + port.size(), number);
    if (error != std::errc() || end != port.data() + port.size() || number < 1 || number > 0xFFFF) {
        RefusePlace(place, "the port is no number from 1 to 65535");
    }
    if (host.front() == '[') host = host.substr(1, host.size() - 2);
    return {host, std::to_string(number)};
}

/// Everything that opens a session but the cipher suite.
struct Session {
    std::string place;
    Address address;
    std::optional<std::string> user;
    std::optional<std::string> password;
    std::vector<std::uint8_t> kg;
    std::uint8_t privilege;
    unsigned timeoutMilliseconds;
    unsigned workarounds;
    std::vector<int> suites;  ///< to be tried, the best first
    std::optional<int> window;
};

std::vector<int> Suites(const SourceOptions& options) {
    if (!options.cipherSuite) return {kBestSuite, kCommonSuite};
    if (!IPMI_CIPHER_SUITE_ID_SUPPORTED(*options.cipherSuite)) {
        throw SourceError("cipher suite " + std::to_string(*options.cipherSuite) +
                          " is not supported; use 17, 3, or another that the BMC has");
    }
    return {*options.cipherSuite};
}

Session MakeSession(const std::string& place, const SourceOptions& options) {
    Session session{place,
                    ParseAddress(place),
                    options.user,
                    std::nullopt,
                    {},
                    FindByName(kPrivileges, options.privilege, "privilege")->level,
                    0,
                    WorkaroundFlags(options.workarounds),
                    Suites(options),
                    options.window};
    if (session.user && session.user->size() > IPMI_MAX_USER_NAME_LENGTH) {
        throw SourceError("the user name is longer than the 16 bytes of IPMI; check --user");
    }
    if (options.password) session.password = options.password();
    if (session.password && session.password->size() > IPMI_2_0_MAX_PASSWORD_LENGTH) {
        throw SourceError("the password is longer than the 20 bytes of IPMI 2.0; check it");
    }
    if (options.kg) session.kg = options.kg();
    constexpr double kLeast = 0.1;
    constexpr double kMost = 24 * 60 * 60;
    session.timeoutMilliseconds =
        static_cast<unsigned>(std::clamp(options.timeoutSeconds, kLeast, kMost) * 1000);
    return session;
}

/// An open session, or the error number of FreeIPMI.
int TryOpen(const Session& session, int suite, FreeIpmiContext* opened) {
    auto context = MakeContext();
    const auto text = [](const std::optional<std::string>& value) {
        return value ? value->c_str() : nullptr;
    };
    // FreeIPMI wants the retransmission time below the session's.
    const unsigned retransmission =
        std::min(kRetransmissionMilliseconds, session.timeoutMilliseconds / 2);
    if (ipmi_ctx_open_outofband_2_0(context.get(), session.address.Text().c_str(),
                                    text(session.user), text(session.password),
                                    session.kg.empty() ? nullptr : session.kg.data(),
                                    static_cast<unsigned>(session.kg.size()), session.privilege,
                                    static_cast<std::uint8_t>(suite), session.timeoutMilliseconds,
                                    retransmission, session.workarounds, IPMI_FLAGS_DEFAULT) < 0) {
        return ipmi_ctx_errnum(context.get());
    }
    *opened = std::move(context);
    return IPMI_ERR_SUCCESS;
}

/// Whether an error says that the BMC does not have the suite: by a status of its own, by another
/// status, or by an answer cut short, as some refuse it. All of them come before the password is
/// used. Nothing else is tried a second time: a BMC may lock a user out after a few wrong
/// passwords.
bool SuiteIsMissing(int error) {
    return error == IPMI_ERR_CIPHER_SUITE_ID_UNAVAILABLE ||
           error == IPMI_ERR_BAD_RMCPPLUS_STATUS_CODE || error == IPMI_ERR_IPMI_ERROR;
}

/// A session of FreeIPMI's own: one request at a time.
std::unique_ptr<Transport> OpenWithFreeIpmi(const Session& session) {
    FreeIpmiContext context;
    int error = IPMI_ERR_SUCCESS;
    for (const int suite : session.suites) {
        error = TryOpen(session, suite, &context);
        if (!SuiteIsMissing(error)) break;
    }
    if (error != IPMI_ERR_SUCCESS) throw SourceError(ErrorAdvice("lan:" + session.place, error));
    return std::make_unique<FreeIpmiTransport>(std::move(context));
}

/// Our own session, which keeps several requests outstanding.
class LanTransport : public Transport {
public:
    explicit LanTransport(std::unique_ptr<LanSession> session) : session_(std::move(session)) {}
    std::optional<Response> Exchange(const RequestFrame& request) override {
        auto response = session_->Exchange(Ask::Of(request));
        if (!response) LogNoResponse(request, "the BMC does not answer");
        return response;
    }

private:
    std::unique_ptr<LanSession> session_;
};

bool NeedsFreeIpmi(const Session& session) {
    return (session.workarounds & ~kOwnWorkarounds) != 0 ||
           std::any_of(session.suites.begin(), session.suites.end(),
                       [](int suite) { return rmcpplus::FindCipherSuite(suite) == nullptr; });
}

std::unique_ptr<LanSession> BeginOwn(const Session& session) {
    LanSessionOptions own;
    own.credentials.user = session.user.value_or("");
    own.credentials.password = session.password.value_or("");
    own.credentials.kg = session.kg;
    own.credentials.privilege = session.privilege;
    own.credentials.openSessionPrivilege =
        (session.workarounds & IPMI_WORKAROUND_FLAGS_OUTOFBAND_2_0_OPEN_SESSION_PRIVILEGE) != 0;
    own.skipCapabilities = (session.workarounds &
                            IPMI_WORKAROUND_FLAGS_OUTOFBAND_2_0_AUTHENTICATION_CAPABILITIES) != 0;
    own.cipherSuites = session.suites;
    if (session.window) own.window = static_cast<unsigned>(*session.window);
    own.timeout = std::chrono::milliseconds(session.timeoutMilliseconds);
    return std::make_unique<LanSession>("lan:" + session.place, session.address.host,
                                        session.address.port, std::move(own));
}

}  // namespace

std::span<const WorkaroundInfo> KnownWorkarounds() { return kWorkarounds; }

Source OpenLan(const std::vector<std::string>& places, const SourceOptions& options) {
    Source source;
    source.facts.ipmiLan = true;
    std::vector<LanSession*> opening;
    for (const std::string& place : places) {
        const Session session = MakeSession(place, options);
        if (NeedsFreeIpmi(session)) {
            source.nodes.push_back({"lan:" + place, nullptr,
                                    std::make_unique<SerialPipeline>(OpenWithFreeIpmi(session))});
            continue;
        }
        std::unique_ptr<LanSession> own = BeginOwn(session);
        opening.push_back(own.get());
        source.nodes.push_back(
            {"lan:" + place, nullptr,
             std::make_unique<SerialPipeline>(std::make_unique<LanTransport>(std::move(own)))});
    }
    LanSession::OpenAll(opening);
    return source;
}

}  // namespace tqrhost
