#include "host/spdriver/record_trimmer.h"

#include <algorithm>

#include "ipmi/id_string.h"
#include "ipmi/sdr_record.h"

namespace tqrhost {

std::optional<Response> RecordTrimmer::Exchange(const RequestFrame& request) {
    auto response = transport_->Exchange(request);
    if (request.code() != ipmi::kGetSdr || !response || response->empty()) return response;
    const auto read = ipmi::RecordRead::Parse(request.data());
    if (!read) return response;
    const auto part = ipmi::RecordIn(*response);
    if (read->offset == 0) {
        const auto header = ipmi::SdrHeader::Parse(part);
        record_ = read->recordId;
        recordLength_ = header ? header->RecordLength() : 0;
    } else if (response->front() == ipmi::kCompleted && !part.empty() &&
               record_ == read->recordId && recordLength_ > read->offset) {
        const std::size_t name = std::size_t{1} + ipmi::TypeLength::FromByte(part.front()).length;
        const std::size_t rest = std::max(recordLength_ - read->offset, name);
        response->resize(ipmi::kRecordAt + std::min(part.size(), rest));
    }
    return response;
}

}  // namespace tqrhost
