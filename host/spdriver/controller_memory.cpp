#include "host/spdriver/controller_memory.h"

#include <algorithm>

#include "base/bytes.h"

namespace tqrhost {
namespace {

constexpr std::size_t kReadLength = 6;  // reservation, record, offset, count

/// A read of a record or of a part of it.
std::optional<Response> AnswerRead(const RecordStore* store,
                                   const std::optional<Response>& reservation,
                                   const ipmi::Command& command) {
    if (store == nullptr || command.data.size() != kReadLength) return std::nullopt;
    ipmisel::ByteReader in(command.data);
    const std::uint8_t reserved[] = {in.U8(), in.U8()};
    const std::uint16_t id = in.U16();
    const std::size_t offset = in.U8();
    const std::size_t count = in.U8();
    // Parts are read under the one reservation that was ever given; what a controller says to
    // another one, or to a place past the end, is its own affair.
    const bool mayReadParts =
        reservation && reservation->size() >= 3 &&
        std::equal(std::begin(reserved), std::end(reserved), &(*reservation)[1]);
    if (offset != 0 && !mayReadParts) return std::nullopt;
    const auto record = store->Find(id);
    if (!record || offset >= record->bytes.size() || count == 0) return std::nullopt;
    const auto rest = record->bytes.subspan(offset);
    const auto part = count == ipmi::kWholeRecord ? rest : rest.first(std::min(count, rest.size()));
    Response answer{ipmi::kCompleted, static_cast<std::uint8_t>(record->next),
                    static_cast<std::uint8_t>(record->next >> 8)};
    answer.insert(answer.end(), part.begin(), part.end());
    return answer;
}

}  // namespace

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
