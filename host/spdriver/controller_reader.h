#pragma once

#include <cstddef>
#include <functional>
#include <memory>
#include <optional>
#include <utility>

#include "host/spdriver/controller_memory.h"
#include "host/spdriver/known_controller.h"
#include "host/spdriver/pipeline.h"
#include "host/spdriver/reading.h"
#include "host/spdriver/record_reader.h"

namespace tqrhost {

/// Records that have come, of how many that the controller announced.
struct ReadCount {
    std::size_t read = 0;
    std::optional<std::size_t> announced{};  ///< empty when it has not said, or not yet
};

/// Reads the event log and then the sensor repository of one controller into its memory. Ends with
/// a second Get SEL Info: when the log has changed meanwhile it is read once more. A second Get SDR
/// Repository Info tells whether the repository has changed, which is noted.
///
/// Of a controller that is known from an earlier collection only what is new is read, as far as
/// that can be proven: the GUID is the same, and the last record that is known stands under its ID
/// with the same bytes. With the count and both time stamps of the log unchanged nothing more is
/// read. With records behind it, the last erasure unchanged and as many of them as the count has
/// grown by, those are read. Everything else is another log, and read whole.
class ControllerReader : public std::enable_shared_from_this<ControllerReader> {
public:
    ControllerReader(RequestPipeline* pipeline, ReadingNeeds needs,
                     std::optional<KnownController> known = std::nullopt)
        : pipeline_(pipeline), needs_(needs), known_(std::move(known)) {}
    /// Asks for the first things; the rest follows as answers come.
    void Start();
    bool Done() const { return phase_ == Phase::kDone && !checkingSensors_; }
    bool ReadsLog() const;
    ReadCount LogCount() const;
    ReadCount SensorCount() const;
    /// How it went; before Take.
    NodeReading Result() const;
    /// What was read, also of a reading that was stopped; once.
    ControllerMemory Take();

private:
    enum class Phase { kCompare, kLog, kSensors, kCheck, kLogAgain, kCheckAgain, kDone };

    /// Asks and hands on the answer, as long as the reader is there.
    void Send(ipmi::Command command, std::function<void(std::optional<Response>)> take);
    void Pump();
    void StartWhole();
    void StartComparing();
    void RequestGuid();
    /// What is known and what the controller says now have come.
    void Compare();
    /// Puts the records that were known before those that were read; false when they do not make
    /// the log that was announced.
    bool Join();
    void ReadWhole();
    bool SensorsAreKnown() const;
    void RecallSensors();
    void StartSensors();
    void Check();
    void CheckSensors();
    void Checked(std::optional<Response> info);
    /// More records came than there are: some were added, and as many dropped, within the second
    /// that the time stamps count by.
    bool MoreThanAnnounced() const;
    std::shared_ptr<RecordReader> Reader(ipmi::CommandCode command);

    RequestPipeline* pipeline_;
    ReadingNeeds needs_;
    Phase phase_ = Phase::kLog;
    ControllerMemory memory_;
    std::shared_ptr<RecordReader> log_;
    std::shared_ptr<RecordReader> logAgain_;
    std::shared_ptr<RecordReader> sensors_;
    std::optional<Response> infoAgain_;
    std::optional<KnownController> known_;
    LogChange change_ = LogChange::kNotKnown;
    unsigned comparing_ = 0;                     ///< answers to come
    std::optional<Response> lastKnown_, first_;  ///< records as they stand now, with the next ID
    std::unique_ptr<RecordStore> joined_;        ///< known and new records
    std::optional<Response> guid_;
    std::optional<Response> sensorAnswer_;  ///< of Get SDR Repository Info, whatever it is
    bool toldOfLog_ = false;                ///< Get SEL Info has been answered, or failed
    bool toldOfSensors_ = false;
    bool reserving_ = false;
    bool reserved_ = false;
    bool checkingSensors_ = false;  ///< the second Get SDR Repository Info is on its way
    bool pumping_ = false;
};

}  // namespace tqrhost
