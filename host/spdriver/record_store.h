#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <span>
#include <vector>

namespace tqrhost {

/// The records of one event log or sensor repository as a controller gave them: each under the ID
/// by which it was read and, of the first, also under its own. Takes what 65,536 records of the
/// usual lengths need and no more, so that a controller whose records never end cannot fill the
/// memory.
class RecordStore {
public:
    static constexpr std::size_t kMaxBytes = std::size_t{8} << 20;

    struct Record {
        std::uint16_t next = 0;
        std::span<const std::uint8_t> bytes;
    };

    /// False when it is full, or the record is longer than any can be; it is not kept then. A
    /// record that is there already stays.
    bool Add(std::uint16_t id, std::uint16_t next, std::span<const std::uint8_t> bytes);
    std::optional<Record> Find(std::uint16_t id) const;
    std::size_t size() const { return entries_.size(); }
    /// By the order in which they were added.
    Record At(std::size_t position) const;

private:
    std::uint32_t& Index(std::uint16_t id);

    struct Entry {
        std::uint32_t at;
        std::uint16_t length;
        std::uint16_t next;
    };

    std::vector<std::unique_ptr<std::uint8_t[]>> blocks_;
    std::size_t used_ = 0;  ///< of all blocks, gaps at their ends included
    std::vector<Entry> entries_;
    /// By ID: position plus 1; 0 for none. In pages, as most stores use few IDs.
    static constexpr std::size_t kIds = 0x10000;
    static constexpr std::size_t kPage = 256;
    using Page = std::array<std::uint32_t, kPage>;
    std::array<std::unique_ptr<Page>, kIds / kPage> index_;
};

}  // namespace tqrhost
