#pragma once

#include <cstdint>
#include <optional>
#include <vector>

#include "host/spdriver/transport.h"
#include "ipmi/sel_record.h"

namespace NQORTQR20 {

/// What an earlier collection read of a controller, of which a later one need not read what is
/// still the same. Answers stand as they came, completion code included.
struct KnownController {
    Response guid;                    ///< of Get System GUID
    Response logInfo;                 ///< of Get SEL Info
    std::vector<ipmi::SelBytes> log;  ///< in the log's order
    /// Of Get SDR Repository Info; empty when the repository is not known.
    Response sensorInfo;
    std::vector<std::vector<std::uint8_t>> sensorRecords;  ///< in the repository's order
};

/// What a reading found of a log that was known.
enum class LogChange {
    kNotKnown,   ///< nothing was known of it; read whole
    kUnchanged,  ///< as it was: nothing was read, of the sensor repository neither
    kSameLog,    ///< as it was, though other things are not: no record of it was read
    kGrown,      ///< the records that were known still stand; the new ones were read
    kDifferent,  ///< it is another, or cannot be told from another; read whole
    kReplaced,   ///< another controller answers; read whole
};

/// How the reading of a node went.
struct NodeReading {
    LogChange logChange = LogChange::kNotKnown;
    /// Whether it said what its GUID is, or that it has none; false when no answer came. True
    /// where nobody asked.
    bool guidAnswered = true;
    /// What a later collection may begin with; empty when the log was not read to its end, has
    /// changed meanwhile, or its records cannot be told by their IDs.
    std::optional<KnownController> known;
};

}  // namespace NQORTQR20
