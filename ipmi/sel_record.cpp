#include "ipmi/sel_record.h"

#include <algorithm>
#include <string_view>

#include "base/bytes.h"
#include "base/hex.h"

namespace ipmi {

namespace {

constexpr std::size_t kOemTimestampedData = 10;
constexpr std::size_t kUntimestampedData = 3;

// The daemon's records: type C0h, its manufacturer's number, then C0h and the kind of error.
constexpr std::uint8_t kPcieRecordType = 0xC0;
constexpr std::uint32_t kPcieManufacturer = 0x00CD3A;
constexpr std::uint8_t kPcieMark = 0xC0;
constexpr std::uint8_t kPcieCorrectable = 0xBF;
constexpr std::uint8_t kPcieUncorrectable = 0xCA;

// System software IDs, table 5-4.
struct SoftwareIds {
    std::uint8_t last;
    std::string_view name;
};
constexpr std::array<SoftwareIds, 7> kSoftwareIds{{{0x0F, "BIOS"},
                                                   {0x1F, "SMI handler"},
                                                   {0x2F, "system management software"},
                                                   {0x3F, "OEM software"},
                                                   {0x46, "remote console software"},
                                                   {0x47, "terminal mode remote console"},
                                                   {0x7F, "software"}}};

}  // namespace

RecordKind KindOfRecord(std::uint8_t recordType) {
    if (recordType == kSystemEventType || recordType == kNonStandardEventType) {
        return RecordKind::kSensorEvent;
    }
    if (recordType == kLinuxPanicType) return RecordKind::kLinuxPanic;
    if (recordType >= 0xE0) return RecordKind::kOemUntimestamped;
    if (recordType >= 0xC0) return RecordKind::kOemTimestamped;
    return RecordKind::kUnknown;
}

Generator ParseGenerator(std::uint8_t low, std::uint8_t high) {
    Generator generator;
    generator.software = (low & 0x01) != 0;
    generator.id = generator.software ? low >> 1 : low;
    generator.channel = high >> 4;
    generator.lun = high & 0x03;
    return generator;
}

std::string GeneratorText(const Generator& generator) {
    const std::string id = ipmisel::HexByte(generator.id);
    if (!generator.software) {
        return "controller " + id + ", LUN " + std::to_string(generator.lun) + ", channel " +
               std::to_string(generator.channel);
    }
    const auto* const range =
        std::ranges::lower_bound(kSoftwareIds, generator.id, {}, &SoftwareIds::last);
    return std::string(range->name) + " (software ID " + id + ")";
}

std::span<const std::uint8_t> SelRecord::oemData() const {
    const std::span<const std::uint8_t> all(bytes);
    switch (kind) {
        case RecordKind::kOemTimestamped:
            return all.subspan(kOemTimestampedData);
        case RecordKind::kOemUntimestamped:
        case RecordKind::kUnknown:
            return all.subspan(kUntimestampedData);
        default:
            return {};
    }
}

std::optional<SelRecord> ParseSelRecord(std::span<const std::uint8_t> bytes) {
    if (bytes.size() < kSelRecordSize) return std::nullopt;
    SelRecord record;
    std::copy_n(bytes.begin(), kSelRecordSize, record.bytes.begin());
    ipmisel::ByteReader in(record.bytes);
    record.id = in.U16();
    record.type = in.U8();
    record.kind = KindOfRecord(record.type);
    if (record.kind == RecordKind::kSensorEvent) {
        record.time = in.U32();
        const std::uint8_t low = in.U8();
        record.generator = ParseGenerator(low, in.U8());
        record.messageRevision = in.U8();
        record.sensorType = in.U8();
        record.sensorNumber = in.U8();
        const std::uint8_t directionAndType = in.U8();
        record.deassertion = (directionAndType & 0x80) != 0;
        record.eventType = directionAndType & 0x7F;
        for (std::uint8_t& byte : record.data) byte = in.U8();
    } else if (record.kind == RecordKind::kOemTimestamped) {
        record.time = in.U32();
        record.manufacturerId = in.U24();
    }
    return record;
}

std::optional<SelEntry> ParseSelEntry(std::span<const std::uint8_t> response) {
    ipmisel::ByteReader in(response);
    SelEntry entry;
    entry.nextRecordId = in.U16();
    if (!in.ok()) return std::nullopt;
    const std::optional<SelRecord> record = ParseSelRecord(response.subspan(2));
    if (!record) return std::nullopt;
    entry.record = *record;
    return entry;
}

PanicPiece ParsePanicPiece(const SelRecord& record) {
    constexpr std::size_t kText = 5;
    PanicPiece piece{.writer = record.bytes[3], .sequence = record.bytes[4], .text = {}};
    const auto* const text = record.bytes.begin() + kText;
    piece.text.assign(text, std::find(text, record.bytes.end(), std::uint8_t{0}));
    return piece;
}

std::optional<PcieError> ParsePcieError(const SelRecord& record) {
    if (record.type != kPcieRecordType || record.manufacturerId != kPcieManufacturer) {
        return std::nullopt;
    }
    ipmisel::ByteReader in(record.oemData());
    if (in.U8() != kPcieMark) return std::nullopt;
    const std::uint8_t kind = in.U8();
    if (kind != kPcieCorrectable && kind != kPcieUncorrectable) return std::nullopt;
    PcieError error;
    error.correctable = kind == kPcieCorrectable;
    error.segment = in.U8();
    error.bus = in.U8();
    const std::uint8_t deviceAndFunction = in.U8();
    error.device = deviceAndFunction >> 3;
    error.function = deviceAndFunction & 0x07;
    return error;
}

}  // namespace ipmi
