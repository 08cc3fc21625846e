#include "host/spdriver/lan/session_opening.h"

#include <algorithm>
#include <array>
#include <utility>

namespace tqrhost {
namespace {

using rmcpplus::Check;
namespace status = rmcpplus::status;

constexpr unsigned kMaxAttempts = 4;
constexpr std::uint8_t kSixBits = 0x3F;  // of rqSeq

/// Whether a BMC that refuses so may accept another suite. What speaks of the user or of the BMC's
/// resources is final: a BMC may lock a user out after a few failures.
bool MayBeTheSuite(std::uint8_t code) {
    switch (code) {
        case status::kNoResources:
        case status::kNoResourcesForRole:
        case status::kInvalidRole:
        case status::kUnauthorizedRole:
        case status::kInvalidNameLength:
        case status::kUnauthorizedName:
            return false;
        default:
            return true;
    }
}

bool NamesTheSuite(std::uint8_t code) {
    switch (code) {
        case status::kInvalidAuthenticationAlgorithm:
        case status::kInvalidIntegrityAlgorithm:
        case status::kNoMatchingAuthenticationPayload:
        case status::kNoMatchingIntegrityPayload:
        case status::kInvalidConfidentialityAlgorithm:
        case status::kNoCipherSuiteMatch:
            return true;
        default:
            return false;
    }
}

}  // namespace

SessionOpening::SessionOpening(const rmcpplus::Credentials& credentials, Options options)
    : credentials_(credentials), options_(std::move(options)) {}

SessionOpening::State SessionOpening::state() const {
    if (step_ == Step::kOpen) return State::kOpen;
    return step_ == Step::kFailed ? State::kFailed : State::kOpening;
}

SessionOpening::Session SessionOpening::TakeSession() { return std::move(session_); }

void SessionOpening::TakePackets(std::vector<rmcpplus::Packet>* packets) {
    packets->insert(packets->end(), toSend_.begin(), toSend_.end());
    toSend_.clear();
}

void SessionOpening::Fail(OpeningError error) {
    step_ = Step::kFailed;
    error_ = error;
}

void SessionOpening::BeginAttempt(Clock::time_point now) {
    const rmcpplus::CipherSuite* suite =
        suite_ < options_.cipherSuites.size()
            ? rmcpplus::FindCipherSuite(options_.cipherSuites[suite_])
            : nullptr;
    if (suite == nullptr) {
        Fail(OpeningError::kNoCipherSuite);
        return;
    }
    session_.codec = std::make_unique<rmcpplus::Codec>(credentials_, *suite);
    session_.sequence = 0;
    session_.received = {};
    rakp1Repeated_ = false;
    Enter(Step::kOpenSession, now);
}

void SessionOpening::RestartAttempt(OpeningError otherwise, Clock::time_point now) {
    if (++attempts_ >= kMaxAttempts) {
        Fail(otherwise);
    } else {
        BeginAttempt(now);
    }
}

rmcpplus::Packet SessionOpening::PrivilegeRequest() {
    rmcpplus::Packet packet;
    session_.codec->WriteRequest(
        ++session_.sequence, tag_ & kSixBits,
        ipmi::MakeCommand(ipmi::kSetSessionPrivilegeLevel, {credentials_.privilege}), &packet);
    return packet;
}

void SessionOpening::Enter(Step step, Clock::time_point now) {
    step_ = step;
    ++tag_;
    tries_ = 0;
    sentAt_ = now;
    SendStep(now);
}

void SessionOpening::SendStep(Clock::time_point now) {
    switch (step_) {
        case Step::kOpenSession:
            // Once: a BMC that takes one packet at a time would drop the second every time.
            if (!credentials_.deviations.capabilities && !options_.again && attempts_ == 0 &&
                tries_ == 0) {
                toSend_.push_back(rmcpplus::AuthenticationCapabilitiesRequest(
                    credentials_.privilege, tag_ & kSixBits));
            }
            toSend_.push_back(session_.codec->OpenSessionRequest(tag_));
            break;
        case Step::kRakp1:
            toSend_.push_back(session_.codec->Rakp1(tag_));
            break;
        case Step::kRakp3:
            toSend_.push_back(session_.codec->Rakp3(tag_));
            break;
        case Step::kPrivilege:
            toSend_.push_back(PrivilegeRequest());
            break;
        case Step::kOpen:
        case Step::kFailed:
            return;
    }
    // A BMC needs its time for the codes; a repeated RAKP 1 may cost the attempt.
    using std::chrono::milliseconds;
    CommandTiming::Duration wait = milliseconds(500);
    if (session_.roundTrip) {
        wait = std::clamp<CommandTiming::Duration>(8 * *session_.roundTrip, milliseconds(250),
                                                   milliseconds(1000));
    }
    retryAt_ = now + std::min<CommandTiming::Duration>(wait * (1 << std::min(tries_, 3U)),
                                                       milliseconds(2000));
    ++tries_;
}

void SessionOpening::MeasureRoundTrip(Clock::time_point now) {
    if (tries_ > 1) return;
    const auto time = std::chrono::duration_cast<CommandTiming::Duration>(now - sentAt_);
    session_.roundTrip = std::min(session_.roundTrip.value_or(time), time);
}

// --- Answers ----------------------------------------------------------------------------------

void SessionOpening::Handle(ByteView packet, Clock::time_point now) {
    switch (step_) {
        case Step::kOpenSession:
            HandleCapabilities(packet, now);
            if (step_ == Step::kOpenSession) HandleOpenSession(packet, now);
            return;
        case Step::kRakp1:
            HandleRakp2(packet, now);
            return;
        case Step::kRakp3:
            HandleRakp4(packet, now);
            return;
        case Step::kPrivilege:
            HandlePrivilege(packet);
            return;
        case Step::kOpen:
        case Step::kFailed:
            return;
    }
}

void SessionOpening::HandleCapabilities(ByteView packet, Clock::time_point now) {
    const auto found = rmcpplus::ParseAuthenticationCapabilities(packet, tag_ & kSixBits,
                                                                 credentials_.deviations.checksums);
    if (!found) return;
    if (!found->ipmi20) {
        Fail(OpeningError::kNoIpmi20);
        return;
    }
    MeasureRoundTrip(now);
    constexpr std::chrono::milliseconds kLeast{50};
    if (!session_.roundTrip) return;
    retryAt_ = std::min(retryAt_,
                        now + std::max<CommandTiming::Duration>(4 * *session_.roundTrip, kLeast));
}

void SessionOpening::HandleOpenSession(ByteView packet, Clock::time_point now) {
    const Check check = session_.codec->ParseOpenSession(packet, tag_);
    if (check == Check::kNotOurs) return;
    if (check == Check::kGood) {
        MeasureRoundTrip(now);
        Enter(Step::kRakp1, now);
        return;
    }
    // Forged: other algorithms than were asked for, which are not believed.
    const std::uint8_t code = session_.codec->LastStatus();
    const bool another = suite_ + 1 < options_.cipherSuites.size();
    if (check == Check::kStatus ? NamesTheSuite(code) || (another && MayBeTheSuite(code))
                                : another) {
        ++suite_;
        ++attempts_;
        BeginAttempt(now);
    } else if (check == Check::kForged) {
        Fail(OpeningError::kProtocolBroken);
    } else {
        FailWithStatus();
    }
}

void SessionOpening::FailWithStatus() {
    switch (session_.codec->LastStatus()) {
        case status::kNoResources:
        case status::kNoResourcesForRole:
            Fail(OpeningError::kBusy);
            return;
        case status::kUnauthorizedName:
        case status::kInvalidNameLength:
            Fail(OpeningError::kUserUnknown);
            return;
        case status::kInvalidRole:
        case status::kUnauthorizedRole:
            Fail(OpeningError::kPrivilegeRefused);
            return;
        case status::kInvalidIntegrityCheckValue:
            Fail(OpeningError::kPasswordWrong);
            return;
        default:
            Fail(OpeningError::kRefused);
    }
}

void SessionOpening::HandleRakp2(ByteView packet, Clock::time_point now) {
    switch (session_.codec->ParseRakp2(packet, tag_)) {
        case Check::kNotOurs:
            return;
        case Check::kGood:
            Enter(Step::kRakp3, now);
            return;
        case Check::kStatus:
            FailWithStatus();
            return;
        case Check::kForged:
            Fail(OpeningError::kPasswordWrong);
            return;
    }
}

void SessionOpening::HandleRakp4(ByteView packet, Clock::time_point now) {
    const Check check = session_.codec->ParseRakp4(packet, tag_);
    if (check == Check::kNotOurs) return;
    if (check == Check::kGood) {
        Enter(Step::kPrivilege, now);
        return;
    }
    // The password has passed with RAKP 2; what is new in the check value is the BMC's key.
    const OpeningError error =
        check == Check::kStatus ? OpeningError::kPasswordWrong : OpeningError::kKgWrong;
    // After a repeated RAKP 1 the two sides may hold different random numbers.
    if (rakp1Repeated_) {
        RestartAttempt(error, now);
    } else {
        Fail(error);
    }
}

void SessionOpening::HandlePrivilege(ByteView packet) {
    const auto answer = session_.codec->ParseAnswer(packet);
    if (!answer || answer->command != ipmi::kSetSessionPrivilegeLevel) return;
    if (!credentials_.deviations.sessionNumbers && !session_.received.IsNew(answer->sequence)) {
        badNumber_ = true;
        return;
    }
    if (answer->response[0] == ipmi::kCompleted) {
        step_ = Step::kOpen;
    } else {
        Fail(OpeningError::kPrivilegeRefused);
    }
}

void SessionOpening::HandleRefusal(Clock::time_point now) {
    refused_ = true;
    constexpr std::chrono::milliseconds kAskedAgain{100};
    if (!options_.again) retryAt_ = std::min<Clock::time_point>(retryAt_, now + kAskedAgain);
}

// --- Time -------------------------------------------------------------------------------------

OpeningError SessionOpening::WhatSilenceMeans() const {
    if (refused_) return OpeningError::kPortClosed;
    if (badNumber_) return OpeningError::kSessionNumbers;
    if (step_ == Step::kRakp1 || step_ == Step::kRakp3) return OpeningError::kSilentAtPassword;
    return OpeningError::kNoAnswer;
}

void SessionOpening::HandleTimer(Clock::time_point now) {
    if (state() != State::kOpening) return;
    if (now >= options_.deadline) {
        Fail(WhatSilenceMeans());
    } else if (now >= retryAt_) {
        // Twice told that nobody listens there.
        if (refused_ && tries_ > 1 && !options_.again) {
            Fail(OpeningError::kPortClosed);
        } else {
            rakp1Repeated_ |= step_ == Step::kRakp1;
            SendStep(now);
        }
    }
}

Clock::time_point SessionOpening::NextTimer() const {
    return state() == State::kOpening ? std::min(retryAt_, options_.deadline)
                                      : Clock::time_point::max();
}

}  // namespace tqrhost
