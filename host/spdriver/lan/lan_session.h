#pragma once

#include <chrono>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "host/spdriver/lan/opening_error.h"
#include "host/spdriver/lan/reopening_policy.h"
#include "host/spdriver/lan/session_opening.h"
#include "host/spdriver/lan/session_requests.h"
#include "host/spdriver/lan/udp_socket.h"
#include "host/spdriver/pipeline.h"

namespace tqrhost {

/// Everything that a session with one BMC is opened and held by.
struct LanSessionOptions {
    rmcpplus::Credentials credentials;
    std::vector<int> cipherSuites;   ///< to be tried, the best first; nothing else is ever used
    std::optional<unsigned> window;  ///< fixed; adaptive when left out
    std::chrono::milliseconds timeout{20000};  ///< how long one request may go unanswered in all
};

/// A session with one BMC over RMCP+ (IPMI 2.0, chapter 13): the socket, the opening, the requests.
///
/// A session that falls silent is opened anew, beside the old one, which may still wake up; one
/// that was idle for half a minute after the first unanswered try. A BMC that could not be reached
/// within the timeout is dead.
class LanSession : public RequestPipeline {
public:
    LanSession(std::string name, LanSessionOptions options);
    /// Tells the BMC that the session is over.
    ~LanSession() override;
    LanSession(const LanSession&) = delete;
    LanSession& operator=(const LanSession&) = delete;

    /// Begins to open, which fails at the deadline. Throws OpeningError when there is no socket for
    /// any of the endpoints.
    void Open(std::span<const Endpoint> endpoints, Clock::time_point now,
              Clock::time_point deadline);
    bool IsOpening() const { return opening_ && !codec_; }
    /// Why the first opening failed; empty when it did not.
    std::optional<OpeningError> error() const { return error_; }

    void Submit(ipmi::Command command, Handler handler) override;
    std::size_t Pending() const override { return requests_.Pending(); }
    std::size_t Room() const override { return dead_ ? 0 : requests_.Room(); }
    unsigned WronglyNumbered() const override { return requests_.Repeated(); }
    /// The BMC has fallen silent: it answered nothing at all for as long as one request may go
    /// unanswered, and could not be reached anew within that time. What is pending and what is
    /// submitted from then on is answered with nothing at once.
    bool Dead() const { return dead_; }
    int Descriptor() const override { return socket_->fd(); }
    Clock::time_point NextTimer() const override;
    void Advance(Clock::time_point now) override;

private:
    void BeginOpening(bool again, Clock::time_point now, Clock::time_point deadline);
    void Receive(Clock::time_point now);
    void HandleOpening(Clock::time_point now);
    std::optional<Clock::time_point> ReopenAt() const;
    void CheckSilence(Clock::time_point now);

    std::string name_;
    LanSessionOptions options_;
    std::optional<UdpSocket> socket_;
    std::optional<SessionOpening> opening_;
    std::unique_ptr<rmcpplus::Codec> codec_;  ///< of the session that is open
    SessionRequests requests_;
    ReopeningPolicy reopening_;
    std::optional<OpeningError> error_;
    std::vector<rmcpplus::Packet> toSend_;
    bool dead_ = false;
};

/// Opens all of them at the same time, until each is open or has failed, or the collection is to
/// stop.
void OpenTogether(std::span<LanSession* const> sessions);

}  // namespace tqrhost
