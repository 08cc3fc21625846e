#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <vector>

#include "host/spdriver/pipeline.h"
#include "host/spdriver/record_store.h"
#include "ipmi/command.h"

namespace tqrhost {

/// Reads an event log or a sensor repository from the first record to the last into a store, with
/// as many requests outstanding as the pipeline has room for.
///
/// A record is asked for as soon as the one before it has named it; further ones are tried by the
/// step of the last two IDs, as long as such tries come true. Records are read whole. A sensor
/// repository whose controller refuses that (completion codes CAh, C7h, C8h) or answers less than
/// the record's length is read in parts from then on, of 22 bytes and fewer if need be.
class RecordReader : public std::enable_shared_from_this<RecordReader> {
public:
    /// `command` is Get SEL Entry or Get SDR. `progress` is called after every answer.
    RecordReader(RequestPipeline* pipeline, ipmi::CommandCode command,
                 std::function<void()> progress);

    /// How many records are announced: no try goes beyond them, and none is made before this is
    /// known.
    void Expect(std::size_t records) { expected_ = records; }
    /// Begins with this record instead of the first one.
    void BeginAt(std::uint16_t id) { position_ = id; }
    void Reserved(std::uint16_t reservation) { reservation_ = reservation; }
    /// Asks for what there is room for; to be called when there may be room.
    void Pump();
    /// As many as are announced are there or on their way.
    bool HasRequestedAll() const {
        return expected_ && store_->size() + incoming_.size() >= *expected_;
    }
    /// The last record has come, the next one could not be read, or the chain led back.
    bool Finished() const { return finished_; }
    /// It was read to its end: the last record named no next one.
    bool ReachedEnd() const { return reachedEnd_; }
    /// The completion code with which the first record was refused: what an empty one answers.
    const std::optional<Response>& refusal() const { return refusal_; }
    /// The reservation that parts are read under.
    std::uint16_t reservation() const { return reservation_; }
    const RecordStore& store() const { return *store_; }
    std::unique_ptr<RecordStore> TakeStore() { return std::move(store_); }

private:
    /// A record that was asked for and is not in the store yet.
    struct Incoming {
        std::uint16_t next = 0;
        std::vector<std::uint8_t> bytes;
        std::size_t length = 0;   ///< of the record; 0 until its header has come
        unsigned pending = 0;     ///< requests without an answer
        unsigned generation = 0;  ///< answers to requests of earlier ones are void
        bool headed = false;      ///< its beginning has come, and with it the next ID
        bool failed = false;
        bool isGuess = false;
        unsigned tries = 1;
    };

    void RequestRecord(std::uint16_t id, bool isGuess);
    void RequestAgain(std::uint16_t id, Incoming* record);
    void RequestPart(std::uint16_t id, Incoming* record, std::size_t offset, std::size_t count);
    void Answered(std::uint16_t id, unsigned generation, std::size_t offset, std::size_t count,
                  const std::optional<Response>& response);
    /// What to do about a completion code; true when the record has been asked for again.
    bool Recovered(std::uint16_t id, Incoming* record, std::size_t offset, std::size_t count,
                   std::uint8_t code);
    void TakeBytes(std::uint16_t id, Incoming* record, std::size_t offset, std::size_t count,
                   const Response& response);
    void Reserve();
    /// Moves the records that are there, in their order, into the store.
    void Drain();
    void Finish(bool reachedEnd);
    void Guess();

    RequestPipeline* pipeline_;
    ipmi::CommandCode command_;
    std::function<void()> progress_;
    std::unique_ptr<RecordStore> store_ = std::make_unique<RecordStore>();
    std::map<std::uint16_t, Incoming> incoming_;
    std::optional<Response> refusal_;
    std::optional<std::size_t> expected_;
    std::uint16_t reservation_ = ipmi::kNoReservation;
    std::uint16_t position_ = ipmi::kFirstRecordId;
    unsigned step_ = 1;
    std::size_t guesses_ = 0;
    std::size_t hits_ = 0;
    bool whole_ = true;
    std::size_t part_;
    unsigned reservations_ = 0;  ///< taken anew
    bool reserving_ = false;
    bool finished_ = false;
    bool reachedEnd_ = false;
};

}  // namespace tqrhost
