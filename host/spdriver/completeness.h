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
    void NoteInfo(SourceAccount* source, const char* what, const std::optional<Response>& response,
                  std::size_t countAt);
    void NoteRecord(SourceAccount* source, const char* what, const RequestFrame& request,
                    const std::optional<Response>& response);
    void NoteFru(const RequestFrame& request, const std::optional<Response>& response);
    void AddFault(ReadFault fault);
    /// What went wrong with an answer that has to have so many bytes; empty when nothing did.
    std::string ProblemOf(const std::optional<Response>& response, std::size_t least) const;

    std::unique_ptr<LoopGuard> guard_;
    NodeCompleteness account_;
};

}  // namespace tqrhost
