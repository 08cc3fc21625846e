#include "host/spdriver/record_store.h"

#include <algorithm>

#include "base/bytes.h"
#include "ipmi/sdr_record.h"

namespace tqrhost {
namespace {

constexpr std::size_t kBlock = std::size_t{1} << 16;
constexpr std::size_t kMaxRecord = ipmi::kMaxSdrLength;  // an event is shorter

}  // namespace

bool RecordStore::Add(std::uint16_t id, std::uint16_t next, std::span<const std::uint8_t> bytes) {
    if (bytes.size() > kMaxRecord || entries_.size() >= kIds) return false;
    if (Find(id)) return true;
    if (used_ % kBlock + bytes.size() > kBlock) used_ += kBlock - used_ % kBlock;
    if (used_ + bytes.size() > kMaxBytes) return false;
    if (used_ / kBlock >= blocks_.size())
        blocks_.push_back(std::make_unique_for_overwrite<std::uint8_t[]>(kBlock));
    std::copy(bytes.begin(), bytes.end(), blocks_[used_ / kBlock].get() + used_ % kBlock);
    entries_.push_back(
        {static_cast<std::uint32_t>(used_), static_cast<std::uint16_t>(bytes.size()), next});
    used_ += bytes.size();
    Index(id) = static_cast<std::uint32_t>(entries_.size());
    ipmisel::ByteReader in(bytes);
    const std::uint16_t own = in.U16();
    if (entries_.size() == 1 && in.ok()) Index(own) = 1;
    return true;
}

std::optional<RecordStore::Record> RecordStore::Find(std::uint16_t id) const {
    const Page* const page = index_[id / kPage].get();
    if (page == nullptr || (*page)[id % kPage] == 0) return std::nullopt;
    return At((*page)[id % kPage] - 1);
}

std::uint32_t& RecordStore::Index(std::uint16_t id) {
    std::unique_ptr<Page>& page = index_[id / kPage];
    if (!page) page = std::make_unique<Page>();
    return (*page)[id % kPage];
}

RecordStore::Record RecordStore::At(std::size_t position) const {
    const Entry& entry = entries_.at(position);
    if (entry.length == 0) return {entry.next, {}};
    return {entry.next, {blocks_[entry.at / kBlock].get() + entry.at % kBlock, entry.length}};
}

}  // namespace tqrhost
