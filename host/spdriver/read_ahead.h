#pragma once

#include <compare>
#include <cstddef>
#include <cstdint>
#include <map>
#include <optional>
#include <vector>

#include "host/spdriver/transport.h"

namespace tqrhost {

/// One request without its frame: what identifies it when the same is asked again.
struct Ask {
    std::uint8_t netFn = 0;
    std::uint8_t lun = 0;
    std::uint8_t command = 0;
    std::vector<std::uint8_t> data;

    static Ask Of(const RequestFrame& frame);
    auto operator<=>(const Ask&) const = default;
};

/// Says what a reader of a BMC will ask next, from what it asks now and from the answers so far.
///
/// Three walks are known, and nothing but their read-only commands is ever guessed: the event log
/// by record ID (Get SEL Entry), the sensor repository by record ID with the parts of a record that
/// the reader takes (Get SDR), and the sixteen-byte chunks of a FRU device (Read FRU Data). The
/// first of the events is expected after Get SEL Info. Where
/// an answer has named the next record, that is taken; beyond it the stride of the last two record
/// IDs is tried. A wrong guess costs one answer that nobody asks for.
class ReadAhead {
public:
    /// The reader asks this now.
    void Asked(const Ask& ask);
    /// An answer came, to a request of the reader or to a guess.
    void Answered(const Ask& ask, const Response& response);
    /// The next `count` requests of the reader, in the order in which it will make them.
    std::vector<Ask> Next(std::size_t count) const;

private:
    /// What is known of the records of one walk.
    class Chain {
    public:
        void Restart();
        void LearnNext(std::uint16_t record, std::uint16_t next);
        /// The ID after `record`, known or tried; empty at the known end.
        std::optional<std::uint16_t> After(std::uint16_t record) const;
        /// Forgets what lies behind: the reader is at `record` now.
        void Passed(std::uint16_t record);

    private:
        std::map<std::uint16_t, std::uint16_t> next_;
        int stride_ = 1;
    };

    /// How a reader takes one record of the sensor repository, told by its first read.
    struct RecordReader {
        std::uint8_t headerLength = 0;  ///< 10: sensor records; 15: FRU device locators
    };
    struct RecordKind {
        std::uint8_t type = 0;
        std::uint8_t deviceId = 0;  ///< byte 6 of the record, where the header reaches it
    };

    void AppendRestOfRecord(std::uint16_t record, std::uint8_t afterOffset,
                            std::vector<Ask>* asks) const;
    Ask SdrAsk(std::uint16_t record, std::uint8_t offset, std::uint8_t count) const;

    std::optional<Ask> now_;
    Chain eventLog_;
    Chain sensorRepository_;
    RecordReader reader_;
    std::map<std::uint16_t, RecordKind> kinds_;
    std::uint8_t reservationLow_ = 0;
    std::uint8_t reservationHigh_ = 0;
};

}  // namespace tqrhost
