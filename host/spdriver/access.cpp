#include "host/spdriver/access.h"

#include <algorithm>
#include <iterator>

#include "base/text.h"
#include "host/spdriver/lan/cipher_suites.h"

namespace NQORTQR20 {
namespace {

struct Workaround {
    WorkaroundInfo info;
    void (*apply)(Deviations* deviations);
};

constexpr std::string_view kGoneWorkaround = "integritycheckvalue";
constexpr Workaround kWorkarounds[] = {
    {{"authcap", "log in although the BMC misreports which ways to log in it has"},
     [](Deviations* d) { d->capabilities = true; }},
    {{"intel20", "older Intel boards: user names padded to their full length"},
     [](Deviations* d) { d->paddedUserName = d->openSessionPrivilege = true; }},
    {{"supermicro20", "older Supermicro boards: authentication codes of the wrong length"},
     [](Deviations* d) { d->longRakp2Code = true; }},
    {{"sun20", "older Sun machines: authentication codes of the wrong length, and opensesspriv"},
     [](Deviations* d) { d->longRakp2Code = d->openSessionPrivilege = true; }},
    {{"opensesspriv", "the BMC does not say in Open Session which privilege it grants"},
     [](Deviations* d) { d->openSessionPrivilege = true; }},
    {{"nochecksumcheck", "take answers whose checksum is wrong"},
     [](Deviations* d) { d->checksums = true; }},
    {{"sessionnumbers", "take answers whose session numbers stand still, are 0 or start over"},
     [](Deviations* d) { d->sessionNumbers = true; }},
};

struct Privilege {
    std::string_view name;
    std::uint8_t level;
};
constexpr Privilege kPrivileges[] = {{"user", 2}, {"operator", 3}, {"admin", 4}};  // table 22-19

// IPMI 2.0, table 22-20: 17 is RAKP-HMAC-SHA256 with AES, 3 RAKP-HMAC-SHA1 with AES.
constexpr int kBestSuite = 17;
constexpr int kCommonSuite = 3;
constexpr std::size_t kMaxUserName = 16;
constexpr int kMaxWindow = 32;
constexpr double kLeastTimeout = 0.001;
constexpr double kMaxTimeout = 24 * 60 * 60;

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

std::vector<int> CipherSuites(const std::optional<int>& asked) {
    if (!asked) return {kBestSuite, kCommonSuite};
    if (*asked == 0) {
        throw SourceUsageError(
            "cipher suite 0 has no password and no protection and is never used; use 17 or 3");
    }
    if (tqrhost::rmcpplus::FindCipherSuite(*asked) == nullptr) {
        throw SourceUsageError("cipher suite " + std::to_string(*asked) +
                               " is not supported; use 17 or 3, or 16, 15, 2 or 1 if the BMC has "
                               "no other");
    }
    return {*asked};
}

void ApplyWorkaround(const std::string& name, Deviations* deviations) {
    if (name == kGoneWorkaround) {
        throw SourceUsageError("the workaround " + name +
                               " was for cipher suite 0, which is never used; leave it out");
    }
    FindByName(
        kWorkarounds, [](const Workaround& row) { return row.info.name; }, name, "workaround")
        ->apply(deviations);
}

}  // namespace

std::span<const WorkaroundInfo> KnownWorkarounds() {
    static const auto infos = [] {
        std::vector<WorkaroundInfo> all;
        for (const Workaround& workaround : kWorkarounds) all.push_back(workaround.info);
        return all;
    }();
    return infos;
}

Access ParseAccess(const SourceOptions& options) {
    Access access;
    access.user = options.user.value_or("");
    if (access.user.size() > kMaxUserName) {
        throw SourceUsageError("the user name is longer than the 16 bytes of IPMI; check --user");
    }
    access.privilege = FindByName(
                           kPrivileges, [](const Privilege& row) { return row.name; },
                           options.privilege, "privilege")
                           ->level;
    for (const std::string& name : options.workarounds) {
        ApplyWorkaround(name, &access.deviations);
    }
    access.cipherSuites = CipherSuites(options.cipherSuite);
    if (options.window) {
        if (*options.window < 1 || *options.window > kMaxWindow) {
            throw SourceUsageError(
                ipmisel::Format("a window of %d requests is not possible; give "
                                "1 to %d with --window",
                                *options.window, kMaxWindow));
        }
        access.window = static_cast<unsigned>(*options.window);
    }
    // Written so that "nan" fails too.
    if (!(options.timeoutSeconds > 0 && options.timeoutSeconds <= kMaxTimeout)) {
        throw SourceUsageError(
            ipmisel::Format("a timeout of %g seconds is not possible; give more "
                            "than 0, at most %.0f, with --timeout",
                            options.timeoutSeconds, kMaxTimeout));
    }
    access.timeout = std::chrono::milliseconds(
        static_cast<int>(std::max(options.timeoutSeconds, kLeastTimeout) * 1000));
    access.password = options.password;
    access.kg = options.kg;
    return access;
}

}  // namespace NQORTQR20
