#include "host/spdriver/controller_reader.h"

#include <span>
#include <utility>

#include "base/bytes.h"
#include "ipmi/sel_info.h"

namespace tqrhost {
namespace {

/// As many as there are IDs.
constexpr std::size_t kUnknownCount = 0x10000;

std::span<const std::uint8_t> DataOf(const Response& response) {
    return std::span(response).subspan(1);
}

bool Completed(const std::optional<Response>& response) {
    return response && !response->empty() && response->front() == ipmi::kCompleted;
}

/// The answers differ in the count of records or in a time stamp, or cannot be compared.
bool Changed(const std::optional<Response>& before, const std::optional<Response>& after) {
    if (!Completed(before)) return false;
    if (!Completed(after)) return true;
    const auto a = ipmi::ParseSelInfo(DataOf(*before));
    const auto b = ipmi::ParseSelInfo(DataOf(*after));
    if (!a || !b) return *before != *after;
    return a->records != b->records || a->lastAddition != b->lastAddition ||
           a->lastErase != b->lastErase;
}

/// Version, then the number of records: in both repositories' information.
std::optional<std::uint16_t> CountIn(const std::optional<Response>& info) {
    if (!Completed(info)) return std::nullopt;
    ipmisel::ByteReader in(DataOf(*info));
    in.U8();
    const std::uint16_t count = in.U16();
    if (!in.ok()) return std::nullopt;
    return count;
}

}  // namespace

void ControllerReader::Ask(ipmi::Command command,
                           std::function<void(std::optional<Response>)> take) {
    pipeline_->Submit(std::move(command), [self = weak_from_this(), take = std::move(take)](
                                              std::optional<Response> response) {
        if (const auto reader = self.lock()) {
            take(std::move(response));
            reader->Pump();
        }
    });
}

std::shared_ptr<RecordReader> ControllerReader::Reader(ipmi::CommandCode command) {
    return std::make_shared<RecordReader>(pipeline_, command, [self = weak_from_this()] {
        if (const auto reader = self.lock()) reader->Pump();
    });
}

void ControllerReader::Start() {
    if (needs_.log) {
        log_ = Reader(ipmi::kGetSelEntry);
        Ask(ipmi::GetSelInfo(), [this](std::optional<Response> info) {
            log_->Expect(CountIn(info).value_or(kUnknownCount));
            toldOfLog_ = true;
            if (Completed(info)) memory_.logInfo = std::move(info);
        });
    }
    if (needs_.sensors) {
        // Beside the log: it costs no time there.
        Ask(ipmi::GetSdrRepositoryInfo(), [this](std::optional<Response> info) {
            if (Completed(info)) memory_.sensorInfo = std::move(info);
            toldOfSensors_ = true;
        });
        Ask(ipmi::ReserveSdrRepository(), [this](std::optional<Response> reservation) {
            if (Completed(reservation)) memory_.reservation = std::move(reservation);
            reserved_ = true;
        });
    }
    Pump();
}

void ControllerReader::StartSensors() {
    sensors_ = Reader(ipmi::kGetSdr);
    sensors_->Expect(CountIn(memory_.sensorInfo).value_or(kUnknownCount));
    if (memory_.reservation) {
        ipmisel::ByteReader in(DataOf(*memory_.reservation));
        sensors_->Reserved(in.U16());
    }
}

void ControllerReader::Pump() {
    if (std::exchange(pumping_, true)) return;
    if (phase_ == Phase::kLog) {
        if (log_) log_->Pump();
        if (!log_ || (log_->Finished() && toldOfLog_)) phase_ = Phase::kSensors;
    }
    if (phase_ == Phase::kSensors && (!needs_.sensors || (reserved_ && toldOfSensors_))) {
        if (needs_.sensors && !sensors_) StartSensors();
        if (sensors_) sensors_->Pump();
        if (!sensors_ || sensors_->Finished()) {
            phase_ = Phase::kCheck;
            Check();
        }
    }
    if (phase_ == Phase::kLogAgain) {
        logAgain_->Pump();
        if (logAgain_->Finished()) {
            phase_ = Phase::kCheckAgain;
            Check();
        }
    }
    pumping_ = false;
}

void ControllerReader::Check() {
    if (!memory_.logInfo) {
        phase_ = Phase::kDone;
        return;
    }
    Ask(ipmi::GetSelInfo(), [this](std::optional<Response> info) { Checked(std::move(info)); });
}

void ControllerReader::Checked(std::optional<Response> info) {
    if (phase_ == Phase::kCheck) {
        if (!Changed(memory_.logInfo, info)) {
            phase_ = Phase::kDone;
        } else if (!Completed(info)) {
            memory_.laterLogInfo.emplace();  // whether it has changed is not known
            phase_ = Phase::kDone;
        } else {
            infoAgain_ = std::move(info);
            logAgain_ = Reader(ipmi::kGetSelEntry);
            logAgain_->Expect(CountIn(infoAgain_).value_or(kUnknownCount));
            phase_ = Phase::kLogAgain;
        }
        return;
    }
    phase_ = Phase::kDone;
    if (!logAgain_->ReachedEnd() && log_->ReachedEnd() && CountIn(infoAgain_) != 0u) {
        // The first reading is the more whole one.
        memory_.laterLogInfo.emplace(std::move(info));
        return;
    }
    log_ = std::move(logAgain_);
    const bool changedAgain = Changed(infoAgain_, info);
    memory_.logInfo = std::move(infoAgain_);
    if (!changedAgain) return;
    // The larger count goes with the records: no reader is to leave one out for it.
    if (Completed(info) && CountIn(info) > CountIn(memory_.logInfo))
        std::swap(info, memory_.logInfo);
    memory_.laterLogInfo.emplace(std::move(info));
}

bool ControllerReader::ReadsLog() const {
    return phase_ == Phase::kLog || phase_ == Phase::kLogAgain;
}

ReadCount ControllerReader::LogCount() const {
    if (!needs_.log) return {0, 0};
    const auto& reader = logAgain_ ? logAgain_ : log_;
    return {reader ? reader->store().size() : 0, CountIn(logAgain_ ? infoAgain_ : memory_.logInfo)};
}

ReadCount ControllerReader::SensorCount() const {
    if (!needs_.sensors) return {0, 0};
    return {sensors_ ? sensors_->store().size() : 0, CountIn(memory_.sensorInfo)};
}

ControllerMemory ControllerReader::Take() {
    if (log_) {
        const auto& refusal = log_->refusal();
        if (log_->store().size() == 0 && refusal && refusal->front() == ipmi::kNotPresent) {
            memory_.emptyLog = refusal;
        }
        memory_.log = log_->TakeStore();
    }
    if (sensors_) {
        // Parts may have been read under a newer reservation; that one holds.
        if (memory_.reservation && memory_.reservation->size() >= 3) {
            const std::uint16_t last = sensors_->reservation();
            (*memory_.reservation)[1] = static_cast<std::uint8_t>(last);
            (*memory_.reservation)[2] = static_cast<std::uint8_t>(last >> 8);
        }
        memory_.sensors = sensors_->TakeStore();
    }
    return std::move(memory_);
}

}  // namespace tqrhost
