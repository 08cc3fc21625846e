#pragma once

#include <chrono>
#include <csignal>
#include <string>

namespace ipmisel {

/// Takes over SIGINT, SIGTERM and SIGHUP while it lives. Between BeginCollecting and
/// EndCollecting the first of them ends the collection early but in order; any other ends the
/// program, after the unfinished output file is gone. Soon after a collection was to stop, calls
/// that are still blocked, as in a pipe that nobody reads, return with EINTR.
class StopSignals {
public:
    StopSignals();
    ~StopSignals();
    StopSignals(const StopSignals&) = delete;
    StopSignals& operator=(const StopSignals&) = delete;

    static void BeginCollecting();
    static void EndCollecting();
    /// As NQORTQR20::StopAt.
    static void StopAt(std::chrono::steady_clock::time_point deadline);
    /// No call is interrupted any more: somebody reads the report as slowly as he likes.
    static void LeaveTime();
};

/// What an error number of a file means, that of an interrupted call included.
std::string ProblemText(int error);

/// Holds the same signals back while it lives.
class SignalsHeld {
public:
    SignalsHeld();
    ~SignalsHeld();
    SignalsHeld(const SignalsHeld&) = delete;
    SignalsHeld& operator=(const SignalsHeld&) = delete;

private:
    sigset_t before_;
};

/// The file that a signal which ends the program removes first; empty for none. To be called with
/// the signals held.
void RemoveWhenKilled(const std::string& file);

}  // namespace ipmisel
