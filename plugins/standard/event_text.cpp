#include "plugins/standard/event_text.h"

#include <cmath>
#include <map>
#include <vector>

#include "base/hex.h"
#include "base/text.h"
#include "ipmi/event_offsets.h"
#include "ipmi/event_types.h"
#include "ipmi/sensor_types.h"
#include "ipmi/units.h"

namespace standard {

namespace {

// Control characters are no words: a panic's text ends with a line feed.
std::string Readable(std::string text) {
    for (char& c : text) {
        if (static_cast<unsigned char>(c) < 0x20 || c == 0x7F) c = ' ';
    }
    text.erase(text.find_last_not_of(' ') + 1);
    return text;
}

// What the offset says; for one without words in the standard, what it is.
std::string OffsetText(const ipmi::SelRecord& record) {
    const std::string_view words =
        ipmi::EventOffsetText(record.eventType, record.sensorType, record.offset());
    if (!words.empty()) return std::string(words);
    const std::string offset = "offset " + std::to_string(record.offset());
    switch (ipmi::ClassOfEventType(record.eventType)) {
        case ipmi::EventClass::kOem:
            return "vendor-specific event, type " + ipmisel::HexByte(record.eventType) + ", " +
                   offset;
        case ipmi::EventClass::kSensorSpecific:
            if (record.sensorType >= ipmi::sensor_type::kFirstOem) {
                return "vendor-specific event, sensor type " + ipmisel::HexByte(record.sensorType) +
                       ", " + offset;
            }
            return "event of sensor type " + ipmisel::HexByte(record.sensorType) + ", " + offset +
                   ", not defined by IPMI";
        case ipmi::EventClass::kUnspecified:
            return "unspecified event, " + offset;
        default:
            return "event of type " + ipmisel::HexByte(record.eventType) + ", " + offset +
                   ", not defined by IPMI";
    }
}

std::string SensorEventText(const Event& event) {
    std::string text = event.record.deassertion ? "no longer: " : "";
    text += OffsetText(event.record);
    for (const std::string& words : event.data.words) text += ", " + words;
    return text;
}

std::string PcieText(const ipmi::PcieError& error) {
    return ipmisel::Format("%s PCI Express error of device %04x:%02x:%02x.%x",
                           error.correctable ? "correctable" : "uncorrectable", error.segment,
                           error.bus, error.device, error.function);
}

// "reading 87 degrees C, threshold 86 degrees C"; "raw reading 13h" where nobody tells what the
// sensor's counts mean; empty when the event has neither.
std::string ReadingText(const Event& event) {
    const std::string unit = event.unit.empty() ? std::string() : ' ' + event.unit;
    std::string text;
    const auto add = [&](const char* label, std::optional<double> value,
                         std::optional<std::uint8_t> raw) {
        if (!value && !raw) return;
        if (!text.empty()) text += ", ";
        text += value ? label + NumberText(*value) + unit
                      : std::string("raw ") + label + ipmisel::HexByte(*raw);
    };
    add("reading ", event.reading, event.data.reading);
    add("threshold ", event.threshold, event.data.threshold);
    return text;
}

}  // namespace

std::map<std::size_t, std::string> JoinPanics(std::span<LoggedEvent> events) {
    struct Panic {
        std::size_t first = 0;
        unsigned next = 0;  // sequence number of the piece that follows
    };
    std::map<std::uint8_t, Panic> panics;  // by writer
    std::map<std::size_t, std::string> texts;
    for (std::size_t i = 0; i < events.size(); ++i) {
        LoggedEvent& event = events[i];
        if (event.record.kind != ipmi::RecordKind::kLinuxPanic) continue;
        const ipmi::PanicPiece piece = ipmi::ParsePanicPiece(event.record);
        const auto panic = panics.find(piece.writer);
        texts[i] = piece.text;
        if (panic != panics.end() && piece.sequence != 0 && piece.sequence == panic->second.next) {
            event.continuationOf = panic->second.first;
            texts[panic->second.first] += piece.text;
            ++panic->second.next;
        } else {
            panics[piece.writer] = {.first = i, .next = piece.sequence + 1U};
        }
    }
    return texts;
}

std::optional<double> ConvertByRecord(const ipmi::Sensor& sensor, std::uint8_t raw) {
    return sensor.analog ? sensor.analog->conversion.Value(raw) : std::nullopt;
}

void SetReading(const Converter& convert, Event* event) {
    if (event->agreeingSensor() == nullptr) return;
    const ipmi::Sensor& sensor = event->sensor->sensor;
    if (event->data.reading) event->reading = convert(sensor, *event->data.reading);
    if (event->data.threshold) event->threshold = convert(sensor, *event->data.threshold);
    if (event->reading || event->threshold) event->unit = ipmi::UnitText(sensor.units);
}

void SetText(Event* event) {
    const ipmi::SelRecord& record = event->record;
    switch (record.kind) {
        case ipmi::RecordKind::kSensorEvent:
            event->text = SensorEventText(*event);
            event->vendorData = ipmisel::HexText(event->data.oemBytes);
            return;
        case ipmi::RecordKind::kLinuxPanic:
            event->text = (event->continuationOf ? "Linux panic, continued: " : "Linux panic: ") +
                          Readable(event->text);
            return;
        case ipmi::RecordKind::kOemTimestamped:
            if (const auto error = ipmi::ParsePcieError(record)) {
                event->text = PcieText(*error);
                return;
            }
            event->text = "vendor-specific record, type " + ipmisel::HexByte(record.type) +
                          ", manufacturer " + std::to_string(record.manufacturerId);
            break;
        case ipmi::RecordKind::kOemUntimestamped:
            event->text = "vendor-specific record, type " + ipmisel::HexByte(record.type);
            break;
        case ipmi::RecordKind::kUnknown:
            event->text =
                "record of type " + ipmisel::HexByte(record.type) + ", not defined by IPMI";
            break;
    }
    event->vendorData = ipmisel::HexText(record.oemData());
}

void SetSentence(Event* event) {
    const std::string subject = SubjectText(*event);
    event->sentence = subject.empty() ? event->text : subject + ": " + event->text;
    const std::string reading = ReadingText(*event);
    if (!reading.empty()) event->sentence += " (" + reading + ')';
}

std::string NumberText(double value) {
    if (value != 0 && std::abs(value) < 0.01) return ipmisel::Format("%.3g", value);
    std::string text = ipmisel::Format("%.3f", value);
    text.erase(text.find_last_not_of('0') + 1);
    if (text.back() == '.') text.pop_back();
    return text == "-0" ? "0" : text;
}

std::string PartText(const PartEvidence& evidence) {
    std::string text;
    for (const Part& part : evidence.parts) text += (text.empty() ? "" : ", ") + part.name;
    return evidence.parts.size() > 1 ? "one of " + text : text;
}

std::string SensorText(const Event& event) {
    if (!event.isSensorEvent()) return {};
    if (event.sensor != nullptr && !event.sensor->sensor.name.empty()) {
        return event.sensor->sensor.name;
    }
    const std::string_view type = ipmi::SensorTypeName(event.record.sensorType);
    return std::string(type) + (type.empty() ? "sensor " : " sensor ") +
           ipmisel::HexByte(event.record.sensorNumber);
}

std::string SubjectText(const Event& event) {
    std::string part = PartText(event.part);
    std::string sensor = SensorText(event);
    const bool isNamed = event.sensor != nullptr && !event.sensor->sensor.name.empty();
    if (part.empty()) return sensor;
    if (!isNamed || part == sensor) return part;
    return event.part.parts.size() > 1 ? sensor + " (" + part + ')' : part + ", " + sensor;
}

}  // namespace standard
