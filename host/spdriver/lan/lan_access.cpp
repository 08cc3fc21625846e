#include "host/spdriver/lan/lan_access.h"

#include <algorithm>
#include <charconv>
#include <iterator>
#include <string_view>

namespace tqrhost {
namespace {

struct Workaround {
    WorkaroundInfo info;
    void (*apply)(LanSessionOptions* session);
};

constexpr std::string_view kGoneWorkaround = "integritycheckvalue";
constexpr Workaround kWorkarounds[] = {
    {{"authcap", "log in although the BMC misreports which ways to log in it has"},
     [](LanSessionOptions* s) { s->skipCapabilities = true; }},
    {{"intel20", "older Intel boards: user names padded to their full length"},
     [](LanSessionOptions* s) {
         s->credentials.deviations.paddedUserName = true;
         s->credentials.deviations.openSessionPrivilege = true;
     }},
    {{"supermicro20", "older Supermicro boards: authentication codes of the wrong length"},
     [](LanSessionOptions* s) { s->credentials.deviations.longRakp2Code = true; }},
    {{"sun20", "older Sun machines: authentication codes of the wrong length, and opensesspriv"},
     [](LanSessionOptions* s) {
         s->credentials.deviations.longRakp2Code = true;
         s->credentials.deviations.openSessionPrivilege = true;
     }},
    {{"opensesspriv", "the BMC does not say in Open Session which privilege it grants"},
     [](LanSessionOptions* s) { s->credentials.deviations.openSessionPrivilege = true; }},
    {{"nochecksumcheck", "take answers whose checksum is wrong"},
     [](LanSessionOptions* s) { s->credentials.deviations.checksums = true; }},
    {{"sessionnumbers", "take answers whose session numbers stand still, are 0 or start over"},
     [](LanSessionOptions* s) { s->anySessionNumber = true; }},
};

struct Privilege {
    std::string_view name;
    std::uint8_t level;
};
constexpr Privilege kPrivileges[] = {{"user", 2}, {"operator", 3}, {"admin", 4}};  // table 22-19

constexpr std::string_view kRmcpPort = "623";  // IPMI 2.0, clause 13.1.2
// IPMI 2.0, table 22-20: 17 is RAKP-HMAC-SHA256 with AES, 3 RAKP-HMAC-SHA1 with AES.
constexpr int kBestSuite = 17;
constexpr int kCommonSuite = 3;
constexpr std::size_t kMaxUserName = 16;
constexpr std::size_t kMaxPassword = 20;

template <typename Table, typename NameOf>
auto FindByName(const Table& table, NameOf nameOf, std::string_view name, const char* what) {
    const auto found = std::find_if(std::begin(table), std::end(table),
                                    [&](const auto& row) { return nameOf(row) == name; });
    if (found != std::end(table)) return found;
    std::string names;
    for (const auto& row : table) names += (names.empty() ? "" : ", ") + std::string(nameOf(row));
    throw SourceUsageError("there is no " + std::string(what) + " \"" + std::string(name) +
                           "\"; use one of " + names);
}

[[noreturn]] void RefusePlace(const std::string& place, const char* reason) {
    throw SourceUsageError("lan:" + place + ": " + reason +
                           "; write lan:HOST, lan:HOST:PORT or lan:[ADDRESS]:PORT");
}

void ParsePlace(const std::string& place, LanAccess* access) {
    std::string host = place;
    std::string port(kRmcpPort);
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
    access->host = host.front() == '[' ? host.substr(1, host.size() - 2) : host;
    access->port = std::to_string(number);
}

std::vector<int> CipherSuites(const std::optional<int>& asked) {
    if (!asked) return {kBestSuite, kCommonSuite};
    if (*asked == 0) {
        throw SourceUsageError(
            "cipher suite 0 has no password and no protection and is never used; use 17 or 3");
    }
    if (rmcpplus::FindCipherSuite(*asked) == nullptr) {
        throw SourceUsageError("cipher suite " + std::to_string(*asked) +
                               " is not supported; use 17 or 3, or 16, 15, 2 or 1 if the BMC has "
                               "no other");
    }
    return {*asked};
}

void ApplyWorkaround(const std::string& name, LanSessionOptions* session) {
    if (name == kGoneWorkaround) {
        throw SourceUsageError("the workaround " + name +
                               " was for cipher suite 0, which is never used; leave it out");
    }
    FindByName(
        kWorkarounds, [](const Workaround& row) { return row.info.name; }, name, "workaround")
        ->apply(session);
}

}  // namespace

std::span<const WorkaroundInfo> LanWorkarounds() {
    static const auto infos = [] {
        std::vector<WorkaroundInfo> all;
        for (const Workaround& workaround : kWorkarounds) all.push_back(workaround.info);
        return all;
    }();
    return infos;
}

LanAccess ParseLanAccess(const std::string& place, const SourceOptions& options) {
    LanAccess access;
    ParsePlace(place, &access);
    LanSessionOptions& session = access.session;
    session.credentials.privilege = FindByName(
                                        kPrivileges, [](const Privilege& row) { return row.name; },
                                        options.privilege, "privilege")
                                        ->level;
    for (const std::string& name : options.workarounds) ApplyWorkaround(name, &session);
    session.cipherSuites = CipherSuites(options.cipherSuite);
    session.credentials.user = options.user.value_or("");
    if (session.credentials.user.size() > kMaxUserName) {
        throw SourceUsageError("the user name is longer than the 16 bytes of IPMI; check --user");
    }
    if (options.password) session.credentials.password = options.password();
    if (session.credentials.password.size() > kMaxPassword) {
        throw SourceUsageError("the password is longer than the 20 bytes of IPMI 2.0; check it");
    }
    if (options.kg) session.credentials.kg = options.kg();
    if (options.window) session.window = static_cast<unsigned>(*options.window);
    constexpr double kLeast = 0.1;
    constexpr double kMost = 24 * 60 * 60;
    session.timeout = std::chrono::milliseconds(
        static_cast<int>(std::clamp(options.timeoutSeconds, kLeast, kMost) * 1000));
    return access;
}

}  // namespace tqrhost
