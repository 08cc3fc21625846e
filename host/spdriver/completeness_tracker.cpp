#include "host/spdriver/completeness_tracker.h"

#include <algorithm>
#include <utility>

#include "base/bytes.h"
#include "base/text.h"
#include "host/spdriver/stop.h"
#include "ipmi/sdr_record.h"
#include "ipmi/sel_record.h"

namespace tqrhost {
namespace {

/// Log and repository, between two answers of Get SEL Info and Get SDR Repository Info.
constexpr const char* kChanged = "the log has changed while it was read";
constexpr const char* kSensorsChanged = "the sensor repository has changed while it was read";

constexpr std::size_t kMaxFaults = 1000;

const char* StopText(StopReason reason) {
    return reason == StopReason::kDeadline ? "deadline" : "interrupted";
}

}  // namespace

CompletenessTracker::CompletenessTracker(std::unique_ptr<LoopGuard> guard)
    : guard_(std::move(guard)),
      log_{"Get SEL Info", "Get SEL Entry", true, &account_.log, {}, {}, 0, 0, 0},
      sensors_{"Get SDR Repository Info", "Get SDR", false, &account_.sensors, {}, {}, 0, 0, 0} {
    account_.log.asked = false;
    account_.sensors.asked = false;
}

std::optional<Response> CompletenessTracker::Exchange(const RequestFrame& request) {
    auto response = guard_->Exchange(request);
    // Not even a completion code: nothing came.
    if (response && response->empty()) response.reset();
    if (request.netFn() == ipmi::kNetFnStorage) Note(request, response);
    auto fault = facts_.Note(request, response,
                             [&](std::size_t least) { return ProblemOf(response, least); });
    if (fault) AddFault(*std::move(fault));
    return response;
}

void CompletenessTracker::Note(const RequestFrame& request,
                               const std::optional<Response>& response) {
    const bool askedAgain = std::exchange(lastCommand_, request.command()) == request.command();
    switch (request.command()) {
        case ipmi::kGetSelInfo.number:
            NoteInfo(&log_, askedAgain, response);
            break;
        case ipmi::kGetSelEntry.number:
            NoteRecord(&log_, request, response);
            break;
        case ipmi::kGetSdrRepositoryInfo.number:
            NoteInfo(&sensors_, askedAgain, response);
            break;
        case ipmi::kReserveSdrRepository.number:
            FinishWalk(&sensors_);
            if (const std::string problem =
                    ProblemOf(response, ipmi::LeastAnswer(ipmi::kReserveSdrRepository));
                !problem.empty()) {
                AddFault({"Reserve SDR Repository", "", problem, true});
            }
            break;
        case ipmi::kGetSdr.number:
            NoteRecord(&sensors_, request, response);
            break;
        case ipmi::kReadFruData.number:
            NoteFru(request, response);
            break;
        default:
            break;
    }
}

const NodeCompleteness& CompletenessTracker::Completeness() {
    FinishWalk(&log_);
    FinishWalk(&sensors_);
    account_.controller = facts_.controller();
    account_.readings = facts_.readings();
    account_.inventory = facts_.inventory();
    return account_;
}

std::optional<ReadingState> CompletenessTracker::StateAfter(const RequestFrame& request) const {
    ReadingState state;
    if (request.code() == ipmi::kGetSelEntry || request.code() == ipmi::kGetSdr) {
        const Source& source = request.code() == ipmi::kGetSelEntry ? log_ : sensors_;
        state = source.isLog ? kEventLogReading : kSensorReading;
        state.read = source.walk.count;
        state.announced = source.account->announced;
    } else if (request.code() == ipmi::kReadFruData) {
        state = {"inventory", "devices", facts_.inventory().read};
    } else if (request.netFn() == ipmi::kGetSensorReading.netFn) {
        state = {"sensor readings", "sensors", facts_.readings().read};
    } else {
        return std::nullopt;
    }
    return state;
}

void CompletenessTracker::NoteInfo(Source* source, bool askedAgain,
                                   const std::optional<Response>& response) {
    const std::string what = source->infoCommand;
    const std::string problem = ProblemOf(response, ipmi::LeastAnswer(ipmi::kGetSelInfo));
    if (!problem.empty()) {
        AddFault({what, "", problem, true});
        return;
    }
    // A question that was asked again at once and then answered left nothing out.
    if (askedAgain) {
        std::erase_if(account_.faults, [&what](const ReadFault& fault) {
            return fault.what == what && fault.problem != kChanged &&
                   fault.problem != kSensorsChanged;
        });
    }
    if (source->isLog) {
        NoteLogState(*response);
    } else {
        NoteSensorState(*response);
    }
    // By the count as it was then; the inventory's walk comes before anybody has asked for it.
    if (source->account->announced) FinishWalk(source);
    ipmisel::ByteReader in(*response);
    in.Skip(1 + ipmi::kRecordCountAt);
    source->account->announced = in.U16();
    if (source->noFirst && *source->account->announced == 0) {
        std::erase(account_.faults, *source->noFirst);
    }
    FinishWalk(source);
}

void CompletenessTracker::NoteLogState(const Response& response) {
    const auto info = ipmi::ParseSelInfo(std::span(response).subspan(1));
    if (!info) return;
    if (logState_ && logState_->HasChanged(*info)) AddFault({"Get SEL Info", "", kChanged, true});
    logState_ = info;
}

void CompletenessTracker::NoteSensorState(const Response& response) {
    const auto info = ipmi::SdrRepositoryInfo::Parse(std::span(response).subspan(1));
    if (!info) return;
    // What was read of it may be whole all the same: no more than told.
    if (sensorState_ && sensorState_->HasChanged(*info)) {
        AddFault({"Get SDR Repository Info", "", kSensorsChanged, false});
    }
    sensorState_ = info;
}

void CompletenessTracker::FinishWalk(Source* source) {
    const Walk walk = std::exchange(source->walk, Walk());
    const bool whole = walk.fromFirst && walk.ended;
    if (whole && walk.count < source->account->announced.value_or(0)) {
        AddFault(
            {source->readCommand, ipmisel::Format("%04x", source->record), "ended early", true});
    }
}

std::size_t CompletenessTracker::WholeAnswer(const Source& source, std::uint16_t record,
                                             std::uint8_t offset, std::uint8_t count) {
    std::size_t length = source.isLog ? ipmi::kSelRecordSize : 1;
    if (!source.isLog && source.record == record && source.recordLength > offset) {
        length = source.recordLength - offset;
    } else if (!source.isLog && count != ipmi::kWholeRecord) {
        length = std::min<std::size_t>(count, ipmi::kSdrHeaderLength);
    }
    return ipmi::kRecordAt +
           (count == ipmi::kWholeRecord ? length : std::min<std::size_t>(count, length));
}

void CompletenessTracker::NoteRecord(Source* source, const RequestFrame& request,
                                     const std::optional<Response>& response) {
    const ipmi::RecordRead read =
        ipmi::RecordRead::Parse(request.data()).value_or(ipmi::RecordRead());
    const std::uint16_t record = read.recordId;
    const std::uint8_t offset = read.offset;
    source->account->asked = true;
    const bool wantedWhole = !source->isLog && read.IsOfWhole();
    // A controller may refuse whole records; it is asked for parts then.
    if (wantedWhole && response && ipmi::RefusesSoManyBytes(response->front())) return;
    // An empty log or repository has no first record.
    if (response && response->front() == ipmi::kNotPresent && source->account->announced == 0u)
        return;
    if (offset == 0) {
        if (read.IsOfFirst()) FinishWalk(source);
        const auto header =
            response ? ipmi::SdrHeader::Parse(ipmi::RecordIn(*response)) : std::nullopt;
        source->record = record;
        source->recordLength = header ? header->RecordLength() : 0;
        source->cutAt = 0;
    }
    const std::string problem =
        ProblemOf(response, WholeAnswer(*source, record, offset, read.count));
    if (!problem.empty()) {
        const ReadFault fault{source->readCommand, ipmisel::Format("%04x", record), problem, true};
        // The inventory's walk comes before anybody has asked how many records there are.
        if (AddFault(fault) && read.IsOfFirst() && response &&
            response->front() == ipmi::kNotPresent) {
            source->noFirst = fault;
        }
        if (wantedWhole && source->recordLength > 0)
            source->cutAt = ipmi::RecordIn(*response).size();
        return;
    }
    if (offset != 0) {
        NoteRest(source, record, offset, *response);
        return;
    }
    // The first and the last record can be asked for without their IDs; each counts once.
    std::uint16_t own = record;
    if (record == ipmi::kFirstRecordId || record == ipmi::kLastRecordId) {
        ipmisel::ByteReader in(ipmi::RecordIn(*response));
        const std::uint16_t id = in.U16();
        if (in.ok()) own = id;
    }
    CountRecord(source, own);
    if (read.IsOfFirst()) source->walk.fromFirst = true;
    ++source->walk.count;
    // An ID with a byte of 0xFF ends the one walk or the other.
    const bool lowEnds = !source->isLog && response->at(1) == 0xFF;
    if (lowEnds || response->at(2) == 0xFF) source->walk.ended = true;
}

void CompletenessTracker::NoteRest(Source* source, std::uint16_t record, std::uint8_t offset,
                                   const Response& response) {
    if (source->cutAt == 0 || source->cutAt != offset) return;
    source->cutAt += ipmi::RecordIn(response).size();
    if (source->cutAt < source->recordLength) return;
    const auto cut =
        std::find_if(account_.faults.rbegin(), account_.faults.rend(),
                     [&](const ReadFault& fault) { return fault.what == source->readCommand; });
    if (cut != account_.faults.rend()) account_.faults.erase(std::next(cut).base());
    CountRecord(source, record);
    source->cutAt = 0;
}

void CompletenessTracker::CountRecord(Source* source, std::uint16_t record) {
    if (source->counted.empty()) source->counted.resize(0x10000);
    if (!source->counted[record]) ++source->account->read;
    source->counted[record] = true;
}

void CompletenessTracker::NoteFru(const RequestFrame& request,
                                  const std::optional<Response>& response) {
    ipmisel::ByteReader in(request.data());
    const std::uint8_t device = in.U8();
    const std::uint16_t offset = in.U16();
    if (response && response->front() == ipmi::kNotPresent && offset == 0) return;  // absent
    // A device may be smaller than what is asked for.
    if (response && response->front() == ipmi::kParameterOutOfRange && offset > 0) return;
    // The count, and as many bytes as it says.
    const std::size_t header = ipmi::LeastAnswer(ipmi::kReadFruData);
    const bool counts = response && response->size() >= header;
    const std::size_t least = header + (counts ? response->at(1) : 0);
    const std::string problem = ProblemOf(response, least);
    const bool askedAgain =
        refusedFru_ && refusedFru_->device == device && refusedFru_->offset == offset;
    if (!askedAgain) refusedFru_.reset();
    if (problem.empty()) {
        // Refused for its length or since the device was busy, then answered: nothing is missing.
        if (!askedAgain) return;
        for (const ReadFault& fault : refusedFru_->faults) std::erase(account_.faults, fault);
        refusedFru_.reset();
        return;
    }
    if (!refusedFru_) refusedFru_ = RefusedFru{device, offset, {}};
    const ReadFault fault{"Read FRU Data", ipmisel::Format("%04x", device), problem, false};
    if (AddFault(fault)) refusedFru_->faults.push_back(fault);
}

bool CompletenessTracker::AddFault(ReadFault fault) {
    const auto& known = account_.faults;
    if (known.size() >= kMaxFaults || std::find(known.begin(), known.end(), fault) != known.end()) {
        return false;
    }
    account_.faults.push_back(std::move(fault));
    return true;
}

std::string CompletenessTracker::ProblemOf(const std::optional<Response>& response,
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
