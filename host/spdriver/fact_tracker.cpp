#include "host/spdriver/fact_tracker.h"

#include <algorithm>

#include "base/text.h"
#include "ipmi/command.h"
#include "ipmi/fru_device_reader.h"

namespace tqrhost {
namespace {

constexpr ipmi::CommandCode kControllerFacts[] = {
    ipmi::kGetDeviceId,         ipmi::kGetSelfTestResults,   ipmi::kGetSystemGuid,
    ipmi::kGetDeviceGuid,       ipmi::kGetChassisStatus,     ipmi::kGetSelTime,
    ipmi::kGetSelTimeUtcOffset, ipmi::kGetSelAllocationInfo, ipmi::kGetPefConfigurationParameters,
};
constexpr ipmi::CommandCode kSensorFacts[] = {ipmi::kGetSensorReading, ipmi::kGetSensorThresholds,
                                              ipmi::kGetSensorReadingFactors};

bool IsAmong(std::span<const ipmi::CommandCode> facts, ipmi::CommandCode code) {
    return std::find(facts.begin(), facts.end(), code) != facts.end();
}

/// A controller that does not know a command does not have the fact.
bool IsUnknown(ipmi::CommandCode command, std::uint8_t completionCode) {
    return completionCode == ipmi::kInvalidCommand || completionCode == ipmi::kInvalidForLun ||
           (command == ipmi::kGetPefConfigurationParameters &&
            completionCode == ipmi::kParameterNotSupported);
}

std::string Key(ipmi::CommandCode code, unsigned which) {
    return ipmisel::Format("%02x%02x %04x", code.netFn, code.number, which);
}

}  // namespace

std::optional<ReadFault> FactTracker::Note(const RequestFrame& request,
                                           const std::optional<Response>& response,
                                           const ProblemOf& problemOf) {
    const ipmi::CommandCode code{request.netFn(), request.command()};
    const auto data = request.data();
    const std::uint8_t first = data.empty() ? 0 : data[0];
    const std::string name(ipmi::CommandName(code));
    if (response && IsUnknown(code, response->front())) return std::nullopt;
    const std::size_t least = ipmi::LeastAnswer(code);
    if (IsAmong(kControllerFacts, code)) {
        const unsigned which = data.size() < 2 ? first : first << 8 | data[1];
        const std::string problem = problemOf(least);
        Count(&controller_, Key(code, which), problem.empty());
        if (!problem.empty()) return ReadFault{name, "", problem, false};
    } else if (IsAmong(kSensorFacts, code)) {
        const unsigned which = static_cast<unsigned>(request.lun()) << 8 | first;
        const std::string problem = problemOf(least);
        if (code == ipmi::kGetSensorReading) Count(&readings_, Key(code, which), problem.empty());
        // That the sensor is not there is an answer.
        if (!problem.empty() && !(response && response->front() == ipmi::kNotPresent)) {
            return ReadFault{name, ipmisel::Format("%04x", which), problem, false};
        }
    } else if (code == ipmi::kGetFruInventoryAreaInfo) {
        if (response && response->front() == ipmi::kNotPresent) return std::nullopt;
        const std::string problem = problemOf(least);
        if (problem.empty()) {
            NoteArea(first, *response);
        } else {
            Count(&inventory_, Key(code, first), false);
            return ReadFault{name, ipmisel::Format("%04x", first), problem, false};
        }
    } else if (code == ipmi::kReadFruData && response && response->front() == ipmi::kCompleted) {
        NoteData(first, request, *response);
    }
    return std::nullopt;
}

void FactTracker::Count(SourceAccount* account, const std::string& key, bool isRead) {
    const auto [known, isNew] = seen_.try_emplace(key, false);
    if (isNew) account->announced = account->announced.value_or(0) + 1;
    if (isRead && !known->second) ++account->read;
    known->second = known->second || isRead;
}

void FactTracker::NoteArea(std::uint8_t device, const Response& response) {
    const auto info = ipmi::ParseFruAreaInfo(std::span(response).subspan(1));
    if (!info) return;
    Device& known = devices_[device];
    known.size = info->size;
    known.unit = info->byWords ? 2 : 1;
    Count(&inventory_, Key(ipmi::kGetFruInventoryAreaInfo, device), known.read >= known.size);
}

void FactTracker::NoteData(std::uint8_t device, const RequestFrame& request,
                           const Response& response) {
    const auto known = devices_.find(device);
    if (known == devices_.end() || request.data().size() < 3 || response.size() < 2) return;
    const std::size_t from =
        static_cast<std::size_t>(request.data()[1] | request.data()[2] << 8) * known->second.unit;
    if (from <= known->second.read) {
        known->second.read = std::max(known->second.read, from + response.size() - 2);
    }
    if (known->second.read >= known->second.size) {
        Count(&inventory_, Key(ipmi::kGetFruInventoryAreaInfo, device), true);
    }
}

}  // namespace tqrhost
