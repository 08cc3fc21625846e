#include "host/spdriver/controller_reader.h"

#include <algorithm>
#include <span>
#include <utility>
#include <vector>

#include "base/bytes.h"
#include "ipmi/sdr_info.h"
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
    return a->HasChanged(*b);
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

/// No answer, or one that says "later": it is not known then.
bool IsAnswer(const std::optional<Response>& response) {
    if (!response || response->empty()) return false;
    switch (response->front()) {
        case ipmi::kNodeBusy:
        case ipmi::kCommandTimeout:
        case ipmi::kSdrRepositoryInUpdate:
        case ipmi::kFirmwareInUpdate:
        case ipmi::kInitializing:
            return false;
        default:
            return true;
    }
}

std::uint16_t IdOf(std::span<const std::uint8_t> record) {
    ipmisel::ByteReader in(record);
    return in.U16();
}

/// Answers of Get SDR Repository Info that tell of one state.
bool SameRepository(const Response& before, const std::optional<Response>& now) {
    if (before.empty() || !IsAnswer(now)) return false;
    if (before.front() != ipmi::kCompleted) return before == *now;
    if (!Completed(now)) return false;
    const auto a = ipmi::SdrRepositoryInfo::Parse(DataOf(before));
    const auto b = ipmi::SdrRepositoryInfo::Parse(DataOf(*now));
    return a && b && !a->HasChanged(*b);
}

/// What an answer of Get SEL Info says; empty when it says nothing.
std::optional<ipmi::SelInfo> LogInfoIn(const Response& response) {
    if (!Completed(response)) return std::nullopt;
    return ipmi::ParseSelInfo(DataOf(response));
}

/// The record of an answer of Get SEL Entry is this one.
bool HoldsRecord(const std::optional<Response>& response, const ipmi::SelBytes& record) {
    return Completed(response) && std::ranges::equal(ipmi::RecordIn(*response), record);
}

/// Each record names the one that follows by its ID, and the last one none.
bool IsChain(const RecordStore& records) {
    for (std::size_t i = 0; i < records.size(); ++i) {
        const std::uint16_t next =
            i + 1 < records.size() ? IdOf(records.At(i + 1).bytes) : ipmi::kLastRecordId;
        if (records.At(i).next != next) return false;
    }
    return true;
}

/// Adds records that name each other by their IDs; `end` is what the last one names.
template <typename Record>
void AddChain(const std::vector<Record>& records, std::uint16_t end, RecordStore* store) {
    std::uint16_t id = ipmi::kFirstRecordId;
    for (std::size_t i = 0; i < records.size(); ++i) {
        const std::uint16_t next = i + 1 < records.size() ? IdOf(records[i + 1]) : end;
        store->Add(id, next, records[i]);
        id = next;
    }
}

}  // namespace

void ControllerReader::Send(ipmi::Command command,
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

void ControllerReader::RequestGuid() {
    Send(ipmi::GetSystemGuid(), [this](std::optional<Response> guid) {
        if (IsAnswer(guid)) guid_ = std::move(guid);
        if (comparing_ > 0) --comparing_;
    });
}

void ControllerReader::Start() {
    if (known_ && needs_.log) {
        StartComparing();
    } else {
        if (needs_.guid) RequestGuid();
        StartWhole();
    }
    Pump();
}

void ControllerReader::StartComparing() {
    phase_ = Phase::kCompare;
    comparing_ = 3;
    Send(ipmi::GetSelInfo(), [this](std::optional<Response> info) {
        --comparing_;
        toldOfLog_ = true;
        if (Completed(info)) memory_.logInfo = std::move(info);
    });
    if (!known_->log.empty()) {
        ++comparing_;
        Send(ipmi::GetSelEntry(IdOf(known_->log.back())), [this](std::optional<Response> entry) {
            --comparing_;
            lastKnown_ = std::move(entry);
        });
    }
    RequestGuid();
    Send(ipmi::GetSdrRepositoryInfo(), [this](std::optional<Response> info) {
        --comparing_;
        sensorAnswer_ = info;
        if (Completed(info)) memory_.sensorInfo = std::move(info);
        toldOfSensors_ = true;
    });
}

void ControllerReader::Compare() {
    change_ = LogChange::kDifferent;
    const bool sameController = guid_ && *guid_ == known_->guid;
    if (guid_ && !sameController) change_ = LogChange::kReplaced;
    const auto before = LogInfoIn(known_->logInfo);
    const auto now = LogInfoIn(memory_.logInfo.value_or(Response()));
    const bool stands = known_->log.empty() || HoldsRecord(lastKnown_, known_->log.back());
    if (!sameController || !before || !now || !stands || before->lastErase != now->lastErase) {
        ReadWhole();
        return;
    }
    const std::size_t records = now->records;
    const std::uint16_t next =
        known_->log.empty() ? ipmi::kLastRecordId : IdOf(std::span(*lastKnown_).subspan(1));
    if (records == known_->log.size() && !before->HasChanged(*now) &&
        now->overflow == before->overflow && next == ipmi::kLastRecordId) {
        joined_ = std::make_unique<RecordStore>();
        AddChain(known_->log, ipmi::kLastRecordId, joined_.get());
        if (known_->log.empty()) memory_.emptyLog = Response{ipmi::kNotPresent};
        if (SensorsAreKnown()) {
            change_ = LogChange::kUnchanged;
            RecallSensors();
            phase_ = Phase::kDone;
        } else {
            change_ = LogChange::kSameLog;
            phase_ = Phase::kSensors;
        }
        return;
    }
    if (known_->log.empty() || next == ipmi::kLastRecordId || records <= known_->log.size()) {
        ReadWhole();
        return;
    }
    // What was taken out in front of the last one shows in the first.
    ++comparing_;
    phase_ = Phase::kLog;
    change_ = LogChange::kGrown;
    log_ = Reader(ipmi::kGetSelEntry);
    log_->BeginAt(next);
    log_->Expect(records - known_->log.size());
    Send(ipmi::GetSelEntry(ipmi::kFirstRecordId), [this](std::optional<Response> entry) {
        --comparing_;
        first_ = std::move(entry);
    });
}

void ControllerReader::ReadWhole() {
    if (change_ == LogChange::kGrown) change_ = LogChange::kDifferent;
    joined_.reset();
    phase_ = Phase::kLog;
    log_ = Reader(ipmi::kGetSelEntry);
    log_->Expect(CountIn(memory_.logInfo).value_or(kUnknownCount));
}

bool ControllerReader::Join() {
    if (!log_->ReachedEnd() || !HoldsRecord(first_, known_->log.front())) return false;
    const RecordStore& grown = log_->store();
    std::uint16_t id = IdOf(std::span(*lastKnown_).subspan(1));
    joined_ = std::make_unique<RecordStore>();
    AddChain(known_->log, id, joined_.get());
    for (std::size_t i = 0; i < grown.size(); ++i) {
        const RecordStore::Record record = grown.At(i);
        joined_->Add(id, record.next, record.bytes);
        id = record.next;
    }
    // One that led back to a record that is there already has not been added.
    return joined_->size() == CountIn(memory_.logInfo);
}

bool ControllerReader::SensorsAreKnown() const {
    return SameRepository(known_->sensorInfo, sensorAnswer_);
}

void ControllerReader::RecallSensors() {
    if (!memory_.sensorInfo) return;
    memory_.sensors = std::make_unique<RecordStore>();
    AddChain(known_->sensorRecords, ipmi::kLastRecordId, memory_.sensors.get());
    // Who reads parts takes a reservation first. The controller, which has never given this one,
    // is asked for another when it is asked for a part after all.
    memory_.reservation = Response{ipmi::kCompleted, 0x01, 0x00};
}

void ControllerReader::StartWhole() {
    if (needs_.log) {
        log_ = Reader(ipmi::kGetSelEntry);
        Send(ipmi::GetSelInfo(), [this](std::optional<Response> info) {
            log_->Expect(CountIn(info).value_or(kUnknownCount));
            toldOfLog_ = true;
            if (Completed(info)) memory_.logInfo = std::move(info);
        });
        log_->Pump();  // the first record
    }
    if (needs_.sensors) {
        // Beside the log: it costs no time there.
        Send(ipmi::GetSdrRepositoryInfo(), [this](std::optional<Response> info) {
            sensorAnswer_ = info;
            if (Completed(info)) memory_.sensorInfo = std::move(info);
            toldOfSensors_ = true;
        });
        Send(ipmi::ReserveSdrRepository(), [this](std::optional<Response> reservation) {
            if (Completed(reservation)) memory_.reservation = std::move(reservation);
            reserved_ = true;
        });
    }
}

void ControllerReader::StartSensors() {
    sensors_ = Reader(ipmi::kGetSdr);
    sensors_->Expect(CountIn(memory_.sensorInfo).value_or(kUnknownCount));
    if (const auto reservation = ReservationIn(memory_.reservation)) {
        sensors_->Reserved(*reservation);
    }
}

void ControllerReader::Pump() {
    if (std::exchange(pumping_, true)) return;
    if (phase_ == Phase::kCompare && comparing_ == 0) Compare();
    if (phase_ == Phase::kLog) {
        if (log_) log_->Pump();
        const bool grown = change_ == LogChange::kGrown && !joined_;
        if (grown && log_->Finished() && comparing_ == 0 && !Join()) {
            ReadWhole();
            log_->Pump();
        }
        if (!log_ || (log_->Finished() && toldOfLog_ && comparing_ == 0)) {
            phase_ = Phase::kSensors;
        } else if (!known_ && needs_.sensors && reserved_ && toldOfSensors_ &&
                   log_->HasRequestedAll()) {
            // In the room that the log's end leaves.
            if (!sensors_) StartSensors();
            sensors_->Pump();
        }
    }
    if (phase_ == Phase::kSensors && known_ && needs_.sensors && !sensors_ && !memory_.sensors) {
        if (memory_.sensorInfo && SensorsAreKnown()) {
            RecallSensors();
        } else if (!std::exchange(reserving_, true)) {
            reserved_ = false;
            Send(ipmi::ReserveSdrRepository(), [this](std::optional<Response> reservation) {
                if (Completed(reservation)) memory_.reservation = std::move(reservation);
                reserved_ = true;
            });
        }
    }
    if (phase_ == Phase::kSensors &&
        (!needs_.sensors || memory_.sensors || (reserved_ && toldOfSensors_))) {
        if (needs_.sensors && !sensors_ && !memory_.sensors) StartSensors();
        if (sensors_) sensors_->Pump();
        if (!sensors_ || sensors_->Finished()) {
            phase_ = Phase::kCheck;
            if (sensors_) CheckSensors();
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

void ControllerReader::CheckSensors() {
    if (!memory_.sensorInfo) return;
    checkingSensors_ = true;
    Send(ipmi::GetSdrRepositoryInfo(), [this](std::optional<Response> info) {
        checkingSensors_ = false;
        if (!Completed(info)) return;
        const auto before = ipmi::SdrRepositoryInfo::Parse(DataOf(*memory_.sensorInfo));
        const auto after = ipmi::SdrRepositoryInfo::Parse(DataOf(*info));
        if (before && after && before->HasChanged(*after)) {
            memory_.laterSensorInfo = std::move(info);
        }
    });
}

void ControllerReader::Check() {
    if (!memory_.logInfo) {
        phase_ = Phase::kDone;
        return;
    }
    Send(ipmi::GetSelInfo(), [this](std::optional<Response> info) { Checked(std::move(info)); });
}

bool ControllerReader::MoreThanAnnounced() const {
    return !joined_ && log_ &&
           log_->store().size() > CountIn(memory_.logInfo).value_or(kUnknownCount);
}

void ControllerReader::Checked(std::optional<Response> info) {
    if (phase_ == Phase::kCheck) {
        if (!Changed(memory_.logInfo, info) && !MoreThanAnnounced()) {
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
    const bool hadEnd = joined_ || (log_ && log_->ReachedEnd());
    if (!logAgain_->ReachedEnd() && hadEnd && CountIn(infoAgain_) != 0u) {
        // The first reading is the more whole one.
        memory_.laterLogInfo.emplace(std::move(info));
        return;
    }
    log_ = std::move(logAgain_);
    joined_.reset();
    memory_.emptyLog.reset();
    if (known_) change_ = LogChange::kDifferent;
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

NodeReading ControllerReader::Result() const {
    NodeReading result{change_, guid_.has_value() || !(needs_.guid || known_), std::nullopt};
    if (phase_ != Phase::kDone || memory_.laterLogInfo || !memory_.logInfo || !guid_) return result;
    const RecordStore none;
    const RecordStore& log = joined_ ? *joined_ : log_ ? log_->store() : none;
    const bool whole = joined_ || CountIn(memory_.logInfo) == 0u || (log_ && log_->ReachedEnd());
    if (!whole || log.size() != CountIn(memory_.logInfo) || !IsChain(log)) return result;
    KnownController known{*guid_, *memory_.logInfo, {}, {}, {}};
    for (std::size_t i = 0; i < log.size(); ++i) {
        const auto bytes = log.At(i).bytes;
        if (bytes.size() != ipmi::kSelRecordSize) return result;
        std::copy(bytes.begin(), bytes.end(), known.log.emplace_back().begin());
    }
    const RecordStore* const sensors = memory_.sensors ? memory_.sensors.get()
                                       : sensors_      ? &sensors_->store()
                                                       : nullptr;
    if (IsAnswer(sensorAnswer_) && !memory_.sensorInfo) {
        known.sensorInfo = *sensorAnswer_;  // it has no repository
    } else if (sensors != nullptr && memory_.sensorInfo && IsChain(*sensors) &&
               sensors->size() == CountIn(memory_.sensorInfo)) {
        known.sensorInfo = *memory_.sensorInfo;
        for (std::size_t i = 0; i < sensors->size(); ++i) {
            const auto bytes = sensors->At(i).bytes;
            known.sensorRecords.emplace_back(bytes.begin(), bytes.end());
        }
    }
    result.known = std::move(known);
    return result;
}

ControllerMemory ControllerReader::Take() {
    memory_.guid = guid_;
    if (joined_) {
        memory_.log = std::move(joined_);
    } else if (log_) {
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
