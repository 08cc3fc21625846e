#pragma once

#include <cstdint>
#include <optional>
#include <span>
#include <vector>

#include "ipmi/command.h"
#include "tqr/splibrary.h"

namespace standard {

/// What a controller answered.
struct Answer {
    std::uint8_t completionCode = 0;
    std::vector<std::uint8_t> data;  ///< after the completion code

    bool Completed() const { return completionCode == ipmi::kCompleted; }
};

/// The way to one controller: a command as a value in, its answer out.
class Controller {
public:
    explicit Controller(NQORTQR20::SPLibrary& library) : library_(library) {}
    /// Says what will be sent soon, so that the host may ask for all of it at once.
    void Announce(std::span<const ipmi::Command> commands);
    /// Empty when nothing came. An answer is cut at what a message can hold.
    std::optional<Answer> Send(const ipmi::Command& command);
    /// The data of an answer that completed; empty for every other.
    std::optional<std::vector<std::uint8_t>> Completed(const ipmi::Command& command);

private:
    NQORTQR20::SPLibrary& library_;  // the host's
};

}  // namespace standard
