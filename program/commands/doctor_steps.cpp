#include "program/commands/doctor_steps.h"

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <ctime>
#include <set>
#include <span>
#include <vector>

#include "base/bytes.h"
#include "base/text.h"
#include "ipmi/sdr_record.h"
#include "ipmi/sel_info.h"
#include "ipmi/timestamp.h"
#include "program/reports/terminal_text.h"

namespace ipmisel {
namespace {

using Clock = std::chrono::steady_clock;
using NQORTQR20::Response;

struct ReadCommand {
    ipmi::Command command;
    bool needed;  ///< a report is not whole without it
};

std::vector<ReadCommand> ReadCommands() {
    constexpr std::uint8_t kFruDevice = 0, kHeader = 8;
    return {{ipmi::GetDeviceId(), true},
            {ipmi::GetSelfTestResults(), false},
            {ipmi::GetSystemGuid(), false},
            {ipmi::GetDeviceGuid(), false},
            {ipmi::GetChassisStatus(), false},
            {ipmi::GetSelInfo(), true},
            {ipmi::GetSelAllocationInfo(), false},
            {ipmi::GetSelEntry(ipmi::kFirstRecordId), true},
            {ipmi::GetSelTimeUtcOffset(), false},
            {ipmi::MakeCommand(ipmi::kGetAuxiliaryLogStatus, {0}), false},
            {ipmi::GetSdrRepositoryInfo(), true},
            {ipmi::ReserveSdrRepository(), true},
            {ipmi::GetFruInventoryAreaInfo(kFruDevice), false},
            {ipmi::ReadFruData(kFruDevice, 0, kHeader), false},
            {ipmi::GetPefConfigurationParameters(ipmi::kPefEventFilterCount), false}};
}

/// The first sensor of the repository that the BMC itself owns and that has a reading; the
/// beginning of each record is enough for it.
std::optional<ipmi::SensorKey> FindSensor(DoctorController* controller) {
    constexpr unsigned kMaxRecords = 64;
    constexpr std::uint8_t kKeyEnd = 8;
    std::uint16_t id = ipmi::kFirstRecordId;
    for (unsigned i = 0; i < kMaxRecords; ++i) {
        const auto answer = controller->Exchange(ipmi::GetSdr(id, 0, kKeyEnd));
        if (!answer || answer->front() != ipmi::kCompleted) return std::nullopt;
        const auto data = std::span(*answer).subspan(1);
        ByteReader in(data);
        id = in.U16();
        in.Skip(ipmi::kSdrHeaderLength);
        const ipmi::SensorKey key{in.U8(), static_cast<std::uint8_t>(in.U8() & 3), in.U8()};
        if (!in.ok()) return std::nullopt;
        const auto header = ipmi::SdrHeader::Parse(data.subspan(2));
        if (!header) return std::nullopt;
        const bool hasReading =
            header->type == ipmi::SdrType::kFull || header->type == ipmi::SdrType::kCompact;
        if (hasReading && key.owner == ipmi::kBmcAddress) return key;
        if (id == ipmi::kLastRecordId) break;
    }
    return std::nullopt;
}

std::vector<ReadCommand> SensorCommands(const ipmi::SensorKey& key) {
    constexpr std::uint8_t kSomeReading = 0;
    return {{ipmi::GetSensorReading(key.number, key.lun), false},
            {ipmi::GetSensorThresholds(key.number, key.lun), false},
            {ipmi::GetSensorHysteresis(key.number, key.lun), false},
            {ipmi::GetSensorEventStatus(key.number, key.lun), false},
            {ipmi::GetSensorReadingFactors(key.number, kSomeReading, key.lun), false}};
}

/// What a BMC says that cannot do anything at the moment, or its driver in its stead.
bool IsOutOfOrder(std::uint8_t completion) {
    return completion == ipmi::kNodeBusy || completion == ipmi::kCommandTimeout ||
           completion == ipmi::kFirmwareInUpdate || completion == ipmi::kInitializing ||
           completion == ipmi::kUnspecifiedError;
}

/// One read of those above. False when the BMC does not work at all.
bool TryCommand(DoctorController* controller, const ReadCommand& read, bool* emptyLog,
                Steps* steps) {
    const ipmi::CommandCode code = read.command.code();
    const std::string name(ipmi::CommandName(code));
    const auto began = Clock::now();
    const auto answer = controller->Exchange(read.command);
    const std::string took = Milliseconds(Clock::now() - began);
    if (!answer) {
        steps->Bad(name, "no answer after " + took +
                             (code == ipmi::kGetDeviceId
                                  ? "; the BMC hangs: reset it, at last by taking the power cord"
                                  : "; give it longer with --timeout, or fewer requests at a time "
                                    "with --window 1"));
        return code != ipmi::kGetDeviceId;
    }
    const std::uint8_t completion = answer->front();
    const auto data = std::span(*answer).subspan(1);
    if (code == ipmi::kGetSelInfo && completion == ipmi::kCompleted) {
        const auto info = ipmi::ParseSelInfo(data);
        *emptyLog = info && info->records == 0;
        if (info && info->overflow) {
            steps->Bad(name, "the log is full and has dropped events; save it, then clear it");
            return true;
        }
    }
    if (completion == ipmi::kCompleted) {
        steps->Good(name, took);
        return true;
    }
    if (code == ipmi::kGetSelEntry && *emptyLog) {
        steps->Note(name, "the log is empty");
        return true;
    }
    const std::string text = Format("%s (completion code %02x), %s",
                                    std::string(ipmi::CompletionCodeText(code, completion)).c_str(),
                                    completion, took.c_str());
    if (code == ipmi::kGetDeviceId && IsOutOfOrder(completion)) {
        steps->Bad(name, text +
                             "; the BMC is starting, being updated, or hangs: wait some minutes, "
                             "then reset it, at last by taking the power cord");
        return false;
    }
    const char* const advice =
        completion == ipmi::kInsufficientPrivilege
            ? "; log in with a higher --privilege, or as another user"
            : "; the report will lack what it tells: look for newer firmware of the BMC";
    if (read.needed || completion == ipmi::kInsufficientPrivilege) {
        steps->Bad(name, text + advice);
    } else {
        steps->Note(name, text);
    }
    return true;
}

}  // namespace

void Steps::Line(std::string_view mark, std::string_view what, const std::string& result) {
    const std::string line = Fit(mark, 6) + " " + Fit(what, 32) + " " + TerminalText(result) + "\n";
    if (std::fwrite(line.data(), 1, line.size(), stdout) != line.size() ||
        std::fflush(stdout) != 0) {
        throw Failure(kExitUsage, std::string("cannot write the output: ") + std::strerror(errno) +
                                      "; make room there");
    }
}

std::string Milliseconds(Clock::duration time) {
    return Format("%.2f ms", std::chrono::duration<double, std::milli>(time).count());
}

std::optional<Response> DoctorController::Exchange(const ipmi::Command& command) {
    const NQORTQR20::SourceNode& node = source_.nodes.front();
    if (node.transport) return node.transport->Exchange(NQORTQR20::RequestFrame(command));
    return NQORTQR20::ExchangeOver(*node.pipeline, command);
}

bool TryCommands(DoctorController* controller, Steps* steps) {
    bool emptyLog = false;
    for (const ReadCommand& read : ReadCommands()) {
        if (!TryCommand(controller, read, &emptyLog, steps)) return false;
    }
    if (const auto sensor = FindSensor(controller)) {
        for (const ReadCommand& read : SensorCommands(*sensor)) {
            TryCommand(controller, read, &emptyLog, steps);
        }
    }
    return true;
}

void TryLog(DoctorController* controller, Steps* steps) {
    constexpr std::string_view kWhat = "event log";
    constexpr std::size_t kMaxRecords = 256;
    constexpr const char* kAdvice = "; the report will be partial: try again after a BMC reset";
    std::set<std::uint16_t> seen;
    std::uint16_t id = ipmi::kFirstRecordId;
    const auto began = Clock::now();
    while (seen.size() < kMaxRecords && id != ipmi::kLastRecordId) {
        const ipmi::Command command = ipmi::GetSelEntry(id);
        const auto answer = controller->Exchange(command);
        const std::string record =
            seen.empty() ? "the first record" : Format("record %04x", unsigned{id});
        const std::uint8_t completion = answer ? answer->front() : ipmi::kCompleted;
        if (seen.empty() && completion == ipmi::kNotPresent) return;  // empty, and said so
        std::string problem;
        if (!answer) {
            problem = "no answer";
        } else if (completion != ipmi::kCompleted) {
            problem = ipmi::CompletionCodeText(command.code(), completion);
        } else if (answer->size() < 3) {
            problem = "a short answer";
        } else if (!seen.insert(id).second) {
            problem = "comes again: the log runs in a circle";
        }
        if (!problem.empty()) {
            steps->Bad(kWhat, std::string(record).append(": ").append(problem).append(kAdvice));
            return;
        }
        id = ByteReader(std::span(*answer).subspan(1)).U16();
    }
    const std::string text = Format("%zu records read, ", seen.size());
    steps->Good(kWhat, text + Milliseconds((Clock::now() - began) / seen.size()) + " each");
}

void TrySensorRecords(DoctorController* controller, Steps* steps) {
    constexpr std::string_view kWhat = "sensor records";
    const ipmi::Command command = ipmi::GetSdr(ipmi::kFirstRecordId);
    const auto began = Clock::now();
    const auto answer = controller->Exchange(command);
    if (!answer) {
        steps->Bad(kWhat, "no answer when a whole one is read; report it to the BMC's vendor");
    } else if (answer->front() == ipmi::kCompleted) {
        steps->Good(kWhat, "read whole, " + Milliseconds(Clock::now() - began));
    } else if (ipmi::RefusesSoManyBytes(answer->front())) {
        steps->Note(kWhat, "read in parts: the BMC does not give them whole");
    } else if (answer->front() == ipmi::kNotPresent) {
        steps->Note(kWhat, "there are none");
    } else {
        steps->Bad(kWhat,
                   std::string(ipmi::CompletionCodeText(command.code(), answer->front())) +
                       "; the report will have no names of sensors: try again after a BMC reset");
    }
}

void TryClock(DoctorController* controller, Steps* steps) {
    constexpr std::string_view kWhat = "clock";
    constexpr long long kMaxOffset = 60;
    const auto read = [&](const ipmi::Command& command, auto parse) {
        const auto answer = controller->Exchange(command);
        return answer && answer->front() == ipmi::kCompleted ? parse(std::span(*answer).subspan(1))
                                                             : std::nullopt;
    };
    const auto utcOffset = read(ipmi::GetSelTimeUtcOffset(), ipmi::ParseSelTimeUtcOffset);
    const auto time = read(ipmi::GetSelTime(), ipmi::ParseSelTime);
    if (!time) {
        steps->Bad(kWhat, "the BMC does not tell its time; times in the report cannot be compared");
        return;
    }
    if (ipmi::KindOfTime(*time) != ipmi::TimeKind::kClock) {
        steps->Bad(kWhat,
                   "never set, it counts from the BMC's start; set it at the BMC, or let it "
                   "take the time from NTP");
        return;
    }
    // A BMC that tells its UTC offset keeps local time.
    const long long offset =
        static_cast<long long>(*time) - 60LL * utcOffset.value_or(0) - std::time(nullptr);
    const std::string text = Format("%+lld s against this machine's", offset);
    if (offset > kMaxOffset || offset < -kMaxOffset) {
        steps->Bad(kWhat, text + "; set it at the BMC, or let it take the time from NTP");
    } else {
        steps->Good(kWhat, text);
    }
}

}  // namespace ipmisel
