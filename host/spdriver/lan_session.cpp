#include "host/spdriver/lan_session.h"

#include <fcntl.h>
#include <freeipmi/freeipmi.h>
#include <netdb.h>
#include <poll.h>
#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <utility>

#include "host/spdriver/commands.h"
#include "host/spdriver/freeipmi_context.h"
#include "host/spdriver/stop.h"

namespace tqrhost {
namespace {

using std::chrono::milliseconds;

constexpr unsigned kMostTries = 8;
constexpr unsigned kTriesBeforeReopening = 5;
constexpr unsigned kOvertakenBeforeRetry = 3;
constexpr unsigned kMostAttempts = 4;
constexpr unsigned kMostAskedAgain = 3;
constexpr std::uint32_t kSequencesAhead = 15;
constexpr milliseconds kFirstSetupWait{1000};
constexpr milliseconds kRqSeqQuarantine{10000};
// Answers to guesses that wait: no more are asked for once there are so many, and those that are
// out then still find room.
constexpr unsigned kReadyAhead = 32;
constexpr unsigned kReadyLimit = 2 * kReadyAhead;

bool IsBusy(std::uint8_t completionCode) {
    return completionCode == 0xC0 || completionCode == 0xC3 || completionCode == 0xCF;
}

/// Of a reservation only the last counts (IPMI 2.0, clause 33.11): an answer to an earlier try
/// names one that a later try has cancelled.
bool ChangesTheBmc(const Ask& ask) {
    return ask.netFn == kNetFnStorage && ask.command == kReserveSdrRepository;
}

int PollTime(Clock::time_point until, Clock::time_point now) {
    if (until <= now) return 0;
    const auto time = std::chrono::ceil<milliseconds>(until - now);
    return static_cast<int>(std::min<milliseconds::rep>(time.count(), 60000));
}

}  // namespace

UdpSocket::UdpSocket(const std::string& name, const std::string& host, const std::string& port) {
    addrinfo hints{};
    hints.ai_family = AF_UNSPEC;
    hints.ai_socktype = SOCK_DGRAM;
    addrinfo* found = nullptr;
    if (getaddrinfo(host.c_str(), port.c_str(), &hints, &found) != 0) {
        throw SourceError(ErrorAdvice(name, IPMI_ERR_HOSTNAME_INVALID));
    }
    for (const addrinfo* at = found; at != nullptr && fd_ < 0; at = at->ai_next) {
        const int fd =
            socket(at->ai_family, at->ai_socktype | SOCK_CLOEXEC | SOCK_NONBLOCK, at->ai_protocol);
        if (fd < 0) continue;
        if (connect(fd, at->ai_addr, at->ai_addrlen) == 0) {
            fd_ = fd;
        } else {
            close(fd);
        }
    }
    freeaddrinfo(found);
    if (fd_ < 0) throw SourceError(ErrorAdvice(name, IPMI_ERR_SYSTEM_ERROR));
}

UdpSocket::~UdpSocket() {
    if (fd_ >= 0) close(fd_);
}

void UdpSocket::Send(std::span<const std::uint8_t> packet) {
    // A packet that the system does not take is a lost packet: the retry finds out.
    if (send(fd_, packet.data(), packet.size(), 0) < 0 && errno == ECONNREFUSED) refused_ = true;
}

std::optional<std::vector<std::uint8_t>> UdpSocket::Receive() {
    std::array<std::uint8_t, 4096> room;
    for (;;) {
        const ssize_t length = recv(fd_, room.data(), room.size(), 0);
        if (length >= 0) return std::vector<std::uint8_t>(room.begin(), room.begin() + length);
        if (errno == EINTR) continue;
        if (errno == ECONNREFUSED) refused_ = true;
        return std::nullopt;
    }
}

LanSession::LanSession(std::string name, const std::string& host, const std::string& port,
                       LanSessionOptions options)
    : name_(std::move(name)),
      options_(std::move(options)),
      socket_(name_, host, port),
      codec_(options_.credentials),
      window_(options_.window) {
    setupDeadline_ = Clock::now() + options_.timeout;
    BeginAttempt();
}

LanSession::~LanSession() {
    if (state_ != State::kReady) return;
    std::array<std::uint8_t, 4> id;
    for (std::size_t i = 0; i < id.size(); ++i) {
        id[i] = static_cast<std::uint8_t>(codec_.ManagedSystemId() >> (8 * i));
    }
    // One packet, unanswered: a BMC that misses it drops the session by itself after a minute.
    socket_.Send(
        codec_.Request(sequence_ + 1, FreeRqSeq(), kNetFnApplication, 0, kCloseSession, id));
}

// --- Opening ----------------------------------------------------------------------------------

void LanSession::BeginAttempt() {
    const rmcpplus::CipherSuite* suite =
        suite_ < options_.cipherSuites.size()
            ? rmcpplus::FindCipherSuite(options_.cipherSuites[suite_])
            : nullptr;
    if (suite == nullptr) {
        Fail(IPMI_ERR_CIPHER_SUITE_ID_UNAVAILABLE);
        return;
    }
    codec_.Begin(*suite);
    rakp1Repeated_ = false;
    sequence_ = acknowledged_ = 0;
    outstanding_.clear();
    received_ = {};
    state_ =
        options_.skipCapabilities || attempts_ > 0 ? State::kOpenSession : State::kCapabilities;
    SendSetup();
}

void LanSession::SendSetup() {
    ++tag_;
    setupTries_ = 0;
    switch (state_) {
        case State::kCapabilities:
            setupPacket_ = codec_.AuthenticationCapabilitiesRequest(tag_ & 0x3F);
            break;
        case State::kOpenSession:
            setupPacket_ = codec_.OpenSessionRequest(tag_);
            break;
        case State::kRakp1:
            setupPacket_ = codec_.Rakp1(tag_);
            break;
        case State::kRakp3:
            setupPacket_ = codec_.Rakp3(tag_);
            break;
        case State::kPrivilege: {
            const std::array<std::uint8_t, 1> level{codec_.Privilege()};
            setupPacket_ = codec_.Request(++sequence_, tag_ & 0x3F, kNetFnApplication, 0,
                                          kSetSessionPrivilegeLevel, level);
            break;
        }
        case State::kReady:
        case State::kFailed:
            return;
    }
    if (setupPacket_.empty()) {
        Fail(IPMI_ERR_INTERNAL_ERROR);
        return;
    }
    socket_.Send(setupPacket_);
    setupTimer_ = Clock::now() + kFirstSetupWait;
}

void LanSession::Fail(int error) {
    state_ = State::kFailed;
    failure_ = error;
}

void LanSession::FailWithStatus() {
    switch (codec_.LastStatus()) {
        case RMCPPLUS_STATUS_INSUFFICIENT_RESOURCES_TO_CREATE_A_SESSION:
        case RMCPPLUS_STATUS_INSUFFICIENT_RESOURCES_TO_CREATE_A_SESSION_AT_THE_REQUESTED_TIME:
            Fail(IPMI_ERR_BMC_BUSY);
            return;
        case RMCPPLUS_STATUS_UNAUTHORIZED_NAME:
        case RMCPPLUS_STATUS_INVALID_NAME_LENGTH:
            Fail(IPMI_ERR_USERNAME_INVALID);
            return;
        case RMCPPLUS_STATUS_INVALID_ROLE:
        case RMCPPLUS_STATUS_UNAUTHORIZED_ROLE_OR_PRIVILEGE_LEVEL_REQUESTED:
            Fail(IPMI_ERR_PRIVILEGE_LEVEL_CANNOT_BE_OBTAINED);
            return;
        case RMCPPLUS_STATUS_INVALID_INTEGRITY_CHECK_VALUE:
            Fail(IPMI_ERR_PASSWORD_INVALID);
            return;
        default:
            Fail(IPMI_ERR_BAD_RMCPPLUS_STATUS_CODE);
    }
}

void LanSession::RestartAttempt(int otherwise) {
    if (++attempts_ >= kMostAttempts) {
        Fail(otherwise);
        return;
    }
    BeginAttempt();
}

void LanSession::HandleOpenSession(std::span<const std::uint8_t> packet) {
    switch (codec_.ParseOpenSession(packet, tag_)) {
        case rmcpplus::Check::kNotOurs:
            return;
        case rmcpplus::Check::kGood:
            state_ = State::kRakp1;
            SendSetup();
            return;
        case rmcpplus::Check::kForged:
            Fail(IPMI_ERR_IPMI_ERROR);  // other algorithms than were asked for: not believed
            return;
        case rmcpplus::Check::kStatus:
            break;
    }
    switch (codec_.LastStatus()) {
        case RMCPPLUS_STATUS_INVALID_AUTHENTICATION_ALGORITHM:
        case RMCPPLUS_STATUS_INVALID_INTEGRITY_ALGORITHM:
        case RMCPPLUS_STATUS_NO_MATCHING_AUTHENTICATION_PAYLOAD:
        case RMCPPLUS_STATUS_NO_MATCHING_INTEGRITY_PAYLOAD:
        case RMCPPLUS_STATUS_INVALID_CONFIDENTIALITY_ALGORITHM:
        case RMCPPLUS_STATUS_NO_CIPHER_SUITE_MATCH_WITH_PROPOSED_SECURITY_ALGORITHMS:
            // The next suite that the user allows; BeginAttempt fails when there is none.
            ++suite_;
            ++attempts_;
            BeginAttempt();
            return;
        default:
            FailWithStatus();
    }
}

void LanSession::FailRakp3(int error) {
    // After a repeated RAKP 1 the two sides may hold different random numbers.
    if (rakp1Repeated_) {
        RestartAttempt(error);
    } else {
        Fail(error);
    }
}

void LanSession::HandleSetup(std::span<const std::uint8_t> packet) {
    switch (state_) {
        case State::kCapabilities: {
            const auto found = codec_.ParseAuthenticationCapabilities(packet, tag_ & 0x3F);
            if (!found) return;
            if (!found->ipmi20) {
                Fail(IPMI_ERR_IPMI_2_0_UNAVAILABLE);
                return;
            }
            state_ = State::kOpenSession;
            SendSetup();
            return;
        }
        case State::kOpenSession:
            HandleOpenSession(packet);
            return;
        case State::kRakp1:
            switch (codec_.ParseRakp2(packet, tag_)) {
                case rmcpplus::Check::kNotOurs:
                    return;
                case rmcpplus::Check::kGood:
                    state_ = State::kRakp3;
                    SendSetup();
                    return;
                case rmcpplus::Check::kStatus:
                    FailWithStatus();
                    return;
                case rmcpplus::Check::kForged:
                    Fail(IPMI_ERR_PASSWORD_INVALID);
                    return;
            }
            return;
        case State::kRakp3:
            switch (codec_.ParseRakp4(packet, tag_)) {
                case rmcpplus::Check::kNotOurs:
                    return;
                case rmcpplus::Check::kGood:
                    state_ = State::kPrivilege;
                    SendSetup();
                    return;
                case rmcpplus::Check::kStatus:
                    FailRakp3(IPMI_ERR_PASSWORD_INVALID);
                    return;
                case rmcpplus::Check::kForged:
                    // The password has passed with RAKP 2; what is new here is the BMC's key.
                    FailRakp3(IPMI_ERR_K_G_INVALID);
                    return;
            }
            return;
        case State::kPrivilege: {
            const auto answer = codec_.ParseAnswer(packet);
            if (!answer || answer->command != kSetSessionPrivilegeLevel) return;
            if (answer->response[0] != 0) {
                Fail(IPMI_ERR_PRIVILEGE_LEVEL_CANNOT_BE_OBTAINED);
                return;
            }
            acknowledged_ = 1;
            received_.IsNew(answer->sequence);
            state_ = State::kReady;
            return;
        }
        case State::kReady:
        case State::kFailed:
            return;
    }
}

void LanSession::HandleSetupTimer(Clock::time_point now) {
    if (now >= setupDeadline_) {
        Fail(IPMI_ERR_CONNECTION_TIMEOUT);
        return;
    }
    if (now < setupTimer_) return;
    if (socket_.Refused() && setupTries_ > 0) {
        Fail(IPMI_ERR_CONNECTION_TIMEOUT);  // twice told that nothing listens there
        return;
    }
    ++setupTries_;
    if (state_ == State::kRakp1) rakp1Repeated_ = true;
    if (state_ == State::kPrivilege) {
        const std::array<std::uint8_t, 1> level{codec_.Privilege()};
        if (sequence_ < acknowledged_ + kSequencesAhead) ++sequence_;
        setupPacket_ = codec_.Request(sequence_, tag_ & 0x3F, kNetFnApplication, 0,
                                      kSetSessionPrivilegeLevel, level);
    }
    socket_.Send(setupPacket_);
    setupTimer_ = now + kFirstSetupWait * (1U << std::min(setupTries_, 2U));
}

void LanSession::OpenAll(const std::vector<LanSession*>& sessions) {
    const auto opening = [](const LanSession* s) {
        return s->state_ != State::kReady && s->state_ != State::kFailed;
    };
    while (std::any_of(sessions.begin(), sessions.end(), opening)) {
        std::vector<pollfd> fds;
        const auto now = Clock::now();
        auto until = now + std::chrono::minutes(1);
        for (const LanSession* s : sessions) {
            if (!opening(s)) continue;
            fds.push_back({s->socket_.fd(), POLLIN, 0});
            until = std::min({until, s->setupTimer_, s->setupDeadline_});
        }
        poll(fds.data(), fds.size(), PollTime(until, now));
        for (LanSession* s : sessions) {
            while (opening(s)) {
                const auto packet = s->socket_.Receive();
                if (!packet) break;
                s->HandleSetup(*packet);
            }
            if (opening(s)) s->HandleSetupTimer(Clock::now());
        }
    }
    for (const LanSession* s : sessions) {
        if (s->state_ == State::kFailed) throw SourceError(ErrorAdvice(s->name_, s->failure_));
    }
}

bool LanSession::Reopen() {
    if (reopened_) return false;
    reopened_ = true;
    attempts_ = 1;
    setupDeadline_ = Clock::now() + options_.timeout;
    BeginAttempt();
    try {
        OpenAll({this});
    } catch (const SourceError&) {
        return false;
    }
    return true;
}

// --- Requests ---------------------------------------------------------------------------------

std::uint8_t LanSession::FreeRqSeq() {
    // Round robin; the number of a request that was sent more than once rests for a while, since
    // the answers to its other tries may still come.
    const auto now = Clock::now();
    std::uint8_t fallback = lastRqSeq_;
    for (unsigned step = 1; step <= rqSeqFree_.size(); ++step) {
        const auto candidate = static_cast<std::uint8_t>((lastRqSeq_ + step) % rqSeqFree_.size());
        if (outstanding_.count(candidate) != 0) continue;
        fallback = candidate;
        if (rqSeqFree_[candidate] <= now) break;
    }
    return lastRqSeq_ = fallback;
}

void LanSession::SendTry(std::uint8_t rqSeq, Outstanding* request) {
    // Never further ahead than a BMC's window reaches; there the last packet goes out once more.
    if (request->packet.empty() || sequence_ < acknowledged_ + kSequencesAhead) {
        ++sequence_;
        request->packet = codec_.Request(sequence_, rqSeq, request->ask.netFn, request->ask.lun,
                                         request->ask.command, request->ask.data);
        if (request->tries == 0) request->firstSequence = sequence_;
    }
    request->lastSent = Clock::now();
    if (request->tries == 0) {
        request->firstSent = request->lastSent;
        request->wait = roundTrip_.RetryTime();
    } else {
        request->wait *= 2;
    }
    ++request->tries;
    request->overtaken = 0;
    request->lastSerial = ++serial_;
    socket_.Send(request->packet);
}

std::uint8_t LanSession::Send(const Ask& ask, bool wanted) {
    const std::uint8_t rqSeq = FreeRqSeq();
    Outstanding request;
    request.ask = ask;
    request.wanted = wanted;
    request.alone = outstanding_.empty();
    SendTry(rqSeq, &request);
    outstanding_.emplace(rqSeq, std::move(request));
    return rqSeq;
}

bool LanSession::MayGuess(bool again) const {
    // What is waited for keeps a number of its own for every try: a BMC drops the second packet of
    // one number, although the answer to the first was lost.
    const bool retrying = std::any_of(outstanding_.begin(), outstanding_.end(), [](const auto& e) {
        return e.second.wanted && e.second.tries > 1;
    });
    const std::uint32_t kept = again || retrying ? kTriesBeforeReopening : 0;
    return sequence_ + kept < acknowledged_ + kSequencesAhead;
}

void LanSession::FillWindow() {
    const unsigned size = window_.Size();
    if (outstanding_.size() >= size || askedAgain_ > 0) return;
    // As many as could be missing: those that are out or ready are passed over below.
    for (const Ask& ask : readAhead_.Next(size + ready_.size())) {
        if (outstanding_.size() >= size) return;
        if (!MayGuess(false)) return;
        if (ready_.size() >= kReadyAhead) return;
        if (ready_.count(ask) != 0) continue;
        const bool isOut =
            std::any_of(outstanding_.begin(), outstanding_.end(),
                        [&ask](const auto& entry) { return entry.second.ask == ask; });
        if (!isOut) Send(ask, false);
    }
}

void LanSession::HandleAnswer(const rmcpplus::Answer& answer) {
    if (!received_.IsNew(answer.sequence)) return;  // a replay
    const auto found = outstanding_.find(answer.rqSeq);
    if (found == outstanding_.end() || found->second.ask.netFn != answer.netFn ||
        found->second.ask.command != answer.command) {
        return;  // a second answer to a request that was sent twice, or nobody's
    }
    const Outstanding request = std::move(found->second);
    outstanding_.erase(found);
    const auto now = Clock::now();
    acknowledged_ = std::max(acknowledged_, request.firstSequence);
    if (request.tries == 1) {
        roundTrip_.Measured(
            std::chrono::duration_cast<RoundTrip::Duration>(now - request.firstSent));
        // Of several tries nobody knows which was answered, nor what that has overtaken.
        for (auto& [rqSeq, other] : outstanding_) {
            if (other.lastSerial < request.lastSerial) ++other.overtaken;
        }
    } else {
        rqSeqFree_[answer.rqSeq] = now + kRqSeqQuarantine;
    }
    const std::uint8_t code = answer.response[0];
    if (IsBusy(code)) {
        window_.Lost(request.lastSerial, serial_);
        // Busy with what was sent beside it, perhaps: asked again when that is through.
        if (request.wanted && !(request.alone && request.tries == 1) &&
            askedAgain_ < kMostAskedAgain) {
            ++askedAgain_;
            return;
        }
    } else {
        window_.Answered();
    }
    readAhead_.Answered(request.ask, answer.response);
    if (request.wanted) {
        wantedAnswer_ = answer.response;
    } else if (code == 0) {
        ready_[request.ask] = answer.response;
    }
}

void LanSession::Receive() {
    while (const auto packet = socket_.Receive()) {
        if (const auto answer = codec_.ParseAnswer(*packet)) HandleAnswer(*answer);
    }
}

void LanSession::HandleRetries(Clock::time_point now) {
    for (auto at = outstanding_.begin(); at != outstanding_.end();) {
        Outstanding& request = at->second;
        const bool timeIsUp = now >= request.lastSent + request.wait;
        const bool overtaken = request.tries == 1 && request.overtaken >= kOvertakenBeforeRetry;
        if (!timeIsUp && !overtaken) {
            ++at;
            continue;
        }
        window_.Lost(request.lastSerial, serial_);
        // A guess is worth one retry; the one that is waited for, all of them.
        const bool again =
            request.wanted ? request.tries < kMostTries : request.tries < 2 && MayGuess(true);
        if (!again) {
            rqSeqFree_[at->first] = now + kRqSeqQuarantine;
            at = request.wanted ? std::next(at) : outstanding_.erase(at);
        } else if (ChangesTheBmc(request.ask) && sequence_ < acknowledged_ + kSequencesAhead) {
            rqSeqFree_[at->first] = now + kRqSeqQuarantine;
            Outstanding moved = std::move(request);
            at = outstanding_.erase(at);
            const std::uint8_t rqSeq = FreeRqSeq();
            SendTry(rqSeq, &moved);
            outstanding_.emplace(rqSeq, std::move(moved));
        } else {
            SendTry(at->first, &request);
            ++at;
        }
    }
}

Clock::time_point LanSession::NextTimer() const {
    auto next = Clock::now() + std::chrono::minutes(1);
    for (const auto& [rqSeq, request] : outstanding_) {
        next = std::min(next, request.lastSent + request.wait);
    }
    return next;
}

std::optional<Response> LanSession::WaitFor(const Ask& ask, Clock::time_point deadline) {
    wantedAnswer_.reset();
    askedAgain_ = 0;
    const auto isOurs = [&ask](const auto& entry) { return entry.second.ask == ask; };
    auto found = std::find_if(outstanding_.begin(), outstanding_.end(), isOurs);
    if (found != outstanding_.end()) {
        found->second.wanted = true;
    } else {
        Send(ask, true);
    }
    for (;;) {
        FillWindow();
        Receive();
        if (wantedAnswer_) return std::exchange(wantedAnswer_, std::nullopt);
        found = std::find_if(outstanding_.begin(), outstanding_.end(), isOurs);
        if (found == outstanding_.end() && outstanding_.empty()) Send(ask, true);
        const auto now = Clock::now();
        if (now >= deadline || Stopped() != StopReason::kNone) return std::nullopt;
        if (found != outstanding_.end() && found->second.tries >= kTriesBeforeReopening &&
            !reopened_) {
            return std::nullopt;
        }
        if (found != outstanding_.end() && found->second.tries >= kMostTries &&
            now >= found->second.lastSent + found->second.wait) {
            return std::nullopt;
        }
        HandleRetries(now);
        pollfd fd{socket_.fd(), POLLIN, 0};
        poll(&fd, 1, PollTime(std::min(deadline, NextTimer()), now));
    }
}

void LanSession::DropStaleAnswers() {
    if (ready_.size() < kReadyLimit) return;
    const std::vector<Ask> coming = readAhead_.Next(kReadyLimit);
    std::erase_if(ready_, [&coming](const auto& entry) {
        return std::find(coming.begin(), coming.end(), entry.first) == coming.end();
    });
}

std::optional<Response> LanSession::Exchange(const Ask& ask) {
    if (state_ != State::kReady) return std::nullopt;
    readAhead_.Asked(ask);
    DropStaleAnswers();
    if (const auto ready = ready_.find(ask); ready != ready_.end()) {
        Response response = std::move(ready->second);
        ready_.erase(ready);
        // While there is plenty, the socket can wait: packets come and go by the handful.
        if (ready_.size() < kReadyAhead / 2) {
            Receive();
            FillWindow();
        }
        return response;
    }
    const auto deadline = std::min(Clock::now() + options_.timeout, StopTime());
    auto answer = WaitFor(ask, deadline);
    if (!answer && Clock::now() < deadline && Stopped() == StopReason::kNone && Reopen())
        answer = WaitFor(ask, deadline);
    if (!answer) {
        // What is still out is nobody's any more, and a late answer to it is not believed.
        for (const auto& [rqSeq, request] : outstanding_) {
            rqSeqFree_[rqSeq] = Clock::now() + kRqSeqQuarantine;
        }
        outstanding_.clear();
    }
    return answer;
}

}  // namespace tqrhost
