#pragma once

#include <chrono>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

#include "host/spdriver/source.h"
#include "ipmi/command.h"
#include "program/commands/failure.h"

// What the doctor does with every source: its lines, and what it tries at a BMC that is open.

namespace ipmisel {

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
    static void Line(std::string_view mark, std::string_view what, const std::string& result);

    bool wrong_ = false;
};

/// One BMC that is open.
class DoctorController {
public:
    explicit DoctorController(NQORTQR20::Source source) : source_(std::move(source)) {}

    bool There() const { return !source_.nodes.empty(); }
    const NQORTQR20::MachineFacts& Facts() const { return source_.facts; }
    /// Of a live BMC.
    NQORTQR20::RequestPipeline* Pipeline() { return source_.nodes.front().pipeline.get(); }
    /// Empty when no answer came.
    std::optional<NQORTQR20::Response> Exchange(const ipmi::Command& command);

private:
    NQORTQR20::Source source_;
};

std::string Milliseconds(std::chrono::steady_clock::duration time);

/// Each command that a report is made of, once; what a sensor is asked for with the first sensor of
/// the repository. False when the BMC does not work at all.
bool TryCommands(DoctorController* controller, Steps* steps);
/// The first records of the event log one after the other, as far as they can be read.
void TryLog(DoctorController* controller, Steps* steps);
/// Whether sensor records come whole.
void TrySensorRecords(DoctorController* controller, Steps* steps);
/// The BMC's clock against this machine's.
void TryClock(DoctorController* controller, Steps* steps);

}  // namespace ipmisel
