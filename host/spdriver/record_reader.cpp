#include "host/spdriver/record_reader.h"

#include <algorithm>
#include <iterator>
#include <span>
#include <utility>

#include "base/bytes.h"
#include "host/spdriver/controller_memory.h"
#include "ipmi/sdr_record.h"
#include "ipmi/sel_record.h"

namespace tqrhost {
namespace {

// What fits an answer over every interface of a controller, and what then still may.
constexpr std::size_t kFirstPart = 22;
constexpr std::size_t kSmallerParts[] = {16, 8};
constexpr unsigned kMaxReservations = 8;
constexpr unsigned kMaxTries = 2;
// Tries that have not come true yet: those on their way, and a few that never will.
constexpr std::size_t kMaxOpenGuesses = 36;
constexpr std::size_t kGuessesPerHit = 4;

}  // namespace

RecordReader::RecordReader(RequestPipeline* pipeline, ipmi::CommandCode command,
                           std::function<void()> progress)
    : pipeline_(pipeline), command_(command), progress_(std::move(progress)), part_(kFirstPart) {}

void RecordReader::Pump() {
    if (finished_) return;
    Drain();
    if (finished_ || reserving_) return;
    if (!incoming_.contains(position_)) RequestRecord(position_, false);
    Guess();
}

void RecordReader::Guess() {
    // The first record's own ID is not known before it has come.
    std::uint16_t id = position_;
    while (pipeline_->Room() > 0) {
        const auto known = incoming_.find(id);
        if (known == incoming_.end() || known->second.failed) return;
        std::uint16_t next = 0;
        bool isGuess = false;
        if (known->second.headed) {
            next = known->second.next;
        } else {
            if (id == ipmi::kFirstRecordId || id + step_ >= ipmi::kLastRecordId) return;
            next = static_cast<std::uint16_t>(id + step_);
            isGuess = true;
        }
        if (next == ipmi::kLastRecordId || next == ipmi::kFirstRecordId || store_->Find(next))
            return;
        if (!incoming_.contains(next)) {
            if (isGuess && guesses_ - hits_ >= kMaxOpenGuesses + hits_ / kGuessesPerHit) return;
            if (isGuess && (!expected_ || HasRequestedAll())) return;
            RequestRecord(next, isGuess);
        }
        id = next;
    }
}

void RecordReader::RequestRecord(std::uint16_t id, bool isGuess) {
    Incoming& record = incoming_[id];
    record.isGuess = isGuess;
    if (isGuess) ++guesses_;
    RequestAgain(id, &record);
}

void RecordReader::RequestAgain(std::uint16_t id, Incoming* record) {
    ++record->generation;
    record->pending = 0;
    record->headed = record->failed = false;
    record->length = 0;
    record->bytes.clear();
    RequestPart(id, record, 0, whole_ ? ipmi::kWholeRecord : part_);
}

void RecordReader::RequestPart(std::uint16_t id, Incoming* record, std::size_t offset,
                               std::size_t count) {
    ++record->pending;
    const bool isLog = command_ == ipmi::kGetSelEntry;
    const auto offsetByte = static_cast<std::uint8_t>(offset);
    const auto countByte = static_cast<std::uint8_t>(count);
    pipeline_->Submit(isLog ? ipmi::GetSelEntry(id, offsetByte, countByte)
                            : ipmi::GetSdr(id, offsetByte, countByte, reservation_),
                      [self = weak_from_this(), id, generation = record->generation, offset,
                       count](const std::optional<Response>& response) {
                          if (const auto reader = self.lock()) {
                              reader->Answered(id, generation, offset, count, response);
                          }
                      });
}

void RecordReader::Answered(std::uint16_t id, unsigned generation, std::size_t offset,
                            std::size_t count, const std::optional<Response>& response) {
    const auto found = incoming_.find(id);
    if (found != incoming_.end() && found->second.generation == generation) {
        Incoming& record = found->second;
        --record.pending;
        if (!response || response->empty()) {
            record.failed = true;
            record.tries = kMaxTries;  // it has been repeated for as long as a request may be
        } else if (response->front() != ipmi::kCompleted) {
            if (!Recovered(id, &record, offset, count, response->front())) record.failed = true;
            if (id == ipmi::kFirstRecordId && offset == 0) refusal_ = response;
        } else {
            TakeBytes(id, &record, offset, count, *response);
        }
    }
    progress_();
}

bool RecordReader::Recovered(std::uint16_t id, Incoming* record, std::size_t offset,
                             std::size_t count, std::uint8_t code) {
    if (command_ != ipmi::kGetSdr) return false;
    if (code == ipmi::kReservationCanceled && reservations_ < kMaxReservations) {
        // Asked for again with the new one, when that is there.
        ++record->generation;
        record->headed = false;
        Reserve();
        return true;
    }
    if (!ipmi::RefusesSoManyBytes(code)) return false;
    if (offset == 0 && count == ipmi::kWholeRecord) {
        whole_ = false;
    } else {
        const auto* const smaller =
            std::find_if(std::begin(kSmallerParts), std::end(kSmallerParts),
                         [count](std::size_t part) { return part < count; });
        if (smaller == std::end(kSmallerParts)) return false;
        part_ = std::min(part_, *smaller);
    }
    RequestAgain(id, record);
    return true;
}

void RecordReader::Reserve() {
    if (std::exchange(reserving_, true)) return;
    ++reservations_;
    pipeline_->Submit(ipmi::ReserveSdrRepository(),
                      [self = weak_from_this()](const std::optional<Response>& response) {
                          const auto reader = self.lock();
                          if (!reader) return;
                          reader->reserving_ = false;
                          if (const auto reservation = ReservationIn(response)) {
                              reader->reservation_ = *reservation;
                          }
                          // All that is on its way was asked for with the old one.
                          for (auto& [id, record] : reader->incoming_) {
                              if (record.pending != 0 || !record.headed)
                                  reader->RequestAgain(id, &record);
                          }
                          reader->progress_();
                      });
}

void RecordReader::TakeBytes(std::uint16_t id, Incoming* record, std::size_t offset,
                             std::size_t count, const Response& response) {
    if (response.size() < ipmi::kRecordAt) {
        record->failed = true;
        return;
    }
    const std::span<const std::uint8_t> bytes = ipmi::RecordIn(response);
    if (offset == 0) {
        ipmisel::ByteReader in{std::span(response).subspan(1)};
        record->next = in.U16();
        record->headed = true;
        record->bytes.assign(bytes.begin(), bytes.end());
        if (command_ == ipmi::kGetSelEntry) {
            if (bytes.size() < ipmi::kSelRecordSize && record->tries < kMaxTries)
                record->failed = true;
            return;
        }
        const auto header = ipmi::SdrHeader::Parse(bytes);
        if (!header) {
            record->failed = record->tries < kMaxTries;
            return;
        }
        record->length = header->RecordLength();
        if (bytes.size() >= record->length) return;
        if (count == ipmi::kWholeRecord) {  // cut: so much it gives at a time
            whole_ = false;
            part_ = std::min(std::max(bytes.size(), std::end(kSmallerParts)[-1]), kFirstPart);
        }
        // Past the last offset that a request can name nothing is read: the record stays cut.
        record->length = std::min(record->length, ipmi::kMaxSdrOffset + 1);
        const std::size_t had = std::min(bytes.size(), record->length);
        record->bytes.resize(record->length);
        for (std::size_t at = had; at < record->length; at += part_) {
            RequestPart(id, record, at, std::min(part_, record->length - at));
        }
        return;
    }
    const std::size_t fits = std::min(bytes.size(), record->length - offset);
    std::copy_n(bytes.begin(), fits, record->bytes.begin() + static_cast<std::ptrdiff_t>(offset));
    if (fits == 0) {
        record->failed = true;
    } else if (fits < count) {
        RequestPart(id, record, offset + fits, count - fits);
    }
}

void RecordReader::Drain() {
    for (auto found = incoming_.find(position_); found != incoming_.end();
         found = incoming_.find(position_)) {
        Incoming& record = found->second;
        if (record.failed) {
            // What was only tried may be another record's turn to come; what is due gets a second
            // try. An empty log has no first record.
            if (position_ == ipmi::kFirstRecordId && !expected_) return;
            const bool due = !record.isGuess;
            record.isGuess = false;
            if (position_ == ipmi::kFirstRecordId && expected_ == 0u) return Finish(false);
            if (due && record.tries++ >= kMaxTries) return Finish(false);
            RequestAgain(position_, &record);
            return;
        }
        if (!record.headed || record.pending != 0) return;
        if (record.isGuess) ++hits_;
        const std::uint16_t next = record.next;
        if (!store_->Add(position_, next, record.bytes)) return Finish(false);
        ipmisel::ByteReader in(record.bytes);
        const std::uint16_t own = in.U16();
        if (in.ok() && next > own && next != ipmi::kLastRecordId) step_ = next - own;
        incoming_.erase(found);
        if (next == ipmi::kLastRecordId) return Finish(true);
        if (next == ipmi::kFirstRecordId || store_->Find(next)) return Finish(false);
        position_ = next;
    }
}

void RecordReader::Finish(bool reachedEnd) {
    finished_ = true;
    reachedEnd_ = reachedEnd;
    incoming_.clear();
}

}  // namespace tqrhost
