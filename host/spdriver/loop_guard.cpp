#include "host/spdriver/loop_guard.h"

#include <utility>

#include "base/bytes.h"
#include "base/text.h"
#include "tqr/log.h"

namespace tqrhost {
namespace {

/// What of a Get SEL Entry or Get SDR answer concerns a walk: completion code, next record ID, then
/// the record, which begins with its own ID.
struct RecordAnswer {
    std::uint8_t completionCode;
    std::uint16_t next;
    std::optional<std::uint16_t> own;  ///< of a read at offset 0 only

    RecordAnswer(const Response& response, std::uint8_t offset) {
        ipmisel::ByteReader in(response);
        completionCode = in.U8();
        next = in.U16();
        ipmisel::ByteReader record(ipmi::RecordIn(response));
        const std::uint16_t id = record.U16();
        if (offset == 0 && record.ok()) own = id;
    }
};

}  // namespace

void LoopGuard::Walk::Restart() {
    given_.clear();
    ended = false;
}

bool LoopGuard::Walk::WasGiven(std::uint16_t record, std::uint8_t offset) const {
    const auto atOffset = given_.find(offset);
    return atOffset != given_.end() && atOffset->second[record];
}

void LoopGuard::Walk::Given(std::uint16_t record, std::uint8_t offset) {
    auto& records = given_[offset];
    if (records.empty()) records.resize(0x10000);
    records[record] = true;
}

LoopGuard::LoopGuard(std::unique_ptr<Transport> transport) : transport_(std::move(transport)) {}

std::optional<Response> LoopGuard::Exchange(const RequestFrame& request) {
    endedCircle_ = false;
    if (request.netFn() == ipmi::kNetFnStorage) {
        switch (request.command()) {
            case ipmi::kGetSelInfo.number:
                eventLog_.Restart();
                break;
            case ipmi::kGetSdrRepositoryInfo.number:
            case ipmi::kReserveSdrRepository.number:
                sensorRepository_.Restart();
                break;
            case ipmi::kGetSelEntry.number:
                return Read(&eventLog_, true, request);
            case ipmi::kGetSdr.number:
                return Read(&sensorRepository_, false, request);
            default:
                break;
        }
    }
    return transport_->Exchange(request);
}

std::optional<Response> LoopGuard::Read(Walk* walk, bool isEventLog, const RequestFrame& request) {
    const auto read = ipmi::RecordRead::Parse(request.data());
    if (!read) return transport_->Exchange(request);
    const std::uint16_t record = read->recordId;
    const std::uint8_t offset = read->offset;

    if (walk->ended && record == ipmi::kFirstRecordId && offset == 0) walk->Restart();
    if (walk->WasGiven(record, offset)) {
        NQORTQR20::fdrWriteLog(
            NQORTQR20::ILogger::kNotice,
            ipmisel::Format("The BMC leads the walk over its %s in a circle: "
                            "record 0x%04x was read before.",
                            isEventLog ? "event log" : "sensor repository", record)
                .c_str());
        walk->Restart();
        endedCircle_ = true;
        return std::nullopt;
    }
    auto response = transport_->Exchange(request);
    if (!response) {
        walk->Restart();
        return response;
    }
    const RecordAnswer answer(*response, offset);
    if (answer.completionCode != ipmi::kCompleted) {
        walk->Restart();
        return response;
    }
    walk->Given(record, offset);
    // The first record is asked for by 0x0000 and comes back in a circle under its own ID.
    if (record == ipmi::kFirstRecordId && answer.own) walk->Given(*answer.own, offset);
    // Every walk over the event log ends at a next record ID of 0xFFxx; over the repository only
    // 0xFFFF ends them all, and the rest of the last record may still be read after it. Walks go by
    // what the beginning of a record says, even if the rest says something else.
    if (offset == 0) {
        walk->ended = isEventLog ? answer.next >> 8 == 0xFF : answer.next == ipmi::kLastRecordId;
    }
    return response;
}

}  // namespace tqrhost
