#pragma once

#include <chrono>
#include <cstdint>
#include <memory>
#include <optional>
#include <vector>

#include "host/spdriver/lan/command_timing.h"
#include "host/spdriver/lan/opening_error.h"
#include "host/spdriver/lan/received_numbers.h"
#include "host/spdriver/lan/rmcpplus_codec.h"

namespace tqrhost {

/// Opens a session: Get Channel Authentication Capabilities, Open Session, RAKP 1 to 4, Set Session
/// Privilege Level (IPMI 2.0, 13.14 ff.). The first two are sent together, since neither needs the
/// other's answer. Packets are handed in and out, with the time of it.
class SessionOpening {
public:
    struct Options {
        std::vector<int> cipherSuites;  ///< to be tried, the best first; nothing else is ever used
        Clock::time_point deadline{};
        bool again = false;  ///< a session was open before: a port that refuses may open again
    };
    enum class State { kOpening, kOpen, kFailed };
    /// An open session.
    struct Session {
        std::unique_ptr<rmcpplus::Codec> codec;
        std::uint32_t sequence = 0;  ///< the newest that the BMC has taken
        ReceivedNumbers received;
        std::optional<CommandTiming::Duration> roundTrip;
    };

    /// The credentials are borrowed.
    SessionOpening(const rmcpplus::Credentials& credentials, Options options);

    State state() const;
    /// Why it has failed.
    OpeningError error() const { return error_; }
    /// What came of it; once it is open.
    Session TakeSession();

    void Start(Clock::time_point now) { BeginAttempt(now); }
    void Handle(ByteView packet, Clock::time_point now);
    /// Nobody listens on the port.
    void HandleRefusal(Clock::time_point now);
    void HandleTimer(Clock::time_point now);
    Clock::time_point NextTimer() const;
    /// Appends what is to be sent now.
    void TakePackets(std::vector<rmcpplus::Packet>* packets);

private:
    enum class Step { kOpenSession, kRakp1, kRakp3, kPrivilege, kOpen, kFailed };

    void BeginAttempt(Clock::time_point now);
    void RestartAttempt(OpeningError otherwise, Clock::time_point now);
    void Enter(Step step, Clock::time_point now);
    void SendStep(Clock::time_point now);
    rmcpplus::Packet PrivilegeRequest();
    void Fail(OpeningError error);
    void FailWithStatus();
    void HandleCapabilities(ByteView packet, Clock::time_point now);
    void HandleOpenSession(ByteView packet, Clock::time_point now);
    void HandleRakp2(ByteView packet, Clock::time_point now);
    void HandleRakp4(ByteView packet, Clock::time_point now);
    void HandlePrivilege(ByteView packet);
    void MeasureRoundTrip(Clock::time_point now);
    OpeningError WhatSilenceMeans() const;

    const rmcpplus::Credentials& credentials_;
    Options options_;
    Session session_;
    Step step_ = Step::kOpenSession;
    OpeningError error_ = OpeningError::kNoAnswer;
    std::size_t suite_ = 0;
    unsigned attempts_ = 0;
    std::uint8_t tag_ = 0;
    unsigned tries_ = 0;  ///< of this step
    Clock::time_point sentAt_{};
    Clock::time_point retryAt_{};
    std::vector<rmcpplus::Packet> toSend_;
    bool refused_ = false;
    bool rakp1Repeated_ = false;
    bool badNumber_ = false;  ///< an answer was dropped for its session sequence number
};

}  // namespace tqrhost
