#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "host/spdriver/loop_guard.h"
#include "host/spdriver/transport.h"

namespace tqrhost {

/// Watches one node's exchanges and keeps account of what could be read: the event log, the sensor
/// repository and the FRU devices. Also the place where a collection is stopped: after a deadline
/// or an interruption no command goes through.
class ReadingWatch : public Transport {
public:
    explicit ReadingWatch(std::unique_ptr<LoopGuard> guard);
    std::optional<Response> Exchange(const RequestFrame& request) override;
    const NodeCompleteness& Account() const { return account_; }

private:
    void Note(const RequestFrame& request, const std::optional<Response>& response);
    /// An account, and which records it has counted: a record that is read again counts once.
    struct Source {
        const char* infoCommand;
        const char* readCommand;
        std::size_t wholeAnswer;  ///< bytes of an answer that is not short
        SourceAccount* account;
        std::vector<bool> counted;
    };

    void NoteInfo(const Source& source, const std::optional<Response>& response);
    void NoteRecord(Source* source, const RequestFrame& request,
                    const std::optional<Response>& response);
    void NoteFru(const RequestFrame& request, const std::optional<Response>& response);
    void AddFault(ReadFault fault);
    /// What went wrong with an answer that has to have so many bytes; empty when nothing did.
    std::string ProblemOf(const std::optional<Response>& response, std::size_t least) const;

    std::unique_ptr<LoopGuard> guard_;
    NodeCompleteness account_;
    Source log_;
    Source sensors_;
};

}  // namespace tqrhost
