#include "program/commands/doctor.h"

#include <fcntl.h>
#include <poll.h>
#include <unistd.h>

#include <CLI/CLI.hpp>
#include <algorithm>
#include <array>
#include <cerrno>
#include <chrono>
#include <cstdio>
#include <cstring>
#include <ctime>
#include <filesystem>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "base/text.h"
#include "host/spdriver/lan_probe.h"
#include "host/spdriver/source.h"
#include "ipmi/command.h"
#include "ipmi/sel_info.h"
#include "ipmi/smbios.h"
#include "ipmi/timestamp.h"
#include "program/commands/access.h"
#include "program/commands/failure.h"
#include "program/commands/password.h"
#include "program/commands/stop_signals.h"
#include "program/reports/terminal_text.h"

namespace ipmisel {
namespace {

using Clock = std::chrono::steady_clock;
using NQORTQR20::RequestPipeline;
using NQORTQR20::Response;
using NQORTQR20::Source;
using NQORTQR20::SourceError;

/// The steps as lines: how it went, what was tried, what came of it and what to do.
class Steps {
public:
    void Good(std::string_view what, const std::string& result) { Line("ok", what, result); }
    /// It is so, and nothing is wrong with it.
    void Note(std::string_view what, const std::string& result) { Line("-", what, result); }
    /// `result` says what to do.
    void Bad(std::string_view what, const std::string& result) {
        wrong_ = true;
        Line("WRONG", what, result);
    }
    int ExitStatus() const { return wrong_ ? kExitPart : kExitCollected; }

private:
    static void Line(std::string_view mark, std::string_view what, const std::string& result) {
        const std::string line =
            Fit(mark, 6) + " " + Fit(what, 32) + " " + TerminalText(result) + "\n";
        if (std::fwrite(line.data(), 1, line.size(), stdout) != line.size() ||
            std::fflush(stdout) != 0) {
            throw Failure(kExitUsage, std::string("cannot write the output: ") +
                                          std::strerror(errno) + "; make room there");
        }
    }

    bool wrong_ = false;
};

std::string Milliseconds(Clock::duration time) {
    return Format("%.2f ms", std::chrono::duration<double, std::milli>(time).count());
}

/// Runs a pipeline until nothing is pending.
void Run(RequestPipeline* pipeline) {
    constexpr std::chrono::milliseconds kMaxWait{100};
    pipeline->Advance(Clock::now());
    while (pipeline->Pending() > 0) {
        const auto now = Clock::now();
        const auto until = std::max(now, std::min(now + kMaxWait, pipeline->NextTimer()));
        pollfd wait{pipeline->Descriptor(), POLLIN, 0};
        const auto rest = std::chrono::ceil<std::chrono::milliseconds>(until - now).count();
        if (pipeline->Descriptor() >= 0) poll(&wait, 1, static_cast<int>(rest));
        pipeline->Advance(Clock::now());
    }
}

/// One BMC that is open.
class Controller {
public:
    explicit Controller(Source source) : source_(std::move(source)) {}

    bool There() const { return !source_.nodes.empty(); }
    const NQORTQR20::MachineFacts& Facts() const { return source_.facts; }
    RequestPipeline* Pipeline() { return source_.nodes.front().pipeline.get(); }
    std::optional<Response> Exchange(const ipmi::Command& command) {
        const NQORTQR20::SourceNode& node = source_.nodes.front();
        if (node.transport) return node.transport->Exchange(NQORTQR20::RequestFrame(command));
        std::optional<Response> answer;
        node.pipeline->Submit(command,
                              [&](std::optional<Response> found) { answer = std::move(found); });
        Run(node.pipeline.get());
        return answer;
    }

private:
    Source source_;
};

// --- What every source has ---------------------------------------------------------------------

struct ReadCommand {
    ipmi::Command command;
    bool needed;  ///< a report is not whole without it
};

std::vector<ReadCommand> ReadCommands() {
    constexpr std::uint8_t kFruDevice = 0, kHeader = 8;
    return {{ipmi::GetDeviceId(), true},
            {ipmi::GetSelfTestResults(), false},
            {ipmi::GetSystemGuid(), false},
            {ipmi::GetChassisStatus(), false},
            {ipmi::GetSelInfo(), true},
            {ipmi::GetSelAllocationInfo(), false},
            {ipmi::GetSelEntry(ipmi::kFirstRecordId), true},
            {ipmi::GetSelTimeUtcOffset(), false},
            {ipmi::GetSdrRepositoryInfo(), true},
            {ipmi::ReserveSdrRepository(), true},
            {ipmi::GetFruInventoryAreaInfo(kFruDevice), false},
            {ipmi::ReadFruData(kFruDevice, 0, kHeader), false},
            {ipmi::GetPefConfigurationParameters(ipmi::kPefEventFilterCount), false}};
}

/// False when the BMC answers nothing at all.
bool TryCommands(Controller* controller, Steps* steps) {
    bool answered = false;
    bool emptyLog = false;
    for (const ReadCommand& read : ReadCommands()) {
        const ipmi::CommandCode code = read.command.code();
        const std::string name(ipmi::CommandName(code));
        const auto began = Clock::now();
        const auto answer = controller->Exchange(read.command);
        const std::string took = Milliseconds(Clock::now() - began);
        if (!answer) {
            steps->Bad(name,
                       "no answer after " + took +
                           "; give it longer with --timeout, or fewer requests at a time with "
                           "--window 1");
            if (code == ipmi::kGetDeviceId) return false;
            continue;
        }
        answered = true;
        const std::uint8_t completion = answer->front();
        const auto data = std::span(*answer).subspan(1);
        if (code == ipmi::kGetSelInfo && completion == ipmi::kCompleted) {
            const auto info = ipmi::ParseSelInfo(data);
            emptyLog = info && info->records == 0;
            if (info && info->overflow) {
                steps->Bad(name, "the log is full and has dropped events; save it, then clear it");
                continue;
            }
        }
        if (completion == ipmi::kCompleted) {
            steps->Good(name, took);
        } else if (code == ipmi::kGetSelEntry && emptyLog) {
            steps->Note(name, "the log is empty");
        } else {
            const std::string text =
                Format("%s (completion code %02x), %s",
                       std::string(ipmi::CompletionCodeText(code, completion)).c_str(), completion,
                       took.c_str());
            const char* const advice =
                completion == ipmi::kInsufficientPrivilege
                    ? "; log in with a higher --privilege, or as another user"
                    : "; the report will lack what it tells: look for newer firmware of the BMC";
            if (read.needed || completion == ipmi::kInsufficientPrivilege) {
                steps->Bad(name, text + advice);
            } else {
                steps->Note(name, text);
            }
        }
    }
    return answered;
}

void TrySensorRecords(Controller* controller, Steps* steps) {
    constexpr std::string_view kWhat = "sensor records";
    const ipmi::Command command = ipmi::GetSdr(ipmi::kFirstRecordId);
    const auto began = Clock::now();
    const auto answer = controller->Exchange(command);
    if (!answer) {
        steps->Bad(kWhat, "no answer when a whole one is read; report it to the BMC's vendor");
    } else if (answer->front() == ipmi::kCompleted) {
        steps->Good(kWhat, "read whole, " + Milliseconds(Clock::now() - began));
    } else if (ipmi::RefusesSoManyBytes(answer->front())) {
        steps->Note(kWhat, "read in parts: the BMC does not give them whole");
    } else if (answer->front() == ipmi::kNotPresent) {
        steps->Note(kWhat, "there are none");
    } else {
        steps->Bad(kWhat,
                   std::string(ipmi::CompletionCodeText(command.code(), answer->front())) +
                       "; the report will have no names of sensors: try again after a BMC reset");
    }
}

void TryClock(Controller* controller, Steps* steps) {
    constexpr std::string_view kWhat = "clock";
    constexpr long long kTolerated = 60;
    const auto answer = controller->Exchange(ipmi::GetSelTime());
    const auto time = answer && answer->front() == ipmi::kCompleted
                          ? ipmi::ParseSelTime(std::span(*answer).subspan(1))
                          : std::nullopt;
    if (!time) {
        steps->Bad(kWhat, "the BMC does not tell its time; times in the report cannot be compared");
        return;
    }
    if (ipmi::KindOfTime(*time) != ipmi::TimeKind::kClock) {
        steps->Bad(kWhat,
                   "never set, it counts from the BMC's start; set it at the BMC, or let it "
                   "take the time from NTP");
        return;
    }
    const long long offset =
        static_cast<long long>(*time) - static_cast<long long>(std::time(nullptr));
    const std::string text = Format("%+lld s against this machine's", offset);
    if (offset > kTolerated || offset < -kTolerated) {
        steps->Bad(kWhat, text + "; set it at the BMC, or let it take the time from NTP");
    } else {
        steps->Good(kWhat, text);
    }
}

#ifdef IPMISEL_LAN
// --- Over the network --------------------------------------------------------------------------

std::string Joined(const std::vector<int>& numbers) {
    std::string text;
    for (const int number : numbers) text += (text.empty() ? "" : ", ") + std::to_string(number);
    return text;
}

constexpr std::chrono::milliseconds kPatience{3000};
constexpr std::string_view kLan = "lan:";
constexpr double kAttemptSeconds = 3;  ///< for one of several ways to open a session

/// A session that was opened, or why it was not.
struct Attempt {
    std::optional<Controller> controller;
    std::string problem;
    bool ofCredentials = false;
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
        attempt.ofCredentials = error.credentials;
    }
    return attempt;
}

/// Names of workarounds with which a session that was refused is opened after all; at most one.
/// A log-in that fails counts at the BMC, which may lock the user out: where user or password were
/// refused, only those are tried that look like it.
std::optional<std::string> FindWorkaround(const AccessOptions& access, bool ofCredentials) {
    constexpr std::array<std::string_view, 2> kLikeWrongPassword = {"intel20", "supermicro20"};
    for (const auto& workaround : NQORTQR20::KnownWorkarounds()) {
        const bool looksLikeIt = std::find(kLikeWrongPassword.begin(), kLikeWrongPassword.end(),
                                           workaround.name) != kLikeWrongPassword.end();
        if (ofCredentials && !looksLikeIt) continue;
        AccessOptions with = access;
        with.source.timeoutSeconds = std::min(with.source.timeoutSeconds, kAttemptSeconds);
        with.source.workarounds.emplace_back(workaround.name);
        Attempt attempt = TryOpening(with);
        if (attempt.controller && attempt.controller->Exchange(ipmi::GetDeviceId())) {
            return std::string(workaround.name);
        }
    }
    return std::nullopt;
}

void TrySuites(const AccessOptions& access, const std::vector<int>& listed, Steps* steps) {
    constexpr std::string_view kWhat = "cipher suites opened";
    constexpr std::array kSupported = {17, 3, 16, 15, 2, 1};
    std::vector<int> opened, refused;
    for (const int suite : kSupported) {
        const bool isListed = std::find(listed.begin(), listed.end(), suite) != listed.end();
        if (!listed.empty() && !isListed) continue;
        AccessOptions with = access;
        with.source.cipherSuite = suite;
        (TryOpening(with).controller ? opened : refused).push_back(suite);
    }
    std::string text = Joined(opened);
    if (!listed.empty() && !refused.empty()) {
        text += ", but not " + Joined(refused) + " although the BMC lists it";
    }
    const bool good = std::find(opened.begin(), opened.end(), 17) != opened.end() ||
                      std::find(opened.begin(), opened.end(), 3) != opened.end();
    if (good) {
        steps->Good(kWhat, text);
    } else {
        steps->Bad(kWhat, (opened.empty() ? "none" : text) +
                              "; enable suite 17 or 3 at the BMC, others do not keep what is read "
                              "secret");
    }
    if (std::find(listed.begin(), listed.end(), 0) != listed.end()) {
        steps->Bad("cipher suite 0",
                   "the BMC lists it: it lets anybody in without a password; "
                   "disable it at the BMC");
    }
}

void TryPrivileges(const AccessOptions& access, Steps* steps) {
    std::string granted, refused;
    for (const char* const level : {"user", "operator", "admin"}) {
        AccessOptions with = access;
        with.source.privilege = level;
        std::string* const list = TryOpening(with).controller ? &granted : &refused;
        list->append(list->empty() ? "" : ", ").append(level);
    }
    if (granted.empty()) {
        steps->Bad("privileges",
                   "none is granted any more; wait a minute for the BMC's sessions to "
                   "run out, then try again");
    } else {
        steps->Good("privileges", granted + (refused.empty() ? "" : "; not " + refused));
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
        Run(pipeline);
        const Clock::duration time = (Clock::now() - began) / kRequests;
        if (window == 1) single = time;
        if (lost > 0) {
            stumble = Format("%d of %d go wrong with %d", lost, kRequests, window);
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
    if (!stumble.empty() && best == 1) text += ": give --window 1";
    steps->Good(kWhat, text);
}

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
    const bool speaks =
        session.controller && session.controller->Exchange(ipmi::GetDeviceId()).has_value();
    if (speaks) {
        steps->Good("session", "opened in " + took);
    } else {
        steps->Bad("session", session.controller
                                  ? "opened, but nothing is answered in it; reset the "
                                    "BMC, or look for newer firmware"
                                  : session.problem);
        session.controller.reset();
        const auto workaround = FindWorkaround(access, session.ofCredentials);
        if (!workaround) return kExitNoSource;
        steps->Bad("known deviation", "it works with --workaround " + *workaround +
                                          "; give that, or look for newer firmware of the BMC");
        access.source.workarounds.push_back(*workaround);
        session = TryOpening(access);
        if (!session.controller) return kExitNoSource;
    }
    if (!TryCommands(&*session.controller, steps)) return kExitNoSource;
    TrySensorRecords(&*session.controller, steps);
    TryClock(&*session.controller, steps);
    if (!access.source.cipherSuite) TrySuites(access, probe.cipherSuites, steps);
    TryPrivileges(access, steps);
    TrySessions(access, steps);
    TryWindows(access, steps);
    return steps->ExitStatus();
}

#endif  // IPMISEL_LAN
// --- In-band and files -------------------------------------------------------------------------

void ExamineDriver(Steps* steps) {
    namespace fs = std::filesystem;
    std::error_code ignored;
    const auto isLoaded = [&](const char* module) {
        return fs::exists(std::string("/sys/module/") + module, ignored);
    };
    if (isLoaded("ipmi_devintf")) {
        steps->Good("module ipmi_devintf", "loaded");
    } else {
        steps->Bad("module ipmi_devintf", "not loaded; modprobe ipmi_devintf");
    }
    const bool hasInterface =
        isLoaded("ipmi_si") || isLoaded("ipmi_ssif") || isLoaded("ipmi_powernv");
    if (hasInterface) {
        steps->Good("module of the interface", "loaded");
    } else {
        steps->Bad("module of the interface",
                   "not loaded; modprobe ipmi_si, or ipmi_ssif where the "
                   "BMC is behind an I2C bus");
    }
    const fs::path devices[] = {"/dev/ipmi0", "/dev/ipmi/0", "/dev/ipmidev/0"};
    const auto* const device =
        std::find_if(std::begin(devices), std::end(devices),
                     [&](const auto& one) { return fs::exists(one, ignored); });
    if (device == std::end(devices)) {
        steps->Bad("device", hasInterface
                                 ? "no /dev/ipmi0: the driver found no BMC; see dmesg for ipmi_si"
                                 : "no /dev/ipmi0: it comes with the modules");
        return;
    }
    const int file = open(device->c_str(), O_RDWR | O_CLOEXEC);
    const int error = file < 0 ? errno : 0;
    if (file >= 0) close(file);
    if (error == 0) {
        steps->Good("device", device->string());
    } else {
        steps->Bad("device", device->string() + ": " + std::strerror(error) +
                                 (error == EACCES || error == EPERM
                                      ? "; run as root, or ask for access to the device"
                                      : "; see dmesg for ipmi_si"));
    }
}

int ExamineOther(const AccessOptions& access, Steps* steps) {
    const bool inband = access.Sources().front() == "inband";
    if (inband) ExamineDriver(steps);
    std::optional<Controller> controller;
    try {
        controller.emplace(OpenSource(access));
    } catch (const Failure& failure) {
        if (failure.exitStatus == kExitUsage) throw;
        steps->Bad("source", failure.what());
        return kExitNoSource;
    }
    const bool announced = ipmi::HasIpmiDevice(controller->Facts().smbios);
    if (announced) {
        steps->Good("SMBIOS", "announces a BMC (type 38)");
    } else if (inband && controller->There()) {
        steps->Bad("SMBIOS",
                   "announces no BMC (type 38) although the driver has one; inventory and "
                   "firmware will be missing: look for newer firmware of the machine");
    } else {
        steps->Note("SMBIOS", "announces no BMC (type 38)");
    }
    if (!controller->There()) {
        steps->Bad("BMC", "there is none; name another source");
        return kExitNoSource;
    }
    if (!TryCommands(&*controller, steps)) return kExitNoSource;
    TrySensorRecords(&*controller, steps);
    // The clock of a simulated server or a capture stands.
    if (inband) TryClock(&*controller, steps);
    return steps->ExitStatus();
}

int Examine(const AccessOptions& access) {
    const StopSignals signals;
    Steps steps;
#ifdef IPMISEL_LAN
    if (access.Sources().front().starts_with(kLan)) return ExamineLan(access, &steps);
#endif
    return ExamineOther(access, &steps);
}

}  // namespace

Command AddDoctorCommand(CLI::App* program) {
    CLI::App* const command = program->add_subcommand(
        "doctor", "Tell step by step what of a source works, and what to do about the rest");
    const auto options = std::make_shared<AccessOptions>();
    AddAccessOptions(command, options.get());
    command->remove_option(command->get_option("--from"));
    const auto source = std::make_shared<std::string>("inband");
    command->add_option("SOURCE", *source, "inband, lan:HOST[:PORT], sim:FILE or replay:FILE")
        ->capture_default_str();
    command->footer(WorkaroundHelp() +
                    "Exit status:\n"
                    "  0  all is well\n"
                    "  2  wrong usage\n"
                    "  3  the BMC was not reached\n"
                    "  4  it was reached, and something is wrong\n");
    return {command, [options, source] {
                options->sources = {*source};
                return Examine(*options);
            }};
}

}  // namespace ipmisel
