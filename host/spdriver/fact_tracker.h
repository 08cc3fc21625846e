#pragma once

#include <cstdint>
#include <functional>
#include <map>
#include <optional>
#include <string>

#include "host/spdriver/completeness.h"
#include "host/spdriver/transport.h"

namespace tqrhost {

/// Tracks the reads beside event log and sensor repository: the controller's facts, sensor
/// readings, inventory devices. Each is announced when it is first asked for, unless the controller
/// answers that it does not have it, and counts once however often it is read.
class FactTracker {
public:
    /// What is wrong with an answer that has to have so many bytes; empty when nothing is.
    using ProblemOf = std::function<std::string(std::size_t least)>;

    /// The fault to note, where there is one.
    std::optional<ReadFault> Note(const RequestFrame& request,
                                  const std::optional<Response>& response,
                                  const ProblemOf& problemOf);

    const SourceAccount& controller() const { return controller_; }
    const SourceAccount& readings() const { return readings_; }
    const SourceAccount& inventory() const { return inventory_; }

private:
    struct Device {
        std::size_t size = 0;
        std::size_t unit = 1;  ///< bytes that offsets and counts are in
        std::size_t read = 0;  ///< from the beginning, without a gap
    };

    void Count(SourceAccount* account, const std::string& key, bool isRead);
    void NoteArea(std::uint8_t device, const Response& response);
    void NoteData(std::uint8_t device, const RequestFrame& request, const Response& response);

    SourceAccount controller_, readings_, inventory_;
    std::map<std::string, bool> seen_;  ///< what was asked for; whether it was read
    std::map<std::uint8_t, Device> devices_;
};

}  // namespace tqrhost
