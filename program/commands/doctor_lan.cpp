#include "program/commands/doctor_lan.h"

#include <algorithm>
#include <array>
#include <chrono>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "base/text.h"
#include "host/spdriver/lan_probe.h"
#include "host/spdriver/source.h"
#include "ipmi/command.h"
#include "program/commands/password.h"

namespace ipmisel {
namespace {

using Clock = std::chrono::steady_clock;
using NQORTQR20::Refusal;
using NQORTQR20::RequestPipeline;
using NQORTQR20::Response;
using NQORTQR20::SourceError;

std::string Joined(const std::vector<int>& numbers) {
    std::string text;
    for (const int number : numbers) text += (text.empty() ? "" : ", ") + std::to_string(number);
    return text;
}

constexpr std::chrono::milliseconds kPatience{3000};
constexpr std::string_view kLan = "lan:";
constexpr std::string_view kAnyNumbers = "sessionnumbers";  ///< the workaround
constexpr double kAttemptSeconds = 3;  ///< for one of several ways to open a session

/// A session that was opened, or why it was not.
struct Attempt {
    std::optional<DoctorController> controller;
    std::string problem;
    Refusal refusal = Refusal::kOther;

    /// It is open, and the BMC answers in it.
    bool Works() {
        if (!controller) return false;
        if (controller->Exchange(ipmi::GetDeviceId())) return true;
        if (controller->Pipeline()->WronglyNumbered() > 0) refusal = Refusal::kSessionNumbers;
        return false;
    }
};

Attempt TryOpening(const AccessOptions& access) {
    NQORTQR20::SourceOptions options = access.source;
    options.password = [&] { return *access.password; };
    options.kg = [&] { return *access.kg; };
    Attempt attempt;
    try {
        attempt.controller.emplace(NQORTQR20::OpenSources(access.Sources(), options));
    } catch (const NQORTQR20::SourceUsageError& error) {
        throw Failure(kExitUsage, error.what());
    } catch (const SourceError& error) {
        attempt.problem = error.what();
        attempt.refusal = error.refusal;
    }
    return attempt;
}

AccessOptions Quickly(AccessOptions access) {
    access.source.timeoutSeconds = std::min(access.source.timeoutSeconds, kAttemptSeconds);
    return access;
}

bool IsOfCredentials(Refusal refusal) {
    return refusal == Refusal::kUser || refusal == Refusal::kPassword || refusal == Refusal::kKey;
}

/// Name of a workaround with which a session that was refused is opened after all. A log-in that
/// fails counts at the BMC, which may lock the user out: where user or password were refused, only
/// those are tried that look like it.
std::optional<std::string> FindWorkaround(const AccessOptions& access, Refusal refused) {
    constexpr std::array<std::string_view, 2> kLikeWrongPassword = {"intel20", "supermicro20"};
    constexpr int kMaxFailedLogIns = 3;
    int failedLogIns = IsOfCredentials(refused) ? 1 : 0;
    for (const auto& workaround : NQORTQR20::KnownWorkarounds()) {
        const bool looksLikeIt = std::find(kLikeWrongPassword.begin(), kLikeWrongPassword.end(),
                                           workaround.name) != kLikeWrongPassword.end();
        if (IsOfCredentials(refused) && !looksLikeIt) continue;
        if (refused == Refusal::kSessionNumbers && workaround.name != kAnyNumbers) continue;
        AccessOptions with = Quickly(access);
        with.source.workarounds.emplace_back(workaround.name);
        Attempt attempt = TryOpening(with);
        if (attempt.Works()) return std::string(workaround.name);
        if (IsOfCredentials(attempt.refusal) && ++failedLogIns == kMaxFailedLogIns) break;
    }
    return std::nullopt;
}

/// Which of user and password is wrong, by what the BMC says of a user that it cannot have.
void TellUserFromPassword(const AccessOptions& access, Steps* steps) {
    constexpr std::string_view kWhat = "user or password";
    AccessOptions with = Quickly(access);
    with.source.user = "no-such-user-23";
    if (TryOpening(with).refusal == Refusal::kUser) {
        steps->Note(kWhat,
                    "the password: the BMC knows the user, it says so of one that it does not "
                    "have");
    } else {
        steps->Note(kWhat, "the BMC does not tell which, not even of a user that it does not have");
    }
}

/// Opens with a lower privilege where the user may not have the one that was asked for, and leaves
/// it in `access`.
Attempt TryLowerPrivileges(AccessOptions* access, Steps* steps) {
    for (const char* const level : {"operator", "user"}) {
        AccessOptions with = Quickly(*access);
        with.source.privilege = level;
        Attempt attempt = TryOpening(with);
        if (!attempt.Works()) continue;
        steps->Bad("privilege", "a session opens with --privilege " + std::string(level) +
                                    "; give that, or give the user the right to " +
                                    access->source.privilege + " at the BMC");
        access->source.privilege = level;
        return attempt;
    }
    return {};
}

/// Opens with a workaround, and leaves it in `access`.
Attempt TryWorkarounds(AccessOptions* access, Refusal refused, Steps* steps) {
    const auto workaround = FindWorkaround(*access, refused);
    if (!workaround) {
        if (refused == Refusal::kPassword) TellUserFromPassword(*access, steps);
        return {};
    }
    steps->Bad("known deviation", "it works with --workaround " + *workaround +
                                      "; give that, or look for newer firmware of the BMC");
    access->source.workarounds.push_back(*workaround);
    return TryOpening(*access);
}

/// Some BMCs number their first answers as they should and begin again after some; those are
/// dropped as ones that were heard before, until the session is opened anew. Where it is so, opens
/// one that takes them, and leaves the workaround in `access`.
void TrySessionNumbers(AccessOptions* access, Attempt* session, Steps* steps) {
    constexpr unsigned kAnswers = 256;  // they may be counted in a byte
    constexpr unsigned kCertain = 2;    // of a good line, one may be an old packet
    const auto& given = access->source.workarounds;
    if (std::find(given.begin(), given.end(), kAnyNumbers) != given.end()) return;
    const RequestPipeline* const pipeline = session->controller->Pipeline();
    const auto until = Clock::now() + kPatience;
    unsigned answers = 0;
    while (answers < kAnswers && Clock::now() < until && pipeline->WronglyNumbered() < kCertain) {
        if (!session->controller->Exchange(ipmi::GetDeviceId()))
            return;  // as the commands will tell
        ++answers;
    }
    if (pipeline->WronglyNumbered() < kCertain) {
        steps->Good("session numbers", Format("as they should be in %u answers", answers));
        return;
    }
    steps->Bad(
        "known deviation",
        Format("the BMC numbers its answers wrongly, here after %u, and each time the session has "
               "to be opened anew; give --workaround %s, or look for newer firmware of the BMC",
               answers, std::string(kAnyNumbers).c_str()));
    access->source.workarounds.emplace_back(kAnyNumbers);
    Attempt with = TryOpening(*access);
    if (with.Works()) *session = std::move(with);
}

/// Each suite that can be used with each privilege, in sessions of their own.
void TrySuites(const AccessOptions& access, const std::vector<int>& listed, Steps* steps) {
    constexpr std::array kSupported = {17, 3, 16, 15, 2, 1};
    bool good = access.source.cipherSuite.has_value();
    for (const int suite : kSupported) {
        const bool isListed = std::find(listed.begin(), listed.end(), suite) != listed.end();
        if (!listed.empty() && !isListed) continue;
        if (access.source.cipherSuite && *access.source.cipherSuite != suite) continue;
        std::string granted, refused;
        for (const char* const level : {"user", "operator", "admin"}) {
            AccessOptions with = Quickly(access);
            with.source.cipherSuite = suite;
            with.source.privilege = level;
            std::string* const list = TryOpening(with).controller ? &granted : &refused;
            list->append(list->empty() ? "" : ", ").append(level);
        }
        const std::string what = "cipher suite " + std::to_string(suite);
        if (granted.empty()) {
            if (isListed) steps->Note(what, "listed, but the BMC opens no session with it");
            continue;
        }
        good = good || suite == 17 || suite == 3;
        steps->Good(what, "opens for " + granted + (refused.empty() ? "" : "; not for " + refused));
    }
    if (!good) {
        steps->Bad("cipher suites",
                   "neither 17 nor 3 opens; enable one at the BMC, others do not keep what is read "
                   "secret");
    }
    if (std::find(listed.begin(), listed.end(), 0) != listed.end()) {
        steps->Bad("cipher suite 0",
                   "the BMC lists it: it lets anybody in without a password; "
                   "disable it at the BMC");
    }
}

void TrySessions(const AccessOptions& access, Steps* steps) {
    constexpr std::string_view kWhat = "sessions at a time";
    constexpr unsigned kEnough = 4;
    std::vector<Attempt> open;
    // The one that the other steps have is open too.
    while (open.size() + 1 < kEnough) {
        Attempt attempt = TryOpening(access);
        if (!attempt.controller) break;
        open.push_back(std::move(attempt));
    }
    const auto count = std::to_string(open.size() + 1);
    if (open.size() + 1 == kEnough) {
        steps->Good(kWhat, count + " or more");
    } else if (open.empty()) {
        steps->Bad(kWhat,
                   "no second one; end the sessions of others before a collection, or wait "
                   "until they run out");
    } else {
        steps->Note(kWhat, count);
    }
}

void TryWindows(const AccessOptions& access, Steps* steps) {
    constexpr std::string_view kWhat = "requests at a time";
    constexpr int kRequests = 32;
    constexpr double kWorse = 1.3, kBetter = 0.9;
    int best = 0;
    Clock::duration bestTime{}, single{};
    std::string stumble;
    for (const int window : {1, 2, 4, 8, 16, 32}) {
        AccessOptions with = access;
        with.source.window = window;
        Attempt attempt = TryOpening(with);
        if (!attempt.controller) {
            stumble = "no session for " + std::to_string(window);
            break;
        }
        int lost = 0;
        RequestPipeline* const pipeline = attempt.controller->Pipeline();
        const auto began = Clock::now();
        for (int i = 0; i < kRequests; ++i) {
            pipeline->Submit(ipmi::GetDeviceId(), [&](std::optional<Response> answer) {
                if (!answer || answer->front() != ipmi::kCompleted) ++lost;
            });
        }
        NQORTQR20::RunPipelines({&pipeline, 1}, [] { return false; });
        const Clock::duration time = (Clock::now() - began) / kRequests;
        if (window == 1) single = time;
        if (lost > 0) {
            stumble = Format("%d of %d go wrong with %d", lost, kRequests, window);
            if (best != 0) stumble += Format("; give --window %d", best);
            break;
        }
        if (best != 0 && time > bestTime * kWorse) {
            stumble = Format("slower with %d", window);
            break;
        }
        if (best == 0 || time < bestTime * kBetter) {
            best = window;
            bestTime = time;
        }
    }
    if (best == 0) {
        steps->Bad(kWhat, stumble + "; give --window 1 and a longer --timeout");
        return;
    }
    std::string text = Format("%d: %s each, %s one at a time", best, Milliseconds(bestTime).c_str(),
                              Milliseconds(single).c_str());
    if (!stumble.empty()) text += "; " + stumble;
    steps->Good(kWhat, text);
}

}  // namespace

int ExamineLan(AccessOptions access, Steps* steps) {
    const std::string place = access.Sources().front().substr(kLan.size());
    const auto patience = std::min<std::chrono::duration<double>>(
        std::chrono::duration<double>(access.source.timeoutSeconds), kPatience);
    NQORTQR20::LanProbe probe;
    try {
        probe = NQORTQR20::ProbeLan(
            place, std::chrono::duration_cast<std::chrono::milliseconds>(patience));
    } catch (const NQORTQR20::SourceUsageError& error) {
        throw Failure(kExitUsage, error.what());
    } catch (const SourceError& error) {
        throw Failure(kExitNoSource, error.what());
    }
    if (probe.addresses.empty()) {
        steps->Bad("name", probe.problem);
        return kExitNoSource;
    }
    std::string addresses;
    for (const std::string& address : probe.addresses) {
        addresses += (addresses.empty() ? "" : ", ") + address;
    }
    steps->Good("name", addresses);
    if (probe.pong) {
        steps->Good("presence ping", Milliseconds(*probe.pong));
    } else if (!probe.refused) {
        steps->Note("presence ping", "no answer; not every BMC gives one");
    }
    if (!probe.capabilities) {
        steps->Bad("port", probe.problem);
        return kExitNoSource;
    }
    steps->Good("port", "IPMI answers, " + Milliseconds(probe.capabilities->took));
    const bool putUp = std::find(access.source.workarounds.begin(), access.source.workarounds.end(),
                                 "authcap") != access.source.workarounds.end();
    if (probe.capabilities->ipmi20) {
        steps->Good("IPMI 2.0", "offered");
    } else if (!putUp) {
        steps->Bad("IPMI 2.0", "not offered; enable it at the BMC, or try --workaround authcap");
    }
    if (probe.capabilities->hasKey) {
        steps->Note("key of the BMC (Kg)", "set: a session needs --kg-file");
    }
    if (probe.cipherSuites.empty()) {
        steps->Note("cipher suites listed", "the BMC does not list them without a session");
    } else {
        steps->Note("cipher suites listed", Joined(probe.cipherSuites));
    }

    access.password = ReadPassword(access.passwordFile);
    access.kg = ReadKg(access.kgFile);
    const auto began = Clock::now();
    Attempt session = TryOpening(access);
    const std::string took = Milliseconds(Clock::now() - began);
    if (session.Works()) {
        steps->Good("session", "opened in " + took);
    } else {
        const bool isWronglyNumbered = session.refusal == Refusal::kSessionNumbers;
        steps->Bad("session", !session.controller ? session.problem
                              : isWronglyNumbered
                                  ? "opened, but the BMC numbers its answers wrongly; see below"
                                  : "opened, but nothing is answered in it; reset the BMC, or look "
                                    "for newer firmware");
        session.controller.reset();
        const Refusal refusal = session.refusal;
        if (refusal == Refusal::kPrivilege) session = TryLowerPrivileges(&access, steps);
        if (!session.controller) session = TryWorkarounds(&access, refusal, steps);
        if (!session.controller) return kExitNoSource;
    }
    TrySessionNumbers(&access, &session, steps);
    if (!TryCommands(&*session.controller, steps)) return kExitNoSource;
    TryLog(&*session.controller, steps);
    TrySensorRecords(&*session.controller, steps);
    TryClock(&*session.controller, steps);
    TrySuites(access, probe.cipherSuites, steps);
    TrySessions(access, steps);
    TryWindows(access, steps);
    return steps->ExitStatus();
}

}  // namespace ipmisel
