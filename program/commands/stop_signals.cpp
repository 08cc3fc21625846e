#include "program/commands/stop_signals.h"

#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <chrono>
#include <climits>
#include <csignal>
#include <cstdint>
#include <cstring>
#include <ctime>
#include <optional>
#include <utility>

#include "host/spdriver/stop.h"
#include "program/reports/progress.h"

namespace ipmisel {
namespace {

constexpr int kSignals[] = {SIGINT, SIGTERM, SIGHUP};
// When a call that is still blocked returns, after the collection was to stop: a little later than
// instances are taken, so that a report which is only slow is written to its end.
constexpr std::chrono::milliseconds kGrace{700};
constexpr std::chrono::milliseconds kEvery{50};

std::atomic<bool> gCollecting{false};
static_assert(std::atomic<bool>::is_always_lock_free, "a signal handler reads it");
char gUnfinishedFile[PATH_MAX];  // read by the handler, which runs only while it is not written

std::optional<timer_t> gTimer;  // set before the handlers are, and after them taken away

timespec ToTimespec(std::chrono::nanoseconds time) {
    constexpr std::int64_t kSecond = 1'000'000'000;
    return {static_cast<time_t>(time.count() / kSecond), static_cast<long>(time.count() % kSecond)};
}

/// From `at` on, signals without effect of their own: a blocked call returns with EINTR. What is
/// blocked in the moment of the first would miss a single one. May be called from a signal handler.
void InterruptCalls(std::chrono::nanoseconds at, int flags) {
    if (!gTimer) return;
    const itimerspec times{ToTimespec(kEvery), ToTimespec(at)};
    timer_settime(*gTimer, flags, &times, nullptr);
}

void Handle(int number) {
    if (gCollecting.exchange(false)) {
        NQORTQR20::StopNow();
        InterruptCalls(kGrace, 0);
        return;
    }
    HideProgress();
    if (gUnfinishedFile[0] != '\0') unlink(gUnfinishedFile);
    signal(number, SIG_DFL);
    raise(number);  // delivered when the handler returns
}

}  // namespace

StopSignals::StopSignals() {
    struct sigaction action {};
    action.sa_handler = [](int) {};
    sigaction(SIGALRM, &action, nullptr);
    sigevent event{};
    event.sigev_notify = SIGEV_SIGNAL;
    event.sigev_signo = SIGALRM;
    timer_t timer{};
    if (timer_create(CLOCK_MONOTONIC, &event, &timer) == 0) gTimer = timer;
    action.sa_handler = Handle;
    for (const int number : kSignals) sigaddset(&action.sa_mask, number);
    for (const int number : kSignals) {
        struct sigaction before {};
        // One that was ignored from the start, as under nohup, stays so.
        if (sigaction(number, nullptr, &before) == 0 && before.sa_handler == SIG_IGN) continue;
        sigaction(number, &action, nullptr);
    }
}

StopSignals::~StopSignals() {
    for (const int number : kSignals) {
        struct sigaction now {};
        if (sigaction(number, nullptr, &now) == 0 && now.sa_handler == Handle) {
            signal(number, SIG_DFL);
        }
    }
    if (gTimer) timer_delete(*std::exchange(gTimer, std::nullopt));
    signal(SIGALRM, SIG_IGN);  // one may still be on its way
}

void StopSignals::StopAt(std::chrono::steady_clock::time_point deadline) {
    NQORTQR20::StopAt(deadline);
    InterruptCalls(deadline.time_since_epoch() + kGrace, TIMER_ABSTIME);
}

void StopSignals::LeaveTime() {
    if (!gTimer) return;
    const itimerspec never{};
    timer_settime(*gTimer, 0, &never, nullptr);
}

void StopSignals::BeginCollecting() { gCollecting = true; }
void StopSignals::EndCollecting() { gCollecting = false; }

std::string ProblemText(int error) {
    // A signal interrupts only what waits for others.
    if (error == EINTR && NQORTQR20::Stopped() != NQORTQR20::StopReason::kNone) {
        return "nobody was at its other end in time";
    }
    return std::strerror(error);
}

SignalsHeld::SignalsHeld() {
    sigset_t held;
    sigemptyset(&held);
    for (const int number : kSignals) sigaddset(&held, number);
    sigprocmask(SIG_BLOCK, &held, &before_);
}

SignalsHeld::~SignalsHeld() { sigprocmask(SIG_SETMASK, &before_, nullptr); }

void RemoveWhenKilled(const std::string& file) {
    // A longer path could not have been opened.
    if (file.size() < sizeof gUnfinishedFile) {
        std::memcpy(gUnfinishedFile, file.c_str(), file.size() + 1);
    }
}

}  // namespace ipmisel
