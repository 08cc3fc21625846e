#include "host/spdriver/record_trimmer.h"

#include <algorithm>

#include "base/bytes.h"

namespace tqrhost {
namespace {

constexpr std::size_t kRecordAt = 3;  // after completion code and next record ID
constexpr std::size_t kHeaderLength = 5;
constexpr std::uint8_t kNameLength = 0x1F;

}  // namespace

std::optional<Response> RecordTrimmer::Exchange(const RequestFrame& request) {
    auto response = transport_->Exchange(request);
    if (request.code() != ipmi::kGetSdr || !response || response->empty()) return response;
    ipmisel::ByteReader in(request.data());
    in.U16();
    const std::uint16_t record = in.U16();
    const std::uint8_t offset = in.U8();
    if (offset == 0) {
        record_ = record;
        recordLength_ = 0;
        if (response->size() >= kRecordAt + kHeaderLength) {
            // The length counts what follows the header (IPMI 2.0, clause 43).
            recordLength_ = kHeaderLength + response->at(kRecordAt + kHeaderLength - 1);
        }
    } else if (response->front() == ipmi::kCompleted && response->size() > kRecordAt &&
               record_ == record && recordLength_ > offset) {
        const std::size_t name = std::size_t{1} + (response->at(kRecordAt) & kNameLength);
        const std::size_t rest = std::max(recordLength_ - offset, name);
        response->resize(std::min(response->size(), kRecordAt + rest));
    }
    return response;
}

}  // namespace tqrhost
