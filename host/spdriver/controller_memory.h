#pragma once

#include <cstdint>
#include <memory>
#include <optional>

#include "host/spdriver/record_store.h"
#include "host/spdriver/transport.h"
#include "ipmi/command.h"

namespace tqrhost {

/// What Reserve SDR Repository answered; empty when it gave none.
std::optional<std::uint16_t> ReservationIn(const std::optional<Response>& response);

/// What was read of one controller before the plug-ins' pass: its event log and its sensor
/// repository, in one state for all who ask.
struct ControllerMemory {
    std::optional<Response> guid;  ///< of Get System GUID, where it was asked for
    /// Answers of Get SEL Info, Get SDR Repository Info and Reserve SDR Repository; empty where
    /// they were not asked for or refused.
    std::optional<Response> logInfo;
    std::optional<Response> sensorInfo;
    std::optional<Response> reservation;
    /// What a log without records answers for the first one.
    std::optional<Response> emptyLog;
    std::unique_ptr<RecordStore> log;
    std::unique_ptr<RecordStore> sensors;
    /// The log has changed while it was read, and once more while it was read again: the last
    /// answer of Get SEL Info, or nothing when that could not be had. Otherwise not set.
    std::optional<std::optional<Response>> laterLogInfo;
    /// The repository has changed while it was read: the last answer of Get SDR Repository Info.
    std::optional<Response> laterSensorInfo;

    /// What the controller would answer; empty when it has to be asked.
    std::optional<Response> Answer(const ipmi::Command& command) const;
};

}  // namespace tqrhost
