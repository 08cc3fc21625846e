#pragma once

#include <cstdint>
#include <optional>
#include <vector>

#include "plugins/standard/controller.h"

namespace standard {

/// Reads the records of the sensor repository: whole where the controller gives them, else in
/// parts under a reservation (IPMI 2.0, 33.12).
class RepositoryReader {
public:
    explicit RepositoryReader(Controller& controller) : controller_(controller) {}

    struct Record {
        std::uint16_t nextRecordId = 0;
        std::vector<std::uint8_t>
            bytes;  ///< shorter than its header says when the rest was refused
    };
    /// Empty when nothing of the record could be had.
    std::optional<Record> Read(std::uint16_t recordId);

private:
    std::optional<Record> ReadWhole(std::uint16_t recordId);
    /// Adds what is missing of a record; false when its reservation was lost: another record may
    /// now have its ID, and what was read of it cannot be gone on with.
    bool ReadRest(std::uint16_t recordId, Record* record);
    std::optional<Record> ReadHeader(std::uint16_t recordId);
    /// Under the present reservation, else a new one; a refusal of it drops it.
    std::optional<Answer> ReadPart(std::uint16_t recordId, std::size_t offset, std::size_t count);
    bool Reserve();

    Controller& controller_;
    bool inParts_ = false;  ///< the controller has refused whole records
    std::optional<std::uint16_t> reservation_;
};

}  // namespace standard
