#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <utility>

#include "host/spdriver/transport.h"

namespace tqrhost {

/// Takes off what follows a sensor record's end: some BMCs answer a read to the end with more, left
/// over from other records, which would lengthen the name that ends the record. A name that is
/// longer by its own length byte than the record's length has it stays.
class RecordTrimmer : public Transport {
public:
    explicit RecordTrimmer(std::unique_ptr<Transport> transport)
        : transport_(std::move(transport)) {}
    std::optional<Response> Exchange(const RequestFrame& request) override;

private:
    std::unique_ptr<Transport> transport_;
    /// The record whose beginning came last, and its length; 0 when that did not come.
    std::uint16_t record_ = 0;
    std::size_t recordLength_ = 0;
};

}  // namespace tqrhost
