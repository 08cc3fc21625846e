#include "program/commands/stop_signals.h"

#include <unistd.h>

#include <atomic>
#include <climits>
#include <cstring>

#include "host/spdriver/stop.h"
#include "program/reports/progress.h"

namespace ipmisel {
namespace {

constexpr int kSignals[] = {SIGINT, SIGTERM, SIGHUP};

std::atomic<bool> gCollecting{false};
static_assert(std::atomic<bool>::is_always_lock_free, "a signal handler reads it");
char gUnfinishedFile[PATH_MAX];  // read by the handler, which runs only while it is not written

void Handle(int number) {
    if (gCollecting.exchange(false)) {
        NQORTQR20::StopNow();
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
}

void StopSignals::BeginCollecting() { gCollecting = true; }
void StopSignals::EndCollecting() { gCollecting = false; }

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
