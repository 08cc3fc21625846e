#pragma once

#include <chrono>
#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "host/spdriver/read_ahead.h"
#include "host/spdriver/rmcpplus_codec.h"
#include "host/spdriver/send_window.h"

namespace tqrhost {

using Clock = std::chrono::steady_clock;

/// A UDP socket that is connected to one BMC; not blocking.
class UdpSocket {
public:
    /// Throws SourceError when the name does not resolve or no socket can be had.
    UdpSocket(const std::string& name, const std::string& host, const std::string& port);
    ~UdpSocket();
    UdpSocket(const UdpSocket&) = delete;
    UdpSocket& operator=(const UdpSocket&) = delete;
    int fd() const { return fd_; }
    void Send(std::span<const std::uint8_t> packet);
    /// The next packet; empty when none is waiting.
    std::optional<std::vector<std::uint8_t>> Receive();
    /// A port-unreachable answer has come: nobody listens there.
    bool Refused() const { return refused_; }

private:
    int fd_ = -1;
    bool refused_ = false;
};

struct LanSessionOptions {
    rmcpplus::Credentials credentials;
    std::vector<int> cipherSuites;   ///< to be tried, the best first; nothing else is ever used
    std::optional<unsigned> window;  ///< fixed; adaptive when left out
    std::chrono::milliseconds timeout{20000};  ///< how long one request may go unanswered in all
    bool skipCapabilities = false;             ///< workaround: a BMC that answers them wrongly
};

/// An RMCP+ session with one BMC (IPMI 2.0, chapter 13) that keeps several requests outstanding.
///
/// Requests are told apart by their sequence number (rqSeq); every retry is a packet of its own
/// with a new session sequence number, so that a BMC's sliding window takes it, and an answer to
/// any of the tries counts. Guesses of ReadAhead fill the window behind the request that is waited
/// for; an answer to a guess is kept until it is asked for, and only if it is a good one, so that
/// the caller sees what it would have seen without.
class LanSession {
public:
    LanSession(std::string name, const std::string& host, const std::string& port,
               LanSessionOptions options);
    /// Tells the BMC that the session is over.
    ~LanSession();
    LanSession(const LanSession&) = delete;
    LanSession& operator=(const LanSession&) = delete;

    /// Opens several sessions at once. Throws SourceError for the first that cannot be opened.
    static void OpenAll(const std::vector<LanSession*>& sessions);

    /// Sends a request and waits for its answer; empty when none came in time.
    std::optional<Response> Exchange(const Ask& ask);

private:
    enum class State { kCapabilities, kOpenSession, kRakp1, kRakp3, kPrivilege, kReady, kFailed };

    struct Outstanding {
        Ask ask;
        std::vector<std::uint8_t> packet;  ///< as last sent
        std::uint32_t firstSequence = 0;
        std::uint64_t lastSerial = 0;  ///< order of the last send among all sends
        Clock::time_point firstSent;
        Clock::time_point lastSent;
        std::chrono::milliseconds wait{0};  ///< until the next try
        unsigned tries = 0;
        unsigned overtaken = 0;  ///< answers to later sends since the last try
        bool wanted = false;
        bool alone = false;  ///< nothing else was outstanding when it was sent
    };

    // Opening
    void BeginAttempt();
    void SendSetup();
    void HandleSetup(std::span<const std::uint8_t> packet);
    void HandleOpenSession(std::span<const std::uint8_t> packet);
    void FailRakp3(int error);
    void HandleSetupTimer(Clock::time_point now);
    void RestartAttempt(int otherwise);
    /// An error number of FreeIPMI, for which there is advice.
    void Fail(int error);
    bool Reopen();
    void FailWithStatus();

    // Requests
    std::uint8_t FreeRqSeq();
    std::uint8_t Send(const Ask& ask, bool wanted);
    void SendTry(std::uint8_t rqSeq, Outstanding* request);
    /// Whether the BMC's window has room for a guess, or for its second try.
    bool MayGuess(bool again) const;
    void FillWindow();
    void Receive();
    void HandleAnswer(const rmcpplus::Answer& answer);
    void HandleRetries(Clock::time_point now);
    Clock::time_point NextTimer() const;
    std::optional<Response> WaitFor(const Ask& ask, Clock::time_point deadline);
    void DropStaleAnswers();

    std::string name_;
    LanSessionOptions options_;
    UdpSocket socket_;
    rmcpplus::Codec codec_;

    State state_ = State::kCapabilities;
    int failure_ = 0;
    std::size_t suite_ = 0;
    std::uint8_t tag_ = 0;
    unsigned setupTries_ = 0;
    unsigned attempts_ = 0;
    bool rakp1Repeated_ = false;
    Clock::time_point setupDeadline_;
    Clock::time_point setupTimer_;
    std::vector<std::uint8_t> setupPacket_;
    bool reopened_ = false;

    ReadAhead readAhead_;
    SendWindow window_;
    RoundTrip roundTrip_;
    std::map<std::uint8_t, Outstanding> outstanding_;
    std::map<Ask, Response> ready_;  ///< answers to guesses, each used once
    std::optional<Response> wantedAnswer_;
    std::array<Clock::time_point, 64> rqSeqFree_{};  ///< not before this; see FreeRqSeq
    std::uint8_t lastRqSeq_ = 0;
    std::uint32_t sequence_ = 0;      ///< last session sequence number sent
    std::uint32_t acknowledged_ = 0;  ///< highest that the BMC is known to have
    std::uint64_t serial_ = 0;
    ReceivedNumbers received_;
    unsigned askedAgain_ = 0;
};

}  // namespace tqrhost
