// The standard's own reading: a whole pass over a controller that answers what the fuzzer wants,
// the decoders of records and answers one by one, and the user's file of severities.
//
// Input: the answers one after the other, each a length byte (0xFF: no response) and so many bytes,
// the completion code first. When the input is used up nothing answers any more.

#include <algorithm>
#include <cmath>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <span>
#include <string_view>
#include <vector>

#include "host/core/host.h"
#include "host/spdriver/source.h"
#include "ipmi/chassis_status.h"
#include "ipmi/device_id.h"
#include "ipmi/event_data.h"
#include "ipmi/event_offsets.h"
#include "ipmi/guid.h"
#include "ipmi/id_string.h"
#include "ipmi/pef.h"
#include "ipmi/sdr_info.h"
#include "ipmi/sdr_record.h"
#include "ipmi/sel_info.h"
#include "ipmi/sel_record.h"
#include "ipmi/self_test.h"
#include "ipmi/sensor_reading.h"
#include "ipmi/severity.h"
#include "ipmi/units.h"
#include "plugins/standard/plugin.h"
#include "plugins/standard/severity_rules.h"

namespace {

using Input = std::span<const std::uint8_t>;

class FuzzedController : public NQORTQR20::Transport {
public:
    explicit FuzzedController(Input answers) : answers_(answers) {}
    std::optional<NQORTQR20::Response> Exchange(const NQORTQR20::RequestFrame&) override {
        if (answers_.empty()) return std::nullopt;
        const std::size_t length = answers_.front();
        answers_ = answers_.subspan(1);
        if (length == 0xFF) return std::nullopt;
        const Input bytes = answers_.first(std::min(length, answers_.size()));
        answers_ = answers_.subspan(bytes.size());
        return NQORTQR20::Response(bytes.begin(), bytes.end());
    }

private:
    Input answers_;
};

/// Takes everything; a real must be a number.
class NoSink : public NQORTQR20::InstanceSink {
public:
    bool AddProperty(std::string_view, NQORTQR20::PropertyValue value) override {
        const auto* real = std::get_if<double>(&value);
        if (real != nullptr && !std::isfinite(*real)) __builtin_trap();
        return true;
    }
    bool Take(const NQORTQR20::Instance&) override { return true; }
};

/// The bytes as a log, record after record.
void DecodeLog(Input bytes) {
    for (; bytes.size() >= ipmi::kSelRecordSize; bytes = bytes.subspan(ipmi::kSelRecordSize)) {
        const ipmi::SelRecord record = *ipmi::ParseSelRecord(bytes);
        ipmi::GeneratorText(record.generator);
        ipmi::EventOffsetText(record.eventType, record.sensorType, record.offset());
        ipmi::GradeOf(record.eventType, record.sensorType, record.offset());
        // Two bytes, none of them told twice.
        if (ipmi::DecodeEventData(record).oemBytes.size() > 2) __builtin_trap();
        ipmi::ClockSetOf(record);
        ipmi::ParsePanicPiece(record);
        ipmi::ParsePcieError(record);
    }
}

void DecodeAnswers(Input bytes) {
    ipmi::ParseDeviceId(bytes);
    ipmi::ParseGuid(bytes);
    ipmi::SelfTestText(bytes);
    ipmi::ChassisStatus::Parse(bytes);
    ipmi::ParseSelInfo(bytes);
    ipmi::ParseSelAllocation(bytes);
    ipmi::ParseSelTime(bytes);
    ipmi::ParseSelTimeUtcOffset(bytes);
    ipmi::ParseSelEntry(bytes);
    ipmi::SdrRepositoryInfo::Parse(bytes);
    if (!bytes.empty()) ipmi::DecodeIdString(bytes[0], bytes.subspan(1));
}

void Decode(Input bytes) {
    DecodeLog(bytes);
    DecodeAnswers(bytes);
    if (const auto record = ipmi::SdrRecord::Parse(bytes)) {
        for (const ipmi::Sensor& sensor : record->Sensors()) {
            ipmi::UnitText(sensor.units);
            if (!sensor.analog) continue;
            for (const int raw : {0x00, 0x7F, 0x80, 0xFF}) {
                const auto value = sensor.analog->conversion.Value(static_cast<std::uint8_t>(raw));
                if (value && !std::isfinite(*value)) __builtin_trap();
            }
        }
    }
    if (const auto filter = ipmi::EventFilter::Parse(bytes)) filter->Matches({});
    ipmi::SensorReading::Parse(bytes);
    ipmi::SensorThresholds::Parse(bytes);
    ipmi::SensorReadingFactors::Parse(bytes);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const Input input(data, size);
    Decode(input);
    standard::SeverityRules rules;
    standard::SeverityRules::Parse(std::string_view(reinterpret_cast<const char*>(data), size),
                                   &rules);

    NQORTQR20::Source source;
    source.nodes.push_back({"", std::make_unique<FuzzedController>(input), nullptr});
    NQORTQR20::OpenMachine(std::move(source));
    NoSink sink;
    const NQORTQR20::OutputHandle output(sink);
    std::vector<const char*> classes;
    for (std::uint32_t i = 0; i < fdrPluginClasses.classCount; ++i) {
        classes.push_back(fdrPluginClasses.classes[i].name);
    }
    standard::GetData(nullptr, output.get(), classes.data(), static_cast<int>(classes.size()));
    NQORTQR20::CloseMachine();
    return 0;
}
