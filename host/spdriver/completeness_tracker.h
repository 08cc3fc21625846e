#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "host/spdriver/completeness.h"
#include "host/spdriver/fact_tracker.h"
#include "host/spdriver/loop_guard.h"
#include "host/spdriver/reading.h"
#include "host/spdriver/transport.h"
#include "ipmi/sdr_info.h"
#include "ipmi/sel_info.h"

namespace tqrhost {

/// Tracks what could be read of one node: the event log, the sensor repository, readings, FRU
/// devices and facts of the controller. Every exchange goes through unchanged; an empty answer is
/// none.
class CompletenessTracker : public Transport {
public:
    explicit CompletenessTracker(std::unique_ptr<LoopGuard> guard);
    std::optional<Response> Exchange(const RequestFrame& request) override;
    const NodeCompleteness& Completeness();
    /// How far the reading is that the request belongs to; empty when it belongs to none.
    std::optional<ReadingState> StateAfter(const RequestFrame& request) const;

private:
    void Note(const RequestFrame& request, const std::optional<Response>& response);
    /// One reading from the first record to the last.
    struct Walk {
        bool fromFirst = false;
        bool ended = false;  ///< no next record was named
        unsigned count = 0;
    };
    /// An account, and which records it has counted: a record that is read again counts once.
    struct Source {
        const char* infoCommand;
        const char* readCommand;
        bool isLog;
        SourceAccount* account;
        std::vector<bool> counted;
        Walk walk;
        /// The record whose beginning came last, and its length; 0 when that did not come.
        std::uint16_t record = 0;
        std::size_t recordLength = 0;
        /// How many bytes of it came, when it was wanted whole and was cut; else 0.
        std::size_t cutAt = 0;
        /// What was noted of a first record that is not there: no fault once 0 are announced.
        std::optional<ReadFault> noFirst{};
    };

    void NoteInfo(Source* source, bool askedAgain, const std::optional<Response>& response);
    void NoteLogState(const Response& response);
    void NoteSensorState(const Response& response);
    /// Judges a walk that is over: a second one that was whole does not make up for it.
    void FinishWalk(Source* source);
    void NoteRecord(Source* source, const RequestFrame& request,
                    const std::optional<Response>& response);
    /// The next part of a record that was cut: once it is whole, nothing is missing of it.
    void NoteRest(Source* source, std::uint16_t record, std::uint8_t offset,
                  const Response& response);
    void CountRecord(Source* source, std::uint16_t record);
    void NoteFru(const RequestFrame& request, const std::optional<Response>& response);
    /// Bytes that an answer must have, by what was asked and what is known of the record.
    static std::size_t WholeAnswer(const Source& source, std::uint16_t record, std::uint8_t offset,
                                   std::uint8_t count);
    /// False when it is known already, or there are too many.
    bool AddFault(ReadFault fault);
    /// What went wrong with an answer that has to have so many bytes; empty when nothing did.
    std::string ProblemOf(const std::optional<Response>& response, std::size_t least) const;

    std::unique_ptr<LoopGuard> guard_;
    NodeCompleteness account_;
    Source log_;
    Source sensors_;
    FactTracker facts_;
    std::uint8_t lastCommand_ = 0;  ///< Storage command
    /// The read of a FRU device that was refused last, and the faults that this added.
    struct RefusedFru {
        std::uint8_t device;
        std::uint16_t offset;
        std::vector<ReadFault> faults;
    };
    std::optional<RefusedFru> refusedFru_;
    std::optional<ipmi::SelInfo> logState_;
    std::optional<ipmi::SdrRepositoryInfo> sensorState_;
};

}  // namespace tqrhost
