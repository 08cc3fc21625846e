#include "host/spdriver/lan/lan_session.h"

#include <poll.h>

#include <algorithm>
#include <exception>
#include <utility>

#include "host/spdriver/stop.h"
#include "tqr/log.h"

namespace tqrhost {
namespace {

using NQORTQR20::ILogger;

/// In one Advance: a flood of packets does not keep the caller from its clock.
constexpr unsigned kMaxBatches = 4;

void Log(ILogger::ETQRLogSeverity severity, const std::string& line) {
    NQORTQR20::fdrWriteLog(severity, line.c_str());
}

bool MayPass(OpeningError error) {
    return error == OpeningError::kNoAnswer || error == OpeningError::kPortClosed ||
           error == OpeningError::kBusy || error == OpeningError::kRefused;
}

}  // namespace

LanSession::LanSession(std::string name, LanSessionOptions options)
    : name_(std::move(name)),
      options_(std::move(options)),
      requests_({.window = options_.window,
                 .timeout = options_.timeout,
                 .anySessionNumber = options_.credentials.deviations.sessionNumbers}),
      reopening_(options_.timeout) {}

LanSession::~LanSession() {
    // One packet, unanswered: a BMC that misses it drops the session by itself after a minute.
    if (codec_ && !dead_) {
        try {
            const rmcpplus::Packet close = codec_->CloseRequest(requests_.NextSequence(), 0);
            socket_->Send({&close, 1});
        } catch (const std::exception&) {
            // No memory for the packet: as good as lost.
        }
    }
    std::string& password = options_.credentials.password;
    Wipe({reinterpret_cast<std::uint8_t*>(password.data()), password.size()});
    Wipe(options_.credentials.kg);
}

void LanSession::Open(std::span<const Endpoint> endpoints, Clock::time_point now,
                      Clock::time_point deadline) {
    socket_.emplace(endpoints);
    BeginOpening(false, now, deadline);
}

void LanSession::BeginOpening(bool again, Clock::time_point now, Clock::time_point deadline) {
    opening_.emplace(
        options_.credentials,
        SessionOpening::Options{
            .cipherSuites = options_.cipherSuites, .deadline = deadline, .again = again});
    opening_->Start(now);
    opening_->TakePackets(&toSend_);
    socket_->Send(std::exchange(toSend_, {}));
}

void LanSession::Submit(ipmi::Command command, Handler handler) {
    requests_.Submit(std::move(command), std::move(handler));
}

void LanSession::Advance(Clock::time_point now) {
    if (dead_) {
        requests_.FailAll();
        return;
    }
    if (codec_ && requests_.Pending() > 0 && !requests_.SilentSince()) {
        reopening_.NoteIdle(now - requests_.LastHeard());
    }
    Receive(now);
    if (opening_) HandleOpening(now);
    requests_.Send(now, &toSend_);
    socket_->Send(toSend_);
    toSend_.clear();
    CheckSilence(now);
}

void LanSession::Receive(Clock::time_point now) {
    for (unsigned batch = 0; batch < kMaxBatches; ++batch) {
        const auto packets = socket_->Receive();
        for (const ByteView packet : packets) {
            const auto answer = codec_ ? codec_->ParseAnswer(packet) : std::nullopt;
            if (!answer) {
                if (opening_) opening_->Handle(packet, now);
                continue;
            }
            reopening_.NoteAnswer();
            if (opening_) opening_.reset();  // it lives: no other is needed
            requests_.Handle(*answer, now);
        }
        if (packets.size() < UdpSocket::kBatch) break;
    }
    if (!socket_->TakeRefusal()) return;
    reopening_.NoteRefusal();
    if (opening_) opening_->HandleRefusal(now);
}

void LanSession::HandleOpening(Clock::time_point now) {
    opening_->HandleTimer(now);
    opening_->TakePackets(&toSend_);
    if (opening_->state() == SessionOpening::State::kOpening) return;
    const bool isOpen = opening_->state() == SessionOpening::State::kOpen;
    if (codec_) {
        reopening_.NoteReopening(now, !isOpen && MayPass(opening_->error()));
    } else {
        reopening_.NoteAnswer();
    }
    if (isOpen) {
        if (codec_) Log(ILogger::kNotice, name_ + ": the session has been opened anew.");
        SessionOpening::Session session = opening_->TakeSession();
        requests_.Start(session.codec.get(), session.sequence, session.received, session.roundTrip,
                        now);
        codec_ = std::move(session.codec);
    } else if (codec_) {
        Log(ILogger::kNotice, Advice(name_, opening_->error()));
    } else {
        error_ = opening_->error();
        dead_ = true;
    }
    opening_.reset();
}

/// When the session is to be opened anew, unless the BMC answers before.
std::optional<Clock::time_point> LanSession::ReopenAt() const {
    const auto silence = requests_.SilentSince();
    if (!codec_ || opening_ || !silence) return std::nullopt;
    return reopening_.At(*silence, requests_.LastHeard());
}

void LanSession::CheckSilence(Clock::time_point now) {
    if (dead_) return;
    if (requests_.HeardNothing()) {
        if (requests_.Repeated() > 0) {
            Log(ILogger::kWarning, Advice(name_, OpeningError::kSessionNumbers));
        }
        dead_ = true;
        opening_.reset();
        requests_.FailAll();
        return;
    }
    const auto reopenAt = ReopenAt();
    if (reopenAt && now >= *reopenAt) BeginOpening(true, now, now + options_.timeout);
}

Clock::time_point LanSession::NextTimer() const {
    Clock::time_point next = requests_.NextTimer(Clock::now());
    if (dead_ && requests_.Pending() > 0) return Clock::time_point::min();
    if (opening_) next = std::min(next, opening_->NextTimer());
    if (const auto reopenAt = ReopenAt()) next = std::min(next, *reopenAt);
    return next;
}

void OpenTogether(std::span<LanSession* const> sessions) {
    constexpr std::chrono::milliseconds kMaxWait{100};
    const auto isOpening = [](const LanSession* session) { return session->IsOpening(); };
    while (std::any_of(sessions.begin(), sessions.end(), isOpening) &&
           Stopped() == StopReason::kNone) {
        std::vector<pollfd> waits;
        const auto now = Clock::now();
        auto until = std::min(now + kMaxWait, StopTime());
        for (const LanSession* session : sessions) {
            if (!session->IsOpening()) continue;
            waits.push_back({session->Descriptor(), POLLIN, 0});
            until = std::min(until, session->NextTimer());
        }
        const auto rest =
            std::chrono::ceil<std::chrono::milliseconds>(std::max(until, now) - now).count();
        poll(waits.data(), waits.size(), static_cast<int>(rest));
        for (LanSession* session : sessions) {
            if (session->IsOpening()) session->Advance(Clock::now());
        }
    }
}

}  // namespace tqrhost
