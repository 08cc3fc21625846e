#include "plugins/standard/repository_reader.h"

#include <algorithm>
#include <cstddef>

#include "ipmi/sdr_record.h"

namespace standard {
namespace {

/// What every controller can return at a time.
constexpr std::size_t kPart = 16;
/// A reservation that is lost again and again is not made for ever.
constexpr int kMaxReservations = 4;
constexpr std::size_t kNextIdLength = 2;

/// The next record's ID, which stands before the bytes of a record.
std::uint16_t NextId(const std::vector<std::uint8_t>& data) {
    return static_cast<std::uint16_t>(data[0] | data[1] << 8);
}

std::size_t ClaimedLength(const std::vector<std::uint8_t>& record) {
    const auto header = ipmi::SdrHeader::Parse(record);
    return header ? ipmi::kSdrHeaderLength + header->length : 0;
}

}  // namespace

std::optional<RepositoryReader::Record> RepositoryReader::Read(std::uint16_t recordId) {
    std::optional<Record> record;
    for (int i = 0; i < kMaxReservations; ++i) {
        record.reset();
        if (!inParts_) record = ReadWhole(recordId);
        if (inParts_ && !record) record = ReadHeader(recordId);
        if (!record || ReadRest(recordId, &*record)) return record;
    }
    return record;
}

std::optional<RepositoryReader::Record> RepositoryReader::ReadHeader(std::uint16_t recordId) {
    for (int i = 0; i < kMaxReservations; ++i) {
        const auto header = ReadPart(recordId, 0, ipmi::kSdrHeaderLength);
        if (!header) return std::nullopt;
        if (header->completionCode == ipmi::kReservationCanceled) continue;
        if (!header->Completed() || header->data.size() < kNextIdLength) return std::nullopt;
        return Record{NextId(header->data),
                      {header->data.begin() + kNextIdLength, header->data.end()}};
    }
    return std::nullopt;
}

std::optional<RepositoryReader::Record> RepositoryReader::ReadWhole(std::uint16_t recordId) {
    const auto answer = controller_.Send(ipmi::GetSdr(recordId));
    if (!answer) return std::nullopt;
    if (ipmi::RefusesSoManyBytes(answer->completionCode)) {
        inParts_ = true;
        return std::nullopt;
    }
    if (!answer->Completed() || answer->data.size() < kNextIdLength) return std::nullopt;
    return Record{NextId(answer->data), {answer->data.begin() + kNextIdLength, answer->data.end()}};
}

bool RepositoryReader::ReadRest(std::uint16_t recordId, Record* record) {
    // Past the last offset that a request can name nothing is read: the record stays cut.
    const std::size_t length = std::min(ClaimedLength(record->bytes), ipmi::kMaxSdrOffset + 1);
    // The ID in the record is the one to go on with: 0000h has only asked for the first.
    if (recordId == ipmi::kFirstRecordId && length > 0) {
        recordId = ipmi::SdrHeader::Parse(record->bytes)->recordId;
    }
    const std::size_t begun = record->bytes.size();
    while (record->bytes.size() < length) {
        const std::size_t count = std::min(kPart, length - record->bytes.size());
        const auto part = ReadPart(recordId, record->bytes.size(), count);
        if (part && part->completionCode == ipmi::kReservationCanceled) {
            record->bytes.resize(begun);
            return false;
        }
        if (!part || !part->Completed() || part->data.size() <= kNextIdLength) return true;
        const auto bytes = part->data.begin() + kNextIdLength;
        const auto end = std::min(part->data.end(), bytes + static_cast<std::ptrdiff_t>(count));
        record->bytes.insert(record->bytes.end(), bytes, end);
    }
    return true;
}

std::optional<Answer> RepositoryReader::ReadPart(std::uint16_t recordId, std::size_t offset,
                                                 std::size_t count) {
    if (!reservation_ && !Reserve()) return std::nullopt;
    auto answer = controller_.Send(ipmi::GetSdr(recordId, static_cast<std::uint8_t>(offset),
                                                static_cast<std::uint8_t>(count), *reservation_));
    if (answer && answer->completionCode == ipmi::kReservationCanceled) reservation_.reset();
    return answer;
}

bool RepositoryReader::Reserve() {
    const auto data = controller_.Completed(ipmi::ReserveSdrRepository());
    if (!data || data->size() < 2) return false;
    reservation_ = static_cast<std::uint16_t>((*data)[0] | (*data)[1] << 8);
    return true;
}

}  // namespace standard
