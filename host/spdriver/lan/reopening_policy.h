#pragma once

#include <chrono>
#include <optional>

#include "host/spdriver/lan/session_requests.h"

namespace tqrhost {

/// When a session whose BMC has fallen silent is opened anew. What happens is handed in, with the
/// time of it.
class ReopeningPolicy {
public:
    /// `timeout` is how long one request may go unanswered in all.
    explicit ReopeningPolicy(std::chrono::milliseconds timeout) : timeout_(timeout) {}

    /// A request goes out after nothing was heard for so long: a BMC drops a session that idles.
    void NoteIdle(Clock::duration idle);
    void NoteAnswer() { unproven_ = refused_ = false; }
    /// Nobody listens on the port.
    void NoteRefusal() { refused_ = true; }
    /// The session has been opened anew, or could not be; `again` when that is worth another try.
    void NoteReopening(Clock::time_point now, bool again);

    /// Empty for not at all, as things are; `lastHeard` is of the session.
    std::optional<Clock::time_point> At(const SessionRequests::Silence& silence,
                                        Clock::time_point lastHeard) const;

private:
    std::chrono::milliseconds timeout_;
    Clock::time_point reopenedAt_{};
    bool again_ = false;
    bool unproven_ = false;  ///< idle so long that the BMC may have dropped the session
    bool refused_ = false;   ///< since the last answer
};

}  // namespace tqrhost
