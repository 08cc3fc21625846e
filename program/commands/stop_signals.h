#pragma once

#include <csignal>
#include <string>

namespace ipmisel {

/// Takes over SIGINT, SIGTERM and SIGHUP while it lives. Between BeginCollecting and
/// EndCollecting the first of them ends the collection early but in order; any other ends the
/// program, after the unfinished output file is gone.
class StopSignals {
public:
    StopSignals();
    ~StopSignals();
    StopSignals(const StopSignals&) = delete;
    StopSignals& operator=(const StopSignals&) = delete;

    static void BeginCollecting();
    static void EndCollecting();
};

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
