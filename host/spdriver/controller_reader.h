#pragma once

#include <cstddef>
#include <functional>
#include <memory>
#include <optional>

#include "host/spdriver/controller_memory.h"
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
/// a second Get SEL Info: when the log has changed meanwhile it is read once more.
class ControllerReader : public std::enable_shared_from_this<ControllerReader> {
public:
    ControllerReader(RequestPipeline* pipeline, ReadingNeeds needs)
        : pipeline_(pipeline), needs_(needs) {}
    /// Asks for the first things; the rest follows as answers come.
    void Start();
    bool Done() const { return phase_ == Phase::kDone; }
    bool ReadsLog() const;
    ReadCount LogCount() const;
    ReadCount SensorCount() const;
    /// What was read, also of a reading that was stopped; once.
    ControllerMemory Take();

private:
    enum class Phase { kLog, kSensors, kCheck, kLogAgain, kCheckAgain, kDone };

    /// Asks without data and hands on the answer.
    void Ask(ipmi::Command command, std::function<void(std::optional<Response>)> take);
    void Pump();
    void StartSensors();
    void Check();
    void Checked(std::optional<Response> info);
    std::shared_ptr<RecordReader> Reader(ipmi::CommandCode command);

    RequestPipeline* pipeline_;
    ReadingNeeds needs_;
    Phase phase_ = Phase::kLog;
    ControllerMemory memory_;
    std::shared_ptr<RecordReader> log_;
    std::shared_ptr<RecordReader> logAgain_;
    std::shared_ptr<RecordReader> sensors_;
    std::optional<Response> infoAgain_;
    bool toldOfLog_ = false;  ///< Get SEL Info has been answered, or failed
    bool toldOfSensors_ = false;
    bool reserved_ = false;
    bool pumping_ = false;
};

}  // namespace tqrhost
