#include "host/spdriver/controller_memory.h"

#include <algorithm>
#include <span>

#include "base/bytes.h"

namespace tqrhost {
namespace {

/// A read of a record or of a part of it.
std::optional<Response> AnswerRead(const RecordStore* store,
                                   const std::optional<Response>& reservation,
                                   const ipmi::Command& command) {
    const auto read = ipmi::RecordRead::Parse(command.data);
    if (store == nullptr || !read) return std::nullopt;
    // Parts are read under the one reservation that was ever given; what a controller says to
    // another one, or to a place past the end, is its own affair.
    if (read->offset != 0 && ReservationIn(reservation) != read->reservation) return std::nullopt;
    const auto record = store->Find(read->recordId);
    if (!record || read->offset >= record->bytes.size() || read->count == 0) return std::nullopt;
    const auto rest = record->bytes.subspan(read->offset);
    const auto part = read->count == ipmi::kWholeRecord
                          ? rest
                          : rest.first(std::min<std::size_t>(read->count, rest.size()));
    Response answer{ipmi::kCompleted, static_cast<std::uint8_t>(record->next),
                    static_cast<std::uint8_t>(record->next >> 8)};
    answer.insert(answer.end(), part.begin(), part.end());
    return answer;
}

}  // namespace

std::optional<std::uint16_t> ReservationIn(const std::optional<Response>& response) {
    if (!response || response->empty() || response->front() != ipmi::kCompleted) {
        return std::nullopt;
    }
    ipmisel::ByteReader in{std::span(*response).subspan(1)};
    const std::uint16_t reservation = in.U16();
    if (!in.ok()) return std::nullopt;
    return reservation;
}

std::optional<Response> ControllerMemory::Answer(const ipmi::Command& command) const {
    if (command.lun != ipmi::kBmcLun) return std::nullopt;
    const ipmi::CommandCode code = command.code();
    if (code == ipmi::kGetSelEntry) {
        if (emptyLog && command == ipmi::GetSelEntry(ipmi::kFirstRecordId)) return emptyLog;
        return AnswerRead(log.get(), std::nullopt, command);
    }
    if (code == ipmi::kGetSdr) return AnswerRead(sensors.get(), reservation, command);
    if (!command.data.empty()) return std::nullopt;
    if (code == ipmi::kGetSystemGuid) return guid;
    if (code == ipmi::kGetSelInfo) return logInfo;
    if (code == ipmi::kGetSdrRepositoryInfo) return sensorInfo;
    if (code == ipmi::kReserveSdrRepository) return reservation;
    return std::nullopt;
}

}  // namespace tqrhost
