#include "host/spdriver/completeness.h"

#include <algorithm>
#include <utility>

#include "base/bytes.h"
#include "base/text.h"
#include "host/spdriver/commands.h"
#include "host/spdriver/stop.h"

namespace tqrhost {
namespace {

constexpr std::size_t kMostFaults = 1000;
constexpr std::uint8_t kNotPresent = 0xCB;
constexpr std::uint8_t kOutOfRange = 0xC9;

// Answers, completion code included: version and count; next record ID and one byte of a record;
// the count of FRU bytes.
constexpr std::size_t kInfoAnswer = 4;
constexpr std::size_t kFruAnswer = 2;
constexpr std::size_t kCountAt = 2;
constexpr std::size_t kRecordAt = 3;
constexpr std::size_t kSelEntryLength = 16;
// The length of a sensor record counts what follows its header (IPMI 2.0, clause 43).
constexpr std::size_t kSdrHeaderLength = 5;
constexpr std::uint8_t kToTheEnd = 0xFF;

/// Takes off what follows the record's end: some BMCs answer a read to the end with more, left over
/// from other records, which would lengthen the name that ends the record. A name that is longer
/// by its own length byte than the record's length has it stays.
void CutToRecord(std::size_t rest, Response* response) {
    constexpr std::uint8_t kNameLength = 0x1F;
    if (response->size() <= kRecordAt) return;
    const std::size_t name = std::size_t{1} + (response->at(kRecordAt) & kNameLength);
    response->resize(std::min(response->size(), kRecordAt + std::max(rest, name)));
}

const char* StopText(StopReason reason) {
    return reason == StopReason::kDeadline ? "deadline" : "interrupted";
}

}  // namespace

bool NodeCompleteness::Whole() const {
    const auto whole = [](const SourceAccount& source) {
        return !source.announced || source.read >= *source.announced;
    };
    const bool faulty = std::any_of(faults.begin(), faults.end(),
                                    [](const ReadFault& fault) { return fault.ofLogOrSensors; });
    return !faulty && whole(log) && whole(sensors);
}

ReadingWatch::ReadingWatch(std::unique_ptr<LoopGuard> guard)
    : guard_(std::move(guard)),
      log_{"Get SEL Info", "Get SEL Entry", true, &account_.log, {}, {}},
      sensors_{"Get SDR Repository Info", "Get SDR", false, &account_.sensors, {}, {}} {}

std::optional<Response> ReadingWatch::Exchange(const RequestFrame& request) {
    std::optional<Response> response;
    if (Stopped() == StopReason::kNone) response = guard_->Exchange(request);
    // Not even a completion code: nothing came.
    if (response && response->empty()) response.reset();
    if (request.netFn() == kNetFnStorage) Note(request, &response);
    return response;
}

void ReadingWatch::Note(const RequestFrame& request, std::optional<Response>* answer) {
    const std::optional<Response>& response = *answer;
    const bool askedAgain = std::exchange(lastCommand_, request.command()) == request.command();
    switch (request.command()) {
        case kGetSelInfo:
            NoteInfo(&log_, askedAgain, response);
            break;
        case kGetSelEntry:
            NoteRecord(&log_, request, answer);
            break;
        case kGetSdrRepositoryInfo:
            NoteInfo(&sensors_, askedAgain, response);
            break;
        case kReserveSdrRepository:
            FinishWalk(&sensors_);
            if (const std::string problem = ProblemOf(response, 3); !problem.empty()) {
                AddFault({"Reserve SDR Repository", "", problem, true});
            }
            break;
        case kGetSdr:
            NoteRecord(&sensors_, request, answer);
            break;
        case kReadFruData:
            NoteFru(request, response);
            break;
        default:
            break;
    }
}

const NodeCompleteness& ReadingWatch::Account() {
    FinishWalk(&log_);
    FinishWalk(&sensors_);
    return account_;
}

void ReadingWatch::NoteInfo(Source* source, bool askedAgain,
                            const std::optional<Response>& response) {
    const std::string what = source->infoCommand;
    const std::string problem = ProblemOf(response, kInfoAnswer);
    if (!problem.empty()) {
        AddFault({what, "", problem, true});
        return;
    }
    // A question that was asked again at once and then answered left nothing out.
    if (askedAgain) {
        std::erase_if(account_.faults,
                      [&what](const ReadFault& fault) { return fault.what == what; });
    }
    // By the count as it was then; the inventory's walk comes before anybody has asked for it.
    if (source->account->announced) FinishWalk(source);
    ipmisel::ByteReader in(*response);
    in.Skip(kCountAt);
    source->account->announced = in.U16();
    FinishWalk(source);
}

void ReadingWatch::FinishWalk(Source* source) {
    const Walk walk = std::exchange(source->walk, Walk());
    const bool whole = walk.fromFirst && walk.ended;
    if (whole && walk.count < source->account->announced.value_or(0)) {
        AddFault(
            {source->readCommand, ipmisel::Format("%04x", source->record), "ended early", true});
    }
}

std::size_t ReadingWatch::WholeAnswer(const Source& source, std::uint16_t record,
                                      std::uint8_t offset, std::uint8_t count) {
    std::size_t length = source.isLog ? kSelEntryLength : 1;
    if (!source.isLog && source.record == record && source.recordLength > offset) {
        length = source.recordLength - offset;
    } else if (!source.isLog && count != kToTheEnd) {
        length = std::min<std::size_t>(count, kSdrHeaderLength);
    }
    return kRecordAt + (count == kToTheEnd ? length : std::min<std::size_t>(count, length));
}

void ReadingWatch::NoteRecord(Source* source, const RequestFrame& request,
                              std::optional<Response>* answer) {
    const std::optional<Response>& response = *answer;
    ipmisel::ByteReader in(request.data());
    in.U16();
    const std::uint16_t record = in.U16();
    const std::uint8_t offset = in.U8();
    const std::uint8_t count = in.U8();
    // An empty log or repository has no first record.
    if (response && response->front() == kNotPresent && source->account->announced == 0u) return;
    if (offset == 0) {
        if (record == 0) FinishWalk(source);
        source->record = record;
        source->recordLength = 0;
        if (response && response->size() >= kRecordAt + kSdrHeaderLength) {
            source->recordLength =
                kSdrHeaderLength + response->at(kRecordAt + kSdrHeaderLength - 1);
        }
    }
    const std::string problem = ProblemOf(response, WholeAnswer(*source, record, offset, count));
    if (!problem.empty()) {
        AddFault({source->readCommand, ipmisel::Format("%04x", record), problem, true});
        return;
    }
    if (offset != 0) {
        if (source->record == record && source->recordLength > offset) {
            CutToRecord(source->recordLength - offset, &**answer);
        }
        return;
    }
    if (source->counted.empty()) source->counted.resize(0x10000);
    if (!source->counted[record]) ++source->account->read;
    source->counted[record] = true;
    if (record == 0) source->walk.fromFirst = true;
    ++source->walk.count;
    // An ID with a byte of 0xFF ends the one walk or the other.
    const bool lowEnds = !source->isLog && response->at(1) == 0xFF;
    if (lowEnds || response->at(2) == 0xFF) source->walk.ended = true;
}

void ReadingWatch::NoteFru(const RequestFrame& request, const std::optional<Response>& response) {
    ipmisel::ByteReader in(request.data());
    const std::uint8_t device = in.U8();
    const std::uint16_t offset = in.U16();
    if (response && response->front() == kNotPresent && offset == 0) return;  // absent
    // A device may be smaller than what is asked for.
    if (response && response->front() == kOutOfRange && offset > 0) return;
    // The count, and as many bytes as it says.
    const bool counts = response && response->size() >= kFruAnswer;
    const std::size_t least = kFruAnswer + (counts ? response->at(1) : 0);
    const std::string problem = ProblemOf(response, least);
    if (!problem.empty()) {
        AddFault({"Read FRU Data", ipmisel::Format("%04x", device), problem, false});
    }
}

void ReadingWatch::AddFault(ReadFault fault) {
    if (account_.faults.size() >= kMostFaults) return;
    if (std::find(account_.faults.begin(), account_.faults.end(), fault) == account_.faults.end()) {
        account_.faults.push_back(std::move(fault));
    }
}

std::string ReadingWatch::ProblemOf(const std::optional<Response>& response,
                                    std::size_t least) const {
    if (!response) {
        if (const StopReason reason = Stopped(); reason != StopReason::kNone) {
            return StopText(reason);
        }
        return guard_->EndedCircle() ? "ran in a circle" : "no response";
    }
    if (response->front() != 0) {
        return ipmisel::Format("completion code %02x", response->front());
    }
    return response->size() < least ? "short answer" : "";
}

}  // namespace tqrhost
