#include "host/spdriver/lan/session_requests.h"

#include <algorithm>
#include <iterator>
#include <utility>

#include "base/bytes.h"

namespace tqrhost {
namespace {

constexpr unsigned kMaxAskedAgain = 3;
constexpr unsigned kMaxProbes = 8;

bool IsBusy(std::uint8_t completionCode) {
    return completionCode == ipmi::kNodeBusy || completionCode == ipmi::kCommandTimeout ||
           completionCode == ipmi::kDuplicateRequest;
}

/// Of a reservation only the last counts (IPMI 2.0, clause 33.11): an answer to an earlier try
/// names one that a later try has cancelled.
bool ChangesTheBmc(const ipmi::Command& command) {
    return command.code() == ipmi::kReserveSdrRepository || command.code() == ipmi::kReserveSel;
}

/// Records of the event log carry their ID (IPMI 2.0, table 32-1): of an answer that may be a late
/// one to an earlier request, it tells.
bool IsOfAnotherRecord(const ipmi::Command& command, ByteView response) {
    if (command.code() != ipmi::kGetSelEntry) return false;
    const auto read = ipmi::RecordRead::Parse(command.data);
    if (!read || read->IsOfFirst() || read->recordId == ipmi::kLastRecordId || read->offset != 0) {
        return false;
    }
    ipmisel::ByteReader in(ipmi::RecordIn(response));
    const std::uint16_t id = in.U16();
    return in.ok() && id != read->recordId;
}

}  // namespace

void SessionRequests::Submit(ipmi::Command command, Handler handler) {
    Request request;
    request.id = ++lastId_;
    request.command = std::move(command);
    request.handler = std::move(handler);
    waiting_.push_back(std::move(request));
}

std::size_t SessionRequests::Outstanding() const {
    return static_cast<std::size_t>(std::count_if(active_.begin(), active_.end(),
                                                  [](const Request& r) { return r.outstanding; }));
}

std::size_t SessionRequests::Room() const {
    const std::size_t taken = Pending();
    const std::size_t size = window_.Size();
    return codec_ != nullptr && size > taken ? size - taken : 0;
}

void SessionRequests::Start(rmcpplus::Codec* codec, std::uint32_t sequence,
                            const ReceivedNumbers& received,
                            std::optional<CommandTiming::Duration> roundTrip,
                            Clock::time_point now) {
    codec_ = codec;
    numbers_.Restart(sequence);
    received_ = received;
    timings_.Opened(roundTrip);
    tries_.Clear();
    for (Request& request : active_) {
        request.outstanding = false;
        request.tries = 0;
    }
    lastHeard_ = now;
}

const SessionRequests::Request* SessionRequests::OldestOutstanding() const {
    const auto found = std::find_if(active_.begin(), active_.end(),
                                    [](const Request& request) { return request.outstanding; });
    return found == active_.end() ? nullptr : &*found;
}

SessionRequests::Request* SessionRequests::Find(std::uint64_t id) {
    const auto found = std::find_if(active_.begin(), active_.end(),
                                    [id](const Request& request) { return request.id == id; });
    return found == active_.end() ? nullptr : &*found;
}

// --- Answers ----------------------------------------------------------------------------------

void SessionRequests::Handle(const rmcpplus::Answer& answer, Clock::time_point now) {
    if (!options_.anySessionNumber && !received_.IsNew(answer.sequence)) {
        const Try& said = tries_[answer.rqSeq];
        if (said.request && Find(*said.request) != nullptr) ++repeated_;
        return;
    }
    lastHeard_ = now;
    probes_ = 0;
    Try& said = tries_[answer.rqSeq];
    Request* const request = said.request ? Find(*said.request) : nullptr;
    if (request == nullptr || request->command.code() != answer.command) return;
    if (ChangesTheBmc(request->command) && answer.rqSeq != request->lastRqSeq) return;
    if (said.owed && IsOfAnotherRecord(request->command, answer.response)) return;
    const Try answered = said;
    numbers_.Acknowledge(answered.sequence);
    CommandTiming& timing = timings_.Of(request->command);
    const auto took = std::chrono::duration_cast<CommandTiming::Duration>(now - answered.sentAt);
    const Delay delay = answered.shared ? Delay::kQueued : timing.Measured(took, answered.alone);
    for (Request& other : active_) {
        if (other.outstanding && other.command.code() == answer.command &&
            other.lastSent + timing.Disorder() < answered.sentAt) {
            MarkLost(&other);
        }
    }
    tries_.GiveUp(request->id, answer.rqSeq % RqSeqTable::kCount, now + RestOf(*request));
    if (IsBusy(answer.response[0])) {
        window_.Lost(answered.serial, serial_);
        if (AskAgainAlone(request, answered.alone)) return;
    } else {
        window_.Answered(delay, answered.serial, serial_);
    }
    const Handler handler = std::move(request->handler);
    active_.erase(active_.begin() + (request - active_.data()));
    handler(Response(answer.response.begin(), answer.response.end()));
}

/// How long an answer to a try that was given up may still come.
CommandTiming::Duration SessionRequests::RestOf(const Request& request) const {
    constexpr std::chrono::seconds kLeast{1};
    return std::max<CommandTiming::Duration>(8 * timings_.Of(request.command).RetryTime(), kLeast);
}

/// Busy with what was sent beside it, perhaps: asked again when that is through.
bool SessionRequests::AskAgainAlone(Request* request, bool alone) {
    if (alone || request->busy >= kMaxAskedAgain) return false;
    ++request->busy;
    request->outstanding = false;
    request->tries = 0;
    return true;
}

// --- Sending ----------------------------------------------------------------------------------

void SessionRequests::MarkLost(Request* request) {
    request->outstanding = false;
    window_.Lost(request->lastSerial, serial_);
}

void SessionRequests::Fail(const std::vector<Request>& requests) {
    for (const Request& request : requests) {
        request.handler(std::nullopt);
    }
}

void SessionRequests::FailOverdue(Clock::time_point now) {
    const auto overdue = std::stable_partition(
        active_.begin(), active_.end(),
        [&](const Request& request) { return now < *request.firstSent + options_.timeout; });
    if (overdue == active_.end()) return;
    std::vector<Request> failed(std::make_move_iterator(overdue),
                                std::make_move_iterator(active_.end()));
    active_.erase(overdue, active_.end());
    for (const Request& request : failed) {
        heardNothing_ |= lastHeard_ <= *request.firstSent;
        tries_.GiveUp(request.id, std::nullopt, now + RestOf(request));
    }
    Fail(failed);
}

void SessionRequests::FindLost(Clock::time_point now) {
    const Request* const oldest = OldestOutstanding();
    if (oldest == nullptr) return;
    if (now >= oldest->retryAt && IsSilent(*oldest)) {
        timings_.Of(oldest->command).BackOff(oldest->lastSerial, serial_);
        for (Request& request : active_) request.outstanding = false;
        window_.Stalled(serial_);
        probes_ = std::clamp(2 * probes_, 1U, kMaxProbes);
        return;
    }
    for (Request& request : active_) {
        if (!request.outstanding || now < request.retryAt || IsSilent(request)) continue;
        timings_.Of(request.command).BackOff(request.lastSerial, serial_);
        MarkLost(&request);
    }
}

/// How far ahead of what the BMC has acknowledged a new number may be.
unsigned SessionRequests::Ahead(bool first) const {
    constexpr unsigned kSafe = SendWindow::kLargestUnproven;
    return first && window_.IsUnbroken() ? std::max(window_.Size(), kSafe) : kSafe;
}

bool SessionRequests::SendTry(Request* request, Clock::time_point now,
                              std::vector<rmcpplus::Packet>* packets) {
    const bool first = request->tries == 0;
    auto rqSeq = tries_.Free(now);
    const bool shared = !rqSeq;
    if (shared) {
        outOfNumbers_ = first;
        if (first) return false;
        rqSeq = request->lastRqSeq;
    }
    // Past what the controller is known to take, a try goes out under the number of the first,
    // which is taken if that was lost; of the two oldest every second under a new one, for when its
    // answer was.
    const bool isOldest = !active_.empty() && request == &active_.front();
    const bool isNext = active_.size() > 1 && request == &active_[1];
    const bool fresh = numbers_.HasRoom(Ahead(first)) || (isOldest && request->tries % 2 == 0) ||
                       (isNext && request->tries % 2 == 1);
    if (first && !fresh && Outstanding() > 0) return false;
    const bool alone = Outstanding() == 0 && first;
    const std::uint32_t sequence = first || fresh ? numbers_.Next() : request->firstSequence;
    if (first) request->firstSequence = sequence;
    const bool owed = tries_[*rqSeq].owed;
    tries_[*rqSeq] = {request->id, sequence, ++serial_, now, {}, alone, owed, shared};
    request->lastRqSeq = *rqSeq;
    request->lastSerial = serial_;
    request->lastSent = now;
    if (!request->firstSent) request->firstSent = now;
    request->retryAt = now + timings_.Of(request->command).RetryTime();
    request->outstanding = true;
    ++request->tries;
    packets->emplace_back();
    codec_->WriteRequest(sequence, *rqSeq, request->command, &packets->back());
    return true;
}

void SessionRequests::Send(Clock::time_point now, std::vector<rmcpplus::Packet>* packets) {
    FailOverdue(now);
    if (codec_ == nullptr) return;
    FindLost(now);
    outOfNumbers_ = false;
    if (active_.empty()) probes_ = 0;
    std::size_t outstanding = Outstanding();
    const std::size_t size = std::max(window_.Size(), probes_);
    bool oneAlone = false;  // that the controller was too busy for
    for (Request& request : active_) {
        oneAlone |= request.busy > 0;
        if (outstanding >= (request.busy > 0 ? 1 : size)) break;
        if (!request.outstanding && SendTry(&request, now, packets)) ++outstanding;
    }
    while (!oneAlone && probes_ == 0 && outstanding < size && !waiting_.empty()) {
        if (!SendTry(&waiting_.front(), now, packets)) break;
        active_.push_back(std::move(waiting_.front()));
        waiting_.pop_front();
        ++outstanding;
    }
}

Clock::time_point SessionRequests::NextTimer(Clock::time_point now) const {
    if (Pending() == 0) return Clock::time_point::max();
    auto next = Clock::time_point::max();
    if (codec_ != nullptr && !waiting_.empty() && active_.empty()) next = now;
    constexpr std::chrono::milliseconds kNumbersRest{100};
    if (outOfNumbers_) next = now + kNumbersRest;
    const Request* const oldest = OldestOutstanding();
    for (const Request& request : active_) {
        next = std::min(next, *request.firstSent + options_.timeout);
        if (codec_ != nullptr && request.outstanding &&
            (&request == oldest || !IsSilent(request))) {
            next = std::min(next, request.retryAt);
        }
    }
    return next;
}

void SessionRequests::FailAll() {
    std::vector<Request> failed = std::exchange(active_, {});
    failed.insert(failed.end(), std::make_move_iterator(waiting_.begin()),
                  std::make_move_iterator(waiting_.end()));
    waiting_.clear();
    Fail(failed);
}

std::optional<SessionRequests::Silence> SessionRequests::SilentSince() const {
    if (active_.empty()) return std::nullopt;
    const Request& oldest = active_.front();
    return Silence{std::max(lastHeard_, *oldest.firstSent), oldest.tries,
                   timings_.Of(oldest.command).Expected()};
}

}  // namespace tqrhost
